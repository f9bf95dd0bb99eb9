// Registration of a share's indexed folders with the file-change notification daemon.
#include <memory>

#include "config/log.h"
#include "fileindex/index_mgr.h"
#include "fileindex/utils.h"
#include "folder/folder_list_text.h"
#include "platform/monitor_queue.h"
#include "share/share_lookup.h"
#include "share/storage_paths.h"

FILEIDX_LOG_UNIT("index_mgr.cpp");

namespace VEXO {
namespace FILEINDEX {

namespace {

using VNOTIFYD::MonitorQueue;

const char kMonitorOwner[] = "fileindex";
constexpr VNOTIFYD::_tag_monitor_queue_type_ kMonitorQueueType = VNOTIFYD::MONITOR_QUEUE_TYPE_1;
// Change events the indexing daemon wants to hear of, as the notification daemon numbers them.
constexpr int kMonitorMask = 0xFFCE;

}  // namespace

bool IndexMgr::UpsertVNotifydCfg(const std::string &share)
{
    std::string queuePath;
    if (!GetQueuePath(queuePath, share)) {
        FILEIDX_LOG("%s:%d FILEIDXQueuePathGet failed, share=%s", share.c_str());
        return false;
    }
    std::vector<Folder> shareFolders;
    ShareLookups asked(Reuse::kAskEveryTime);
    if (!LoadFolderList(shareFolders, share, asked)) {
        return false;
    }

    Json::Value ignore(Json::arrayValue);
    ignore.append(kMetadataDirName);
    Json::Value config(Json::arrayValue);
    for (const Folder &folder : shareFolders) {
        std::string fullPath;
        if (!GetFullPath(fullPath, folder.m_path)) {
            FILEIDX_LOG("%s:%d GetFullPath failed, path=%s", folder.m_path.c_str());
            return false;
        }
        Json::Value entry(Json::objectValue);
        entry["path"] = fullPath;
        entry["mask"] = kMonitorMask;
        entry["ignore"] = ignore;
        config.append(entry);
    }
    Json::Value description(Json::objectValue);
    description["queue"] = queuePath;
    description["config"] = config;

    std::unique_ptr<MonitorQueue> queue;
    try {
        queue = std::make_unique<MonitorQueue>(description);
    } catch (...) {
        return false;
    }
    if (!MonitorQueue::Upsert(*queue, kMonitorOwner, kMonitorQueueType)) {
        FILEIDX_LOG("%s:%d MonitorQueue::Add failed");
        return false;
    }
    return true;
}

bool IndexMgr::DeleteVNotifydCfg(const std::string &share)
{
    std::string queuePath;
    if (!GetQueuePath(queuePath, share)) {
        FILEIDX_LOG("%s:%d FILEIDXQueuePathGet failed, share=%s", share.c_str());
        return false;
    }
    if (!MonitorQueue::Delete(queuePath, kMonitorOwner, kMonitorQueueType)) {
        FILEIDX_LOG("%s:%d MonitorQueue::Delete failed");
        return false;
    }
    return true;
}

}  // namespace FILEINDEX
}  // namespace VEXO
