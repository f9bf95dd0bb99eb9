// Indexing progress as fileindexctl status prints it and the panel serves it: one reading of the
// library's progress report, the pause state, each folder's state, the shares' marks, and whether
// fileindexd can be reached.
#ifndef FILEINDEX_TOOL_STATUS_REPORT_H
#define FILEINDEX_TOOL_STATUS_REPORT_H

#include <array>
#include <string>
#include <vector>

#include <json/value.h>

#include "daemon_probe.h"

namespace fileindex_tool {

struct FolderState {
    std::string path;
    std::string status;  // StatusMgr::GetFolderStatus: finished, processing, paused, err_no_space
};

struct StatusReport {
    std::string status;     // StatusMgr::GetStatus: finished, processing or paused
    long long resumeTime;   // -1 running, 0 paused until resumed, else paused until then (epoch s)
    std::vector<FolderState> folders;
    std::vector<std::string> shares;  // KnownShares (records.h)
    DaemonState daemon;
};

// Reads the report of the folders at paths, or of every indexed folder when paths is empty, without
// any lock. False when the library's progress report or pause state cannot be read (its last error
// tells why; clear it before).
bool TakeStatusReport(const std::vector<std::string> &paths, StatusReport &report);

// {"status", "resume_time", "daemon": {"socket", "socket_bytes", "reachable", "problem" (null when
// reachable)}, "counts": {"finished", "processing", "paused", "err_no_space"} (folders in each
// state), "folders": [{"path", "path_bytes", "status"}], "shares": [ShareMarks (records.h)]}. The
// marks are read as the record is built.
Json::Value StatusRecord(const StatusReport &report);

// The folder states counted in "counts", in that order, and how many of the report's folders are
// in each.
extern const char *const kFolderStates[4];
std::array<int, 4> CountFolderStates(const StatusReport &report);

}  // namespace fileindex_tool

#endif
