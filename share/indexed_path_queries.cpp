// Whether a path, full path or share is indexed: IndexMgr's queries and their flat functions.
#include "fileindex/index_mgr.h"

#include "config/log.h"
#include "fileindex/fileidx.h"
#include "fileindex/utils.h"

FILEIDX_LOG_UNIT("index_mgr.cpp");

namespace VEXO {
namespace FILEINDEX {

namespace {

// P lies inside F when P + "/" begins with F + "/".
bool IsInside(const std::string &path, const std::string &folder)
{
    return StringStartWith(path + "/", folder + "/");
}

}  // namespace

bool IndexMgr::IsPathIndexed(const std::string &path, const std::vector<Folder> &folders)
{
    for (const Folder &folder : folders) {
        if (IsInside(path, folder.m_path)) {
            return true;
        }
    }
    return false;
}

bool IndexMgr::IsPathContainIndexed(const std::string &path, const std::vector<Folder> &folders)
{
    for (const Folder &folder : folders) {
        if (IsInside(folder.m_path, path)) {
            return true;
        }
    }
    return false;
}

bool IndexMgr::IsFullPathIndexed(const std::string &fullPath, const std::vector<Folder> &folders)
{
    for (const Folder &folder : folders) {
        if (IsInside(fullPath, folder.GetFullPath())) {
            return true;
        }
    }
    return false;
}

bool IndexMgr::IsPathIndexed(const std::string &path)
{
    std::vector<Folder> folders;
    return List(folders) && IsPathIndexed(path, folders);
}

bool IndexMgr::IsPathContainIndexed(const std::string &path)
{
    std::vector<Folder> folders;
    return List(folders) && IsPathContainIndexed(path, folders);
}

bool IndexMgr::IsFullPathIndexed(const std::string &fullPath)
{
    std::vector<Folder> folders;
    return List(folders) && IsFullPathIndexed(fullPath, folders);
}

bool IndexMgr::IsShareIndexed(const std::string &share)
{
    std::vector<Folder> folders;
    if (!List(folders)) {
        return false;
    }
    for (const Folder &folder : folders) {
        std::string folderShare;
        if (!GetShareNameByPath(folderShare, folder.m_path)) {
            FILEIDX_LOG("%s:%d Failed to get share name from path: %s", folder.m_path.c_str());
            continue;
        }
        if (folderShare == share) {
            return true;
        }
    }
    return false;
}

}  // namespace FILEINDEX
}  // namespace VEXO

using VEXO::FILEINDEX::IndexMgr;

int FILEIDXIsPathIndexed(const char *szPath)
{
    return szPath != nullptr && IndexMgr::IsPathIndexed(szPath) ? 1 : 0;
}

int FILEIDXIsFullPathIndexed(const char *szFullPath)
{
    return szFullPath != nullptr && IndexMgr::IsFullPathIndexed(szFullPath) ? 1 : 0;
}

int FILEIDXIsShareIndexed(const char *szShareName)
{
    return szShareName != nullptr && IndexMgr::IsShareIndexed(szShareName) ? 1 : 0;
}
