// IndexMgr::List (all folders, or a sorted page) and IndexMgr::Get, the locked lookup of a folder.
#include "fileindex/index_mgr.h"

#include "config/unlock_on_return.h"
#include "folder/folder_list_text.h"
#include "folder/listing.h"
#include "share/share_lookup.h"

namespace VEXO {
namespace FILEINDEX {

bool IndexMgr::List(std::vector<Folder> &out)
{
    ShareLookups lookups(Reuse::kOncePerCall);
    return LoadFolderList(out, std::string(), lookups);
}

// Loads folder.conf as Folders::Load does, then lists as Folders::List does; one context serves
// both, so that each share is looked up once for the whole call.
bool IndexMgr::List(Json::Value &out, unsigned long offset, unsigned long limit, const std::string &sort_by,
                    const std::string &sort_direction, const Json::Value &additional)
{
    CallContext context(Reuse::kOncePerCall);
    std::vector<Folder> folders;
    if (!LoadFolderList(folders, std::string(), context.shares)) {
        return false;
    }
    ListPage(std::move(folders), out, offset, limit, sort_by, sort_direction, additional, context);
    return true;
}

bool IndexMgr::Get(Json::Value &out, const std::string &path)
{
    Folders folders;
    UnlockOnReturn unlock(folders);
    return folders.Lock(true) && folders.Load() && folders.Get(out, path);
}

}  // namespace FILEINDEX
}  // namespace VEXO
