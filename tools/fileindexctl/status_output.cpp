// fileindexctl status for people: the summary lines and the folder table.
#include "status_output.h"

#include <ctime>
#include <iostream>
#include <sstream>

#include "output.h"
#include "path_encoding.h"

namespace fileindexctl {

using fileindex_tool::StatusReport;

std::string LocalTime(long long when, const char *format)
{
    const time_t time = static_cast<time_t>(when);
    char text[64];
    struct tm local;
    strftime(text, sizeof(text), format, localtime_r(&time, &local));
    return text;
}

std::string PauseText(long long resumeTime)
{
    return resumeTime == 0 ? "until resumed" : "until " + LocalTime(resumeTime, "%Y-%m-%d %H:%M:%S %Z");
}

std::vector<std::string> SummaryLines(const StatusReport &report)
{
    std::vector<std::string> lines;
    std::string overall = "indexing: " + report.status;
    if (report.resumeTime != -1) {
        const std::string until = PauseText(report.resumeTime);
        overall += report.status == "paused" ? " " + until : " (paused " + until + ")";
    }
    lines.push_back(overall);
    lines.push_back("fileindexd: " +
                    (report.daemon.reachable ? std::string("running, reachable") : "not reachable: " + report.daemon.problem));
    const std::array<int, 4> counts = fileindex_tool::CountFolderStates(report);
    std::ostringstream folders;
    folders << report.folders.size() << " folders: " << counts[0] << " finished, " << counts[1] << " processing, "
            << counts[2] << " paused, " << counts[3] << " out of space";
    lines.push_back(folders.str());
    if (report.status == "paused") {
        lines.push_back("waiting: indexing is paused " + PauseText(report.resumeTime) +
                        "; 'fileindexctl resume' resumes it");
    } else if (report.status == "processing" && !report.daemon.reachable) {
        lines.push_back("waiting: fileindexd is not reachable, so nothing moves on; start the indexing service");
    }
    if (counts[3] != 0) {
        lines.push_back("waiting: folders in shares out of space do not move on; free space, then 'fileindexctl share "
                        "revive SHARE'");
    }
    return lines;
}

std::vector<std::string> FolderLines(const StatusReport &report)
{
    if (report.folders.empty()) {
        return {};
    }
    Table table({"FOLDER", "STATUS"});
    for (const fileindex_tool::FolderState &folder : report.folders) {
        table.Add({fileindex_tool::TerminalText(folder.path), folder.status});
    }
    std::stringstream text;
    table.Print(text);
    std::vector<std::string> lines;
    for (std::string line; std::getline(text, line);) {
        lines.push_back(line);
    }
    return lines;
}

void PrintStatus(const StatusReport &report)
{
    for (const std::vector<std::string> &lines : {SummaryLines(report), FolderLines(report)}) {
        for (const std::string &line : lines) {
            std::cout << line << "\n";
        }
    }
}

}  // namespace fileindexctl
