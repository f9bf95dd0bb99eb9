// The upgrade step: brings the indexing service, SMB Spotlight, change monitoring and the index in
// line with the folder list that survived an upgrade.
#include <set>

#include "config/log.h"
#include "fileindex/folder.h"
#include "fileindex/index_mgr.h"
#include "fileindex/utils.h"
#include "index_mgr/services.h"
#include "platform/error_state.h"
#include "platform/service.h"

FILEIDX_LOG_UNIT("utils.cpp");

namespace VEXO {
namespace FILEINDEX {

bool Updater_hvx60_beta2()
{
    Folders folders;
    std::vector<Folder> list;
    if (!folders.Load() || !folders.List(list)) {
        return false;
    }
    if (list.empty()) {
        if (VLIBServiceStop(kIndexService, kIndexServiceFlags) < 0) {
            // The start's text on purpose: it is the line upgrade logs have always carried.
            FILEIDX_LOG_PLATFORM_ERROR("%s:%d VLIBServiceStart failed: err=[0x%04X %s:%d]");
            return false;
        }
        return true;
    }
    if (VLIBServiceStart(kIndexService, kIndexServiceFlags) < 0) {
        FILEIDX_LOG_PLATFORM_ERROR("%s:%d VLIBServiceStart failed: err=[0x%04X %s:%d]");
        return false;
    }
    if (VEXOSMBSetSpotlight(1) < 0) {
        FILEIDX_LOG_PLATFORM_ERROR("%s:%d VEXOSMBSetSpotlight failed: err=[0x%04X %s:%d]");
        return false;
    }
    std::set<std::string> shares;
    Json::Value paths(Json::arrayValue);
    for (const Folder &folder : list) {
        std::string share;
        if (!GetShareNameByPath(share, folder.m_path)) {
            FILEIDX_LOG("%s:%d GetShareNameByPath failed, path=%s", folder.m_path.c_str());
            return false;
        }
        shares.insert(share);
        paths.append(folder.m_path);
    }
    for (const std::string &share : shares) {
        if (!IndexMgr::UpsertVNotifydCfg(share)) {
            FILEIDX_LOG("%s:%d UpsertVNotifydCfg failed, share=%s", share.c_str());
            return false;
        }
    }
    if (!IndexMgr::Reindex(paths)) {
        FILEIDX_LOG("%s:%d Reindex failed");
        return false;
    }
    return true;
}

}  // namespace FILEINDEX
}  // namespace VEXO
