// fileindexctl's --help, wrapped to 72 columns: CLI11's layout with every text broken at spaces.
#include "help_format.h"

#include <sstream>

namespace fileindexctl {
namespace {

constexpr size_t kWidth = 72;
constexpr size_t kNameColumn = 24;

// text broken at spaces into lines of at most width characters (a longer word stands alone); its
// own line breaks are kept.
std::string Wrap(const std::string &text, size_t width)
{
    std::istringstream lines(text);
    std::string wrapped;
    for (std::string line; std::getline(lines, line);) {
        std::istringstream words(line);
        std::string current;
        for (std::string word; words >> word;) {
            if (!current.empty() && current.size() + 1 + word.size() > width) {
                wrapped += current + "\n";
                current.clear();
            }
            current += (current.empty() ? "" : " ") + word;
        }
        wrapped += current + "\n";
    }
    if (!text.empty() && text.back() != '\n' && !wrapped.empty()) {
        wrapped.pop_back();
    }
    return wrapped;
}

class Wrapping : public CLI::Formatter {
public:
    Wrapping() { column_width(kNameColumn); }

    std::string make_option_desc(const CLI::Option *option) const override
    {
        return Wrap(CLI::Formatter::make_option_desc(option), kWidth - kNameColumn);
    }

    std::string make_subcommand(const CLI::App *subcommand) const override
    {
        std::stringstream out;
        CLI::detail::format_help(out, subcommand->get_display_name(),
                                 Wrap(subcommand->get_description(), kWidth - kNameColumn), kNameColumn);
        return out.str();
    }

    std::string make_description(const CLI::App *app) const override
    {
        return Wrap(CLI::Formatter::make_description(app), kWidth);
    }

    std::string make_footer(const CLI::App *app) const override
    {
        return Wrap(CLI::Formatter::make_footer(app), kWidth);
    }
};

}  // namespace

std::shared_ptr<CLI::Formatter> WrappingFormatter()
{
    return std::make_shared<Wrapping>();
}

}  // namespace fileindexctl
