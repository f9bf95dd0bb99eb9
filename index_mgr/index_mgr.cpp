// The index management operations: folder settings added, changed and removed end to end (folder
// list, change monitoring, services, daemon commands, events), reindex requests, and following a
// share's removal, rename, pause and resume.
#include "fileindex/index_mgr.h"

#include <map>
#include <set>

#include "appliance_paths.h"
#include "config/json_io.h"
#include "config/log.h"
#include "config/unlock_on_return.h"
#include "daemon/queue_record.h"
#include "fileindex/error.h"
#include "fileindex/fileidx.h"
#include "fileindex/status.h"
#include "fileindex/utils.h"
#include "index_mgr/services.h"
#include "platform/service.h"
#include "share/share_lookup.h"
#include "share/storage_paths.h"

FILEIDX_LOG_UNIT("index_mgr.cpp");

namespace VEXO {
namespace FILEINDEX {

namespace {

constexpr int kPathSize = 4096;

// The "path" of a folder setting request, "" when it has none that is a string.
std::string RequestPath(const Json::Value &setting)
{
    std::string path;
    RetrieveStringFromJsonObj(path, "path", setting);
    return path;
}

// A deletion request: an array whose elements all read as strings.
bool IsPathList(const Json::Value &request)
{
    if (!request.isArray()) {
        return false;
    }
    for (const Json::Value &element : request) {
        if (!element.isConvertibleTo(Json::stringValue)) {
            return false;
        }
    }
    return true;
}

bool RefuseRequest(const Json::Value &request)
{
    FILEIDX_LOG("%s:%d Bad param: %s", toString(request).c_str());
    ErrorHandler::SetError(FILEIDX_ERR_BAD_PARAM);
    return false;
}

// A reindex request, or one of its elements, that is not what it should be.
bool RefusePaths(const Json::Value &value)
{
    FILEIDX_LOG("%s:%d Malformed jsArrPath: %s", toString(value).c_str());
    ErrorHandler::SetError(FILEIDX_ERR_BAD_PARAM);
    return false;
}

// Adds the share of path to shares. False, logged, when no share name can be cut from path.
bool CollectShare(std::set<std::string> &shares, const std::string &path)
{
    std::string share;
    if (!GetShareNameByPath(share, path)) {
        FILEIDX_LOG("%s:%d GetShareNameByPath failed, path=%s", path.c_str());
        return false;
    }
    shares.insert(share);
    return true;
}

bool ResolveFullPath(std::string &fullPath, const std::string &path)
{
    if (!GetFullPath(fullPath, path)) {
        FILEIDX_LOG("%s:%d GetFullPath failed, path=%s", path.c_str());
        ErrorHandler::SetError(FILEIDX_ERR_PATH);
        return false;
    }
    return true;
}

// Tells the daemon about one folder: {"folder_path": path}.
bool SendFolderCommand(const char *type, const std::string &path)
{
    Json::Value data(Json::objectValue);
    data["folder_path"] = path;
    if (!SendCammandToDaemon(type, data)) {
        FILEIDX_LOG("%s:%d SendCammandToDaemon failed");
        return false;
    }
    return true;
}

// Tells the daemon about a share's worker: {"share_name": share}. Logs nothing.
bool SendShareCommand(const char *type, const std::string &share)
{
    Json::Value data(Json::objectValue);
    data["share_name"] = share;
    return SendCammandToDaemon(type, data);
}

// Switches SMB Spotlight on or off unless it is so already, and restarts "samba" to apply the
// change. Best effort: a failure is logged and the caller goes on.
void SwitchSpotlight(bool on)
{
    if ((VEXOSMBIsEnableSpotlight() != 0) == on) {
        return;
    }
    if (VEXOSMBSetSpotlight(on ? 1 : 0) < 0) {
        FILEIDX_LOG_PLATFORM_ERROR("%s:%d VEXOSMBSetSpotlight failed: err=[0x%04X %s:%d]");
        return;
    }
    if (VLIBServiceRestart(kSmbService) < 0) {
        FILEIDX_LOG_PLATFORM_ERROR("%s:%d VLIBServiceRestart failed: err=[0x%04X %s:%d]");
    }
}

// No folder is indexed any more: stop the indexing service and switch Spotlight off. Best effort.
void StopIndexing()
{
    if (VLIBServiceStop(kIndexService, kIndexServiceFlags) < 0) {
        FILEIDX_LOG_PLATFORM_ERROR("%s:%d VLIBServiceStop failed: err=[0x%04X %s:%d]");
    }
    SwitchSpotlight(false);
}

bool HoldsNoFolder(Folders &folders)
{
    std::vector<Folder> all;
    return folders.List(all) && all.empty();
}

// Runs the system's removal tool on path; whether anything was there to remove does not matter.
void RemoveTree(const std::string &path)
{
    VLIBCExec(FILEINDEX_REMOVE_TOOL_PATH, "-rf", path.c_str(), nullptr, nullptr);
}

}  // namespace

bool IndexMgr::Upsert(const Json::Value &request)
{
    Folders folders;
    UnlockOnReturn unlock(folders);
    if (!request.isArray()) {
        return RefuseRequest(request);
    }
    // The current folders are not used; listing them fails the upsert when the table cannot be.
    std::vector<Folder> current;
    if (!folders.Lock(true) || !folders.Load() || !folders.List(current)) {
        return false;
    }
    std::map<std::string, Json::Value> reports;  // by path, the last element's report winning
    std::set<std::string> shares;
    for (const Json::Value &setting : request) {
        const std::string path = RequestPath(setting);
        Json::Value report;
        if (!folders.Upsert(report, setting)) {
            FILEIDX_LOG("%s:%d Upsert failed, folder=%s", toString(setting).c_str());
            return false;
        }
        reports[path] = report;
        if (!CollectShare(shares, path)) {
            return false;
        }
    }
    if (!folders.Save()) {
        return false;
    }
    for (const std::string &share : shares) {
        if (!UpsertVNotifydCfg(share)) {
            FILEIDX_LOG("%s:%d UpsertVNtifydCfg failed, share=%s", share.c_str());
            return false;
        }
    }
    if (VLIBServiceStart(kIndexService, kIndexServiceFlags) < 0) {
        FILEIDX_LOG_PLATFORM_ERROR("%s:%d VLIBServiceStart failed: err=[0x%04X %s:%d]");
        return false;
    }
    SwitchSpotlight(true);
    for (const Json::Value &setting : request) {
        if (!SendFolderCommand("upsert_folder_setting", RequestPath(setting))) {
            return false;
        }
    }
    for (const auto &entry : reports) {
        if (!Update(entry.first, entry.second)) {
            return false;
        }
    }
    return true;
}

bool IndexMgr::Add(const Json::Value &request)
{
    return Upsert(request);
}

bool IndexMgr::Set(const Json::Value &request)
{
    return Upsert(request);
}

bool IndexMgr::Update(const std::string &path, const Json::Value &data)
{
    std::string fullPath;
    if (!ResolveFullPath(fullPath, path)) {
        return false;
    }
    if (!AddCustomEvent(kEventFolderSettingChanged, fullPath, data)) {
        FILEIDX_LOG("%s:%d AddCustomEvent failed");
        return false;
    }
    return true;
}

bool IndexMgr::Delete(const Json::Value &request)
{
    Folders folders;
    UnlockOnReturn unlock(folders);
    if (!IsPathList(request)) {
        return RefuseRequest(request);
    }
    if (!folders.Lock(true) || !folders.Load()) {
        return false;
    }
    std::map<std::string, Json::Value> reports;
    // Folders::Delete leaves this untouched for a path that no longer resolves, which then takes
    // the previous path's report; such a path fails when its event is queued.
    Json::Value report;
    std::set<std::string> shares;
    for (const Json::Value &element : request) {
        const std::string path = element.asString();
        if (!folders.Delete(report, path)) {
            FILEIDX_LOG("%s:%d Delete failed, path=%s", path.c_str());
            return false;
        }
        reports[path] = report;
        if (!CollectShare(shares, path)) {
            return false;
        }
    }
    if (!folders.Save()) {
        return false;
    }
    if (HoldsNoFolder(folders)) {
        StopIndexing();
    } else {
        for (const Json::Value &element : request) {
            if (!SendFolderCommand("delete_folder_setting", element.asString())) {
                return false;
            }
        }
        for (const auto &entry : reports) {
            if (!Update(entry.first, entry.second)) {
                FILEIDX_LOG("%s:%d Update failed");
                return false;
            }
        }
    }
    for (const std::string &share : shares) {
        if (IsShareIndexed(share)) {
            if (!UpsertVNotifydCfg(share)) {
                FILEIDX_LOG("%s:%d UpsertVNotifydCfg failed, share=%s", share.c_str());
                return false;
            }
            continue;
        }
        if (!CleanShareIndexData(share)) {
            FILEIDX_LOG("%s:%d CleanShareIndexData failed, share=%s", share.c_str());
            return false;
        }
        if (!DeleteVNotifydCfg(share)) {
            FILEIDX_LOG("%s:%d DeleteVNtifydCfg failed, share=%s", share.c_str());
            return false;
        }
    }
    return true;
}

bool IndexMgr::Reindex(const Json::Value &paths)
{
    if (!paths.isArray()) {
        return RefusePaths(paths);
    }
    // Everything is checked before anything is done.
    std::set<std::string> noSpaceShares;
    for (const Json::Value &element : paths) {
        if (!element.isString()) {
            return RefusePaths(element);
        }
        std::string share;
        if (!GetShareNameByPath(share, element.asString())) {
            FILEIDX_LOG("%s:%d Failed to get share name from path: %s", element.asCString());
            return false;
        }
        if (!IsShareIndexed(share)) {
            return false;
        }
        if (StatusMgr::ShareIsNoSpace(share)) {
            noSpaceShares.insert(share);
        }
    }
    // A share stopped for lack of space takes part in the new indexing.
    for (const std::string &share : noSpaceShares) {
        if (!StatusMgr::ShareRevive(share)) {
            FILEIDX_LOG("%s:%d ShareRevice failed, share=%s", share.c_str());
        }
    }
    for (const Json::Value &element : paths) {
        const std::string path = element.asString();
        std::string fullPath;
        if (!ResolveFullPath(fullPath, path)) {
            return false;
        }
        if (!AddCustomEvent(kEventReindex, fullPath, Json::Value())) {
            FILEIDX_LOG("%s:%d AddCustomEvent failed, path=%s", path.c_str());
            return false;
        }
    }
    return true;
}

bool IndexMgr::ShareRemove(const std::string &share)
{
    Folders folders;
    UnlockOnReturn unlock(folders);
    std::vector<Folder> shareFolders;
    if (!folders.Lock(true) || !folders.Load() || !folders.List(shareFolders, share)) {
        return false;
    }
    Json::Value report;
    for (const Folder &folder : shareFolders) {
        if (!folders.Delete(report, folder.m_path)) {
            return false;
        }
    }
    if (!folders.Save()) {
        return false;
    }
    if (HoldsNoFolder(folders)) {
        StopIndexing();
    }
    return true;
}

bool IndexMgr::ShareRename(const std::string &oldShare, const std::string &newShare)
{
    Folders folders;
    UnlockOnReturn unlock(folders);
    std::vector<Folder> shareFolders;
    if (!folders.Lock(true) || !folders.Load() || !folders.List(shareFolders, oldShare)) {
        return false;
    }
    Json::Value report;
    for (Folder &folder : shareFolders) {
        if (!folders.Delete(report, folder.m_path)) {
            return false;
        }
        // Whether the new path resolves yet is Upsert's to judge.
        folder.SetPath(ReplaceShareName(folder.m_path, newShare));
        if (!folders.Upsert(report, folder.asJson())) {
            return false;
        }
    }
    return folders.Save();
}

bool IndexMgr::SharePause(const std::string &share)
{
    if (!SendShareCommand("delete_share_worker", share)) {
        return false;
    }
    if (!DeleteVNotifydCfg(share)) {
        FILEIDX_LOG("%s:%d DeleteVNotifydCfg failed, share=%s", share.c_str());
        return false;
    }
    return true;
}

bool IndexMgr::ShareResume(const std::string &share)
{
    if (!UpsertVNotifydCfg(share)) {
        FILEIDX_LOG("%s:%d UpsertVNotifydCfg failed, share=%s", share.c_str());
        return false;
    }
    return SendShareCommand("revive_share_worker", share);
}

bool IndexMgr::CleanShareIndexData(const std::string &share)
{
    std::string queue;
    if (!GetQueuePath(queue, share)) {
        FILEIDX_LOG("%s:%d FILEIDXQueuePathGet failed, share=%s", share.c_str());
        return false;
    }
    RemoveTree(queue);
    RemoveTree(QueueCompanionPath(queue));
    char database[kPathSize] = {};
    if (FILEIDXDBPathGet(share.c_str(), database, kPathSize) < 0) {
        FILEIDX_LOG("%s:%d FILEIDXDBPathGet failed, share=%s", share.c_str());
        return false;
    }
    RemoveTree(database);
    return true;
}

}  // namespace FILEINDEX
}  // namespace VEXO
