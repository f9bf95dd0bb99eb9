// The tools' indexing progress report: pause state, folder states, share marks, daemon reachability.
#include "status_report.h"

#include <map>

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
        // Every folder's state from one listing, which reads each share's queue once for all its
        // folders; a folder the listing did not see (folder.conf changed in between) is asked alone.
        Json::Value page, additional(Json::arrayValue);
        additional.append("status");
        std::map<std::string, std::string> states;
        if (IndexMgr::List(page, 0, list.size(), "path", "", additional)) {
            for (const Json::Value &record : page["folder"]) {
                states[record["path"].asString()] = record["additional"]["status"].asString();
            }
        }
        for (const Folder &folder : list) {
            const auto state = states.find(folder.m_path);
            report.folders.push_back(
                {folder.m_path, state != states.end() ? state->second : StatusMgr::GetFolderStatus(folder.m_path)});
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

std::array<int, 4> CountFolderStates(const StatusReport &report)
{
    std::array<int, 4> counts = {};
    for (const FolderState &folder : report.folders) {
        for (size_t i = 0; i < counts.size(); ++i) {
            counts[i] += folder.status == kFolderStates[i] ? 1 : 0;
        }
    }
    return counts;
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
    const std::array<int, 4> counts = CountFolderStates(report);
    for (size_t i = 0; i < counts.size(); ++i) {
        record["counts"][kFolderStates[i]] = counts[i];
    }
    record["folders"] = Json::Value(Json::arrayValue);
    for (const FolderState &folder : report.folders) {
        Json::Value entry;
        SetBytesMember(entry, "path", folder.path);
        entry["status"] = folder.status;
        record["folders"].append(entry);
    }
    record["shares"] = Json::Value(Json::arrayValue);
    for (const std::string &share : report.shares) {
        record["shares"].append(ShareMarks(share));
    }
    return record;
}

}  // namespace fileindex_tool
