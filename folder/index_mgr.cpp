#include "fileindex/index_mgr.h"

#include "config/file_io.h"
#include "config/unlock_on_return.h"
#include "fileindex/utils.h"
#include "folder/folder_list_text.h"
#include "share/share_lookup.h"

namespace VEXO {
namespace FILEINDEX {

bool IndexMgr::List(std::vector<Folder> &out)
{
    const OneShareLookupPerCall shareLookups;
    Folders folders;
    const std::string path = folders.GetPath();
    if (!IsFileExist(path)) {
        out.clear();  // the first-run state: no folders
        return true;
    }
    std::string text;
    if (ReadWholeFile(path, text) && ReadFolderListText(text, out)) {
        return true;
    }
    return folders.Load() && folders.List(out);
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
