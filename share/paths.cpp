// Share and path resolution: share names cut from share-relative paths, full paths through the
// share database (each share's path taken from a call's ShareLookups), the share of a full path,
// share renames in a path, and the file tests.
#include <sys/stat.h>

#include "config/log.h"
#include "fileindex/error.h"
#include "fileindex/utils.h"
#include "platform/share_db.h"
#include "share/share_lookup.h"

FILEIDX_LOG_UNIT("utils.cpp");

namespace VEXO {
namespace FILEINDEX {

bool GetShareNameByPath(std::string &share, const std::string &path)
{
    if (path.empty()) {
        return false;
    }
    const size_t slash = path.find('/', 1);
    share = path.substr(1, slash == std::string::npos ? std::string::npos : slash - 1);
    return true;
}

bool GetFullPath(std::string &fullPath, const std::string &path)
{
    ShareLookups asked(Reuse::kAskEveryTime);
    return GetFullPath(fullPath, path, asked);
}

bool GetFullPath(std::string &fullPath, const std::string &path, ShareLookups &lookups)
{
    std::string share;
    if (!GetShareNameByPath(share, path)) {
        FILEIDX_LOG("%s:%d GetShareNameByPath failed, path=%s", path.c_str());
        return false;
    }
    std::string sharePath;
    if (!lookups.FindSharePath(share, sharePath)) {
        ErrorHandler::SetError(FILEIDX_ERR_PATH);
        return false;
    }
    const size_t lastSlash = sharePath.rfind('/');
    fullPath = (lastSlash == std::string::npos ? sharePath : sharePath.substr(0, lastSlash)) + path;
    return true;
}

bool FindShareOfFullPath(std::string &share, std::string &sharePath, const std::string &fullPath)
{
    char nameBuffer[kShareNameSize] = {};
    char pathBuffer[kSharePathSize] = {};
    if (VEXOShareNamePathGet(fullPath.c_str(), nameBuffer, kShareNameSize, pathBuffer, kSharePathSize) < 0) {
        FILEIDX_LOG("%s:%d VEXOShareNamePathGet failed, path=%s", fullPath.c_str());
        return false;
    }
    share = nameBuffer;
    sharePath = pathBuffer;
    return true;
}

bool GetShareNamePathByFullPath(std::string &share, std::string &sharePath, const std::string &fullPath)
{
    if (!FindShareOfFullPath(share, sharePath, fullPath)) {
        ErrorHandler::SetError(FILEIDX_ERR_PATH);
        return false;
    }
    return true;
}

std::string ReplaceShareName(const std::string &path, const std::string &share)
{
    if (path.empty()) {
        return std::string();
    }
    const size_t slash = path.find('/', 1);
    return "/" + share + (slash == std::string::npos ? std::string() : path.substr(slash));
}

bool StringStartWith(const std::string &text, const std::string &prefix)
{
    return text.size() >= prefix.size() && text.compare(0, prefix.size(), prefix) == 0;
}

bool IsDirExist(const std::string &path)
{
    struct stat64 st;
    return lstat64(path.c_str(), &st) == 0 && S_ISDIR(st.st_mode);
}

bool IsFileExist(const std::string &path)
{
    struct stat64 st;
    return lstat64(path.c_str(), &st) == 0 && S_ISREG(st.st_mode);
}

}  // namespace FILEINDEX
}  // namespace VEXO
