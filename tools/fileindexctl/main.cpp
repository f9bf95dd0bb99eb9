// fileindexctl: shows and changes the appliance's file index through libfileindex's exported
// interface. Tables for people by default, one JSON document with --json; a failure is one line on
// standard error (and the error object with --json) and an exit status of its kind (output.h).
#include <algorithm>
#include <cstring>
#include <string>
#include <vector>

#include <CLI/CLI.hpp>

#include "commands.h"
#include "help_format.h"
#include "output.h"

namespace fileindexctl {
namespace {

// Edits (insertions, deletions, substitutions) that turn one word into the other.
size_t EditDistance(const std::string &from, const std::string &to)
{
    std::vector<size_t> row(to.size() + 1);
    for (size_t j = 0; j <= to.size(); ++j) {
        row[j] = j;
    }
    for (size_t i = 1; i <= from.size(); ++i) {
        size_t diagonal = row[0];
        row[0] = i;
        for (size_t j = 1; j <= to.size(); ++j) {
            const size_t above = row[j];
            row[j] = std::min({row[j] + 1, row[j - 1] + 1, diagonal + (from[i - 1] == to[j - 1] ? 0 : 1)});
            diagonal = above;
        }
    }
    return row[to.size()];
}

// The first word of the command line that should name a subcommand and names none: "unknown
// command 'foldr'; did you mean 'folder'?", the suggestion being the nearest visible subcommand
// within two edits, or one the word begins. Empty when every command word is known.
std::string UnknownCommand(const CLI::App &app, int argc, char **argv)
{
    const CLI::App *current = &app;
    for (int i = 1; i < argc && !current->get_subcommands({}).empty(); ++i) {
        const std::string word = argv[i];
        if (word.rfind("-", 0) == 0) {
            i += word == "--wait" ? 1 : 0;  // the one option before a subcommand that takes a value
            continue;
        }
        const CLI::App *next = nullptr;
        std::string nearest;
        size_t nearestDistance = 3;
        for (const CLI::App *command : current->get_subcommands({})) {
            if (command->get_name() == word) {
                next = command;
            } else if (!command->get_group().empty()) {
                const size_t distance = command->get_name().rfind(word, 0) == 0 ? 0 : EditDistance(word, command->get_name());
                if (distance < nearestDistance) {
                    nearest = command->get_name();
                    nearestDistance = distance;
                }
            }
        }
        if (next == nullptr) {
            const std::string under = current == &app ? "" : " of '" + current->get_name() + "'";
            return "unknown command '" + word + "'" + under +
                   (nearest.empty() ? "" : "; did you mean '" + nearest + "'?");
        }
        current = next;
    }
    return "";
}

// The failure of a wrong command line, as one line on standard error and, when --json is among the
// arguments, the error object on standard output.
int UsageFailure(const Context &context, const std::string &message)
{
    Report(context, fileindex_tool::ToolFailure(fileindex_tool::FailureKind::kInvalid,
                                                fileindex_tool::Failure::kNoCode, message + " (see --help)"));
    return kUsage;
}

}  // namespace
}  // namespace fileindexctl

int main(int argc, char **argv)
{
    using namespace fileindexctl;

    CLI::App app{"Show and change the appliance's file index: indexed folders, indexing progress, pause and "
                 "resume, shares.",
                 "fileindexctl"};
    app.formatter(WrappingFormatter());
    app.set_version_flag("--version", "fileindexctl " FILEINDEX_VERSION);
    app.require_subcommand(1);
    app.footer("--json and --wait may also come before the subcommand; each subcommand has its own --help. "
               "Paths are share-relative, /<share>/<folder>. Exit status: 0 success, 1 a library call failed, "
               "2 wrong command line, 3 a path may not be indexed, 4 no such share, path or folder, 5 fileindexd "
               "was not told, 75 a lock stayed busy, 130 interrupted.");

    Context context;
    app.add_flag("--json", context.json, "print one JSON document (docs/fileindexctl.md gives each shape)");
    AddWaitOption(app, context,
                  "for folder get/add/set/remove, share remove/rename/revive, pause and resume, which take their "
                  "lock before they do anything: while another program holds it, try again for up to this many "
                  "seconds (0: give up at once); a lock still busy then exits 75. The others take no lock of their "
                  "own, or may have done part of their work when they meet one, and fail at once");
    AddFolderCommands(app, context);
    AddIndexCommands(app, context);
    AddStatusCommands(app, context);
    AddShareCommands(app, context);
    AddCompleteCommand(app, context);

    context.json = std::any_of(argv + 1, argv + argc, [](const char *arg) { return strcmp(arg, "--json") == 0; });
    const std::string unknown = UnknownCommand(app, argc, argv);
    if (!unknown.empty()) {
        return UsageFailure(context, unknown);
    }
    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError &error) {
        if (error.get_exit_code() == 0) {
            return app.exit(error);  // --help, --version
        }
        return UsageFailure(context, error.what());
    }
    return context.action ? context.action() : kUsage;
}
