// IndexMgr::List (all folders, or a sorted page) and IndexMgr::Get, the locked lookup of a folder.
#include "fileindex/index_mgr.h"

#include "config/unlock_on_return.h"
#include "folder/folder_list_text.h"
#include "share/share_lookup.h"

namespace VEXO {
namespace FILEINDEX {

bool IndexMgr::List(std::vector<Folder> &out)
{
    const OneShareLookupPerCall shareLookups;
    return LoadFolderList(out, std::string());
}

bool IndexMgr::List(Json::Value &out, unsigned long offset, unsigned long limit, const std::string &sort_by,
                    const std::string &sort_direction, const Json::Value &additional)
{
    Folders folders;
    return folders.Load() && folders.List(out, offset, limit, sort_by, sort_direction, additional);
}

bool IndexMgr::Get(Json::Value &out, const std::string &path)
{
    Folders folders;
    UnlockOnReturn unlock(folders);
    return folders.Lock(true) && folders.Load() && folders.Get(out, path);
}

}  // namespace FILEINDEX
}  // namespace VEXO
