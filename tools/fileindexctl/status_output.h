// fileindexctl status for people: the summary and the folder table, once or watched.
#ifndef FILEINDEXCTL_STATUS_OUTPUT_H
#define FILEINDEXCTL_STATUS_OUTPUT_H

#include <string>
#include <vector>

#include "commands.h"
#include "status_report.h"

namespace fileindexctl {

// The local time of when in strftime's format.
std::string LocalTime(long long when, const char *format);
// "until resumed", or "until <local time>" for a timed pause.
std::string PauseText(long long resumeTime);

// The summary, a line each: the overall state with the pause, fileindexd, the folders in each
// state, and, while indexing cannot move on, why ("waiting: ...").
std::vector<std::string> SummaryLines(const fileindex_tool::StatusReport &report);
// The folder table, header first; none without folders.
std::vector<std::string> FolderLines(const fileindex_tool::StatusReport &report);

// The summary and the folder table on standard output.
void PrintStatus(const fileindex_tool::StatusReport &report);

// status --watch: takes a report of paths (every folder when empty) every interval seconds until
// indexing has finished (status 0) or SIGINT/SIGTERM (130). On a terminal whose TERM is not "dumb"
// it redraws in place on the alternate screen, cut to the window's height with the summary first and
// without wrapping lines, and leaves the last drawing on the normal screen at the end. Otherwise it
// prints one plain line with the time and the summary whenever the summary changes, and the whole
// status at the end. With --json it prints only the status record, once indexing has finished.
int Watch(const Context &context, const std::vector<std::string> &paths, double interval);

}  // namespace fileindexctl

#endif
