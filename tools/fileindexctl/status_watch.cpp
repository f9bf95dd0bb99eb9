// fileindexctl status --watch: redrawn in place on a terminal, plain lines elsewhere.
#include <signal.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <ctime>
#include <iostream>

#include "failure.h"
#include "output.h"
#include "status_output.h"

namespace fileindexctl {

using fileindex_tool::StatusReport;

namespace {

volatile sig_atomic_t g_interrupted = 0;

void OnInterrupt(int)
{
    g_interrupted = 1;
}

// The terminal's escape sequences used here: the alternate screen, line wrapping and the cursor.
constexpr char kEnter[] = "\033[?1049h\033[?7l\033[?25l";
constexpr char kLeave[] = "\033[?25h\033[?7h\033[?1049l";
constexpr char kHome[] = "\033[H";
constexpr char kClearLine[] = "\033[K";
constexpr char kClearBelow[] = "\033[J";

bool RedrawsInPlace()
{
    const char *term = getenv("TERM");
    return isatty(STDOUT_FILENO) == 1 && (term == nullptr || strcmp(term, "dumb") != 0);
}

// The window's height in lines, 24 when it cannot be told.
size_t WindowRows()
{
    struct winsize size = {};
    return ioctl(STDOUT_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_row > 0 ? size.ws_row : 24;
}

// The drawing for a window of rows lines: the summary, then as many folder lines as fit below it,
// the last of them saying how many were left out.
std::vector<std::string> FitToWindow(const StatusReport &report, size_t rows)
{
    std::vector<std::string> lines = SummaryLines(report);
    const std::vector<std::string> folders = FolderLines(report);
    const size_t room = rows > lines.size() + 1 ? rows - lines.size() - 1 : 0;  // one row for the cursor
    if (folders.size() <= room) {
        lines.insert(lines.end(), folders.begin(), folders.end());
    } else if (room > 0) {
        lines.insert(lines.end(), folders.begin(), folders.begin() + static_cast<long>(room - 1));
        lines.push_back("... " + std::to_string(folders.size() - (room - 1)) +
                        " more lines; a taller window shows them");
    }
    return lines;
}

}  // namespace

int Watch(const Context &context, const std::vector<std::string> &paths, double interval)
{
    struct sigaction action = {};
    action.sa_handler = OnInterrupt;
    sigaction(SIGINT, &action, nullptr);
    sigaction(SIGTERM, &action, nullptr);
    const bool inPlace = !context.json && RedrawsInPlace();
    if (inPlace) {
        std::cout << kEnter << std::flush;
    }
    std::string shownSummary;
    std::vector<std::string> drawn;  // on a terminal, what the window shows
    StatusReport report;
    int status = kInterrupted;
    for (bool done = false; !done;) {
        fileindex_tool::ClearLastError();
        if (!fileindex_tool::TakeStatusReport(paths, report)) {
            std::cout << (inPlace ? kLeave : "") << std::flush;
            return Report(context, fileindex_tool::LibraryFailure("status --watch", "the library recorded no "
                                                                                    "reason; the system log has its line"));
        }
        const std::vector<std::string> drawing = inPlace ? FitToWindow(report, WindowRows()) : drawn;
        if (drawing != drawn) {
            std::cout << kHome;
            for (const std::string &line : drawing) {
                std::cout << line << kClearLine << "\n";
            }
            std::cout << kClearBelow << std::flush;
            drawn = drawing;
        } else if (!inPlace && !context.json) {
            std::string summary;
            for (const std::string &line : SummaryLines(report)) {
                summary += (summary.empty() ? "" : "; ") + line;
            }
            if (summary != shownSummary) {
                std::cout << LocalTime(time(nullptr), "%H:%M:%S") << " " << summary << std::endl;
                shownSummary = summary;
            }
        }
        done = report.status == "finished";
        for (double waited = 0; !done && waited < interval; waited += 0.05) {
            done = g_interrupted != 0;
            usleep(50000);
        }
    }
    if (report.status == "finished") {
        status = kSuccess;
    }
    if (inPlace) {
        std::cout << kLeave;
    }
    if (context.json) {
        if (status == kSuccess) {
            PrintJson(fileindex_tool::StatusRecord(report));
        }
    } else {
        PrintStatus(report);
    }
    std::cout << std::flush;
    return status;
}

}  // namespace fileindexctl
