// The tools' checks of share names and share-relative paths before they reach the library.
#include "path_checks.h"

#include <sys/stat.h>

#include <algorithm>
#include <cerrno>

#include "fileindex/error.h"
#include "fileindex/index_mgr.h"
#include "fileindex/utils.h"
#include "path_encoding.h"

namespace fileindex_tool {

using namespace VEXO::FILEINDEX;

namespace {

constexpr size_t kMaxPathBytes = 4095;  // PATH_MAX less its terminating NUL

bool Refuse(Failure &failure, FailureKind kind, int code, const std::string &message)
{
    failure = ToolFailure(kind, code, message);
    return false;
}

}  // namespace

bool NormaliseFolderPath(const std::string &what, const std::string &given, std::string &path, Failure &failure)
{
    std::string normal = given;
    while (normal.size() > 1 && normal.back() == '/') {
        normal.pop_back();
    }
    // A long path is named by its first 200 bytes.
    const std::string shown = given.size() > 200 ? TerminalText(given.substr(0, 200)) + "..." : TerminalText(given);
    const char *problem = nullptr;
    if (normal.empty() || normal[0] != '/' || normal == "/") {
        problem = "is not a share-relative path";
    } else if (normal.size() > kMaxPathBytes) {
        problem = "is longer than the 4095 bytes a path may have";
    }
    for (size_t start = 1; problem == nullptr && start <= normal.size(); ) {
        const size_t end = std::min(normal.find('/', start), normal.size());
        const std::string component = normal.substr(start, end - start);
        if (component.empty()) {
            problem = "has an empty component (\"//\")";
        } else if (component == "." || component == "..") {
            problem = "has a \".\" or \"..\" component";
        }
        start = end + 1;
    }
    if (problem != nullptr) {
        return Refuse(failure, FailureKind::kInvalid, Failure::kNoCode,
                      what + ": the path " + shown + " " +
                          problem + "; give it as /<share>/<folder>, without \".\", \"..\" or empty components");
    }
    path = normal;
    return true;
}

bool CheckShareExists(const std::string &what, const std::string &share, Failure &failure)
{
    if (share.empty() || share.find('/') != std::string::npos) {
        return Refuse(failure, FailureKind::kInvalid, Failure::kNoCode,
                      what + ": \"" + TerminalText(share) + "\" is not a share name; give the name alone, "
                      "without \"/\"");
    }
    std::string fullPath;
    if (!GetFullPath(fullPath, "/" + share)) {
        return Refuse(failure, FailureKind::kNotFound, FILEIDX_ERR_PATH,
                      what + ": share " + TerminalText(share) + " does not exist; the share database has no "
                      "share of that name");
    }
    return true;
}

bool CheckPathExists(const std::string &what, const std::string &path, Failure &failure)
{
    std::string share;
    if (!GetShareNameByPath(share, path) || share.empty() || path[0] != '/') {
        return Refuse(failure, FailureKind::kInvalid, Failure::kNoCode,
                      what + ": \"" + TerminalText(path) + "\" is not a share-relative path; give it as "
                      "/<share>/<folder>");
    }
    if (!CheckShareExists(what, share, failure)) {
        return false;
    }
    std::string fullPath;
    struct stat status;
    if (GetFullPath(fullPath, path) && lstat(fullPath.c_str(), &status) == 0) {
        return true;
    }
    if (errno == ENAMETOOLONG) {
        return Refuse(failure, FailureKind::kInvalid, Failure::kNoCode,
                      what + ": the full path of " + TerminalText(path) + " is longer than the file system allows");
    }
    return Refuse(failure, FailureKind::kNotFound, FILEIDX_ERR_PATH,
                  what + ": " + TerminalText(path) + " does not exist; check the folder's name in the share");
}

bool CheckShareKnown(const std::string &what, const std::string &share, const std::vector<Folder> &folders,
                     Failure &failure)
{
    for (const Folder &folder : folders) {
        std::string folderShare;
        if (GetShareNameByPath(folderShare, folder.m_path) && folderShare == share) {
            return true;
        }
    }
    if (CheckShareExists(what, share, failure)) {
        return true;
    }
    if (failure.kind == FailureKind::kNotFound) {
        failure.message = what + ": share " + TerminalText(share) + " does not exist and holds no folder settings; "
                          "the share database has no share of that name";
    }
    return false;
}

bool CheckIndexedOrAbove(const std::string &what, const std::string &path, Failure &failure)
{
    if (IndexMgr::IsPathIndexed(path) || IndexMgr::IsPathContainIndexed(path)) {
        return true;
    }
    return Refuse(failure, FailureKind::kNotFound, FILEIDX_ERR_NO_SUCH_FOLDER,
                  what + ": " + TerminalText(path) + " is not an indexed folder, nor inside or above one; the folder "
                  "list shows the indexed folders");
}

Failure NotInFolderList(const std::string &what, const std::string &path)
{
    return ToolFailure(FailureKind::kNotFound, FILEIDX_ERR_NO_SUCH_FOLDER,
                       what + ": " + TerminalText(path) + " is not in the folder list; the folder list shows the "
                       "indexed folders");
}

bool CheckMayBeIndexed(const std::string &what, const std::string &path, Failure &failure)
{
    const IndexRefusal refusal = GetPathIndexRefusal(path);
    if (refusal != IndexRefusal::kNone) {
        return Refuse(failure, FailureKind::kRefused, Failure::kNoCode,
                      what + ": " + TerminalText(path) + " may not be indexed: " + IndexRefusalText(refusal) +
                          "; choose another folder");
    }
    return true;
}

}  // namespace fileindex_tool
