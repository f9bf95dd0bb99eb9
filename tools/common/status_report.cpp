// The tools' indexing progress report: pause state, folder states, share marks, daemon reachability.
#include "status_report.h"

#include <fcntl.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "appliance_paths.h"
#include "fileindex/index_mgr.h"
#include "fileindex/status.h"
#include "path_encoding.h"
#include "records.h"

namespace fileindex_tool {

using VEXO::FILEINDEX::Folder;
using VEXO::FILEINDEX::IndexMgr;
using VEXO::FILEINDEX::StatusMgr;

const char *const kFolderStates[4] = {"finished", "processing", "paused", "err_no_space"};

DaemonState ProbeDaemon()
{
    const std::string socketPath = FILEINDEX_DAEMON_SOCKET_PATH;
    DaemonState state;
    const int fd = socket(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0);
    if (fd < 0) {
        state.problem = std::string("no socket could be made: ") + strerror(errno);
        return state;
    }
    sockaddr_un address = {};
    address.sun_family = AF_UNIX;
    strncpy(address.sun_path, socketPath.c_str(), sizeof(address.sun_path) - 1);
    if (connect(fd, reinterpret_cast<const sockaddr *>(&address), sizeof(address)) == 0) {
        state.reachable = true;
    } else if (errno == ENOENT) {
        state.problem = "no socket at " + TerminalText(socketPath) + ": the indexing service is not running";
    } else if (errno == ECONNREFUSED) {
        state.problem = "nobody listens on " + TerminalText(socketPath) + ": the indexing service has stopped";
    } else if (errno == EAGAIN) {
        state.problem = "fileindexd takes no more connections on " + TerminalText(socketPath) + " (its backlog is full)";
    } else {
        state.problem = "cannot connect to " + TerminalText(socketPath) + ": " + strerror(errno);
    }
    close(fd);
    return state;
}

bool TakeStatusReport(const std::vector<std::string> &paths, StatusReport &report)
{
    std::vector<Folder> list;
    if (!IndexMgr::List(list)) {
        return false;
    }
    if (!StatusMgr::GetStatus(report.status) || !StatusMgr::GetPauseInfo(report.resumeTime)) {
        return false;
    }
    report.folders.clear();
    if (paths.empty()) {
        for (const Folder &folder : list) {
            report.folders.push_back({folder.m_path, StatusMgr::GetFolderStatus(folder.m_path)});
        }
    } else {
        for (const std::string &path : paths) {
            report.folders.push_back({path, StatusMgr::GetFolderStatus(path)});
        }
    }
    report.shares = KnownShares(list);
    report.daemon = ProbeDaemon();
    return true;
}

Json::Value StatusRecord(const StatusReport &report)
{
    Json::Value record;
    record["status"] = report.status;
    record["resume_time"] = static_cast<Json::Int64>(report.resumeTime);
    Json::Value &daemon = record["daemon"];
    SetBytesMember(daemon, "socket", FILEINDEX_DAEMON_SOCKET_PATH);
    daemon["reachable"] = report.daemon.reachable;
    daemon["problem"] = report.daemon.reachable ? Json::Value() : Json::Value(report.daemon.problem);
    for (const char *state : kFolderStates) {
        record["counts"][state] = 0;
    }
    record["folders"] = Json::Value(Json::arrayValue);
    for (const FolderState &folder : report.folders) {
        Json::Value entry;
        SetBytesMember(entry, "path", folder.path);
        entry["status"] = folder.status;
        record["folders"].append(entry);
        if (record["counts"].isMember(folder.status)) {
            record["counts"][folder.status] = record["counts"][folder.status].asInt() + 1;
        }
    }
    record["shares"] = Json::Value(Json::arrayValue);
    for (const std::string &share : report.shares) {
        record["shares"].append(ShareMarks(share));
    }
    return record;
}

}  // namespace fileindex_tool
