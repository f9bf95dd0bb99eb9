#include "fileindex/utils.h"

#include <sys/stat.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <vector>

#include "config/file_io.h"
#include "config/log.h"
#include "fileindex/error.h"
#include "fileindex/fileidx.h"
#include "platform/error_state.h"
#include "platform/fs.h"
#include "platform/share_db.h"
#include "share/share_lookup.h"
#include "share/storage_paths.h"

FILEIDX_LOG_UNIT("utils.cpp");

namespace VEXO {
namespace FILEINDEX {

namespace {

constexpr int kShareNameSize = 492;
constexpr int kSharePathSize = 4096;
constexpr int kPlatformBadParameter = 0x0D00;
constexpr int kRealpathSize = 4096;

// VEXOGetFSType's answer when the type cannot be determined.
constexpr int kFsTypeUnknown = -1;
// A platform file-system type that is never indexed; treated like an image file system.
constexpr int kFsTypeTreatedAsImage = 12;

// Entry names that are never indexed: the platform's temporary and desktop litter, and what each
// share keeps for the index itself. Built when the library is loaded; compared byte for byte.
const std::vector<std::string> kPreservedFileNames = {
    ".TemporaryItems", kDatabaseDirName, kQueueFileName, ".VEXOPPSDB", ".DS_Store",
};
// Shares that are never indexed (exact, case-sensitive names).
const std::vector<std::string> kExcludedShareNames = {"surveillance", "NetBackup"};

using ShareRecord = std::unique_ptr<VEXOSHARE, decltype(&VEXOShareFree)>;

// Formats S/@eaDir/<name> of the share into out (truncated to its size), making S/@eaDir (through
// a work buffer of 4096 bytes) and, for the database, the final directory on the way. The length
// written, or -1 when the arguments are invalid or the share is unknown.
int StoragePathGet(const char *szName, char *szOut, int cbOutLen, const char *outArgument, const char *name,
                   bool makeFinalDir)
{
    const char *invalid = szName == nullptr ? "__null != szName"
                          : szOut == nullptr ? outArgument
                          : cbOutLen <= 0    ? "cbOutLen > 0"
                                             : nullptr;
    if (invalid != nullptr) {
        FILEIDX_LOG("%s:%d Invaild Argument (%s)=[%d]\n", invalid, 0);
        VLIBCErrSetEx(kPlatformBadParameter, kLogUnit, __LINE__);
        return -1;
    }
    PVEXOSHARE share = nullptr;
    if (VEXOShareGet(szName, &share) < 0) {
        FILEIDX_LOG("%s:%d VEXOShareGet failed, name=%s, code=%d", szName, VLIBCErrGet());
        return -1;
    }
    char metadataDir[kSharePathSize];
    snprintf(metadataDir, sizeof(metadataDir), "%s", MetadataDirPath(share->szPath).c_str());
    if (VEXOEAMKDir(0, metadataDir) < 0) {
        FILEIDX_LOG("%s:%d VEXOEAMKDir failed, path=%s, code=%d", metadataDir, VLIBCErrGet());
    }
    const std::string path = StoragePath(share->szPath, name);
    snprintf(szOut, static_cast<size_t>(cbOutLen), "%s", path.c_str());
    // The full path is made whatever the caller's buffer holds; a symbolic link at "@eaDir" or at
    // the directory itself, planted by a share user, is refused rather than followed.
    if (makeFinalDir && MakeDirectory(path, 0777) != 0) {
        FILEIDX_LOG("%s:%d mkdir failed, path=%s, reason=%m", path.c_str());
    }
    VEXOShareFree(share);
    return static_cast<int>(strlen(szOut));
}

}  // namespace

// ---- Share and path resolution ----

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
    std::string share;
    if (!GetShareNameByPath(share, path)) {
        FILEIDX_LOG("%s:%d GetShareNameByPath failed, path=%s", path.c_str());
        return false;
    }
    std::string sharePath;
    if (!OneShareLookupPerCall::Find(share, sharePath)) {
        PVEXOSHARE record = nullptr;
        if (VEXOShareGet(share.c_str(), &record) < 0) {
            ErrorHandler::SetError(FILEIDX_ERR_PATH);
            return false;
        }
        sharePath = record->szPath;
        VEXOShareFree(record);
        OneShareLookupPerCall::Keep(share, sharePath);
    }
    const size_t lastSlash = sharePath.rfind('/');
    fullPath = (lastSlash == std::string::npos ? sharePath : sharePath.substr(0, lastSlash)) + path;
    return true;
}

namespace {
thread_local OneShareLookupPerCall *t_shareLookups = nullptr;
}  // namespace

OneShareLookupPerCall::OneShareLookupPerCall() : m_outer(t_shareLookups)
{
    t_shareLookups = this;
}

OneShareLookupPerCall::~OneShareLookupPerCall()
{
    t_shareLookups = m_outer;
}

bool OneShareLookupPerCall::Find(const std::string &share, std::string &sharePath)
{
    if (t_shareLookups == nullptr) {
        return false;
    }
    const auto found = t_shareLookups->m_sharePaths.find(share);
    if (found == t_shareLookups->m_sharePaths.end()) {
        return false;
    }
    sharePath = found->second;
    return true;
}

void OneShareLookupPerCall::Keep(const std::string &share, const std::string &sharePath)
{
    if (t_shareLookups != nullptr) {
        t_shareLookups->m_sharePaths.emplace(share, sharePath);
    }
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

bool GetQueuePath(std::string &queuePath, const std::string &share)
{
    char buffer[kSharePathSize] = {};
    if (FILEIDXQueuePathGet(share.c_str(), buffer, kSharePathSize) < 0) {
        return false;
    }
    queuePath = buffer;
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

// ---- Typed JSON members ----

namespace {

// object[key] when object is an object holding that member, else null; one look-up.
const Json::Value *FindMember(const Json::Value &object, const std::string &key)
{
    return object.isObject() ? object.find(key.data(), key.data() + key.size()) : nullptr;
}

}  // namespace

bool RetrieveStringFromJsonObj(std::string &value, const std::string &key, const Json::Value &object)
{
    const Json::Value *member = FindMember(object, key);
    if (member == nullptr || !member->isString()) {
        return false;
    }
    value = member->asString();
    return true;
}

bool RetrieveBoolFromJsonObj(bool &value, const std::string &key, const Json::Value &object)
{
    const Json::Value *member = FindMember(object, key);
    if (member == nullptr || !member->isBool()) {
        return false;
    }
    value = member->asBool();
    return true;
}

// ---- Indexability ----

namespace {

bool Contains(const std::string &text, const char *part)
{
    return text.find(part) != std::string::npos;
}

// Recycle bins and snapshots are searched for in the text first, at any depth, and confirmed by
// the platform.
bool IsInRecycleBin(const std::string &fullPath)
{
    return Contains(fullPath, "#recycle") && VEXOShareIsShareRecycle(fullPath.c_str()) != 0;
}

bool IsInSnapshot(const std::string &fullPath)
{
    int inSnapshot = 0;
    return Contains(fullPath, "#snapshot") && VLIBFhsPathInSnapshot(fullPath.c_str(), &inSnapshot) == 0 &&
           inSnapshot == 1;
}

// Network file systems, file systems mounted from images, and type 12 are never indexed; the
// platform is asked in this order, and no further once one says yes.
IndexRefusal GetFsTypeRefusal(int fsType)
{
    if (VEXOFSIsRemoteFS(fsType) != 0) {
        return IndexRefusal::kRemoteFileSystem;
    }
    if (VEXOFSIsImageFS(fsType) != 0) {
        return IndexRefusal::kImageFileSystem;
    }
    return fsType == kFsTypeTreatedAsImage ? IndexRefusal::kFileSystemType12 : IndexRefusal::kNone;
}

// A mount point may be indexed only inside a share that uses encryption (or whose encryption
// cannot be told); elsewhere it is another volume grafted into the share.
bool IsMountPointAllowed(const std::string &fullPath, VEXOSHARE *share)
{
    if (VEXOFSDirIsMntPoint(fullPath.c_str()) != 1) {
        return true;
    }
    int usesEncryption = 0;
    if (VLIBShareIsEncryptionGet(share, &usesEncryption) == 0 && usesEncryption == 0) {
        FILEIDX_LOG("%s:%d Mount point[%s] is not allowed to be indexed", fullPath.c_str());
        return false;
    }
    return true;
}

// The path must be its own canonical form: no symbolic link on the way, no "." or ".." components,
// no doubled or trailing "/".
bool IsCanonical(const std::string &fullPath)
{
    char canonical[kRealpathSize];
    if (realpath(fullPath.c_str(), canonical) == nullptr || fullPath != canonical) {
        FILEIDX_LOG("%s:%d check realpath failed, path=%s", fullPath.c_str());
        return false;
    }
    return true;
}

}  // namespace

bool IsSystemPreservedFileName(const std::string &name)
{
    if (VEXOEAIsHiddenDir(name.c_str()) == 1) {
        return true;
    }
    for (const std::string &preserved : kPreservedFileNames) {
        if (name == preserved) {
            return true;
        }
    }
    return false;
}

IndexRefusal GetShareIndexRefusal(_tag_VEXOSHARE *share)
{
    if (share == nullptr) {
        return IndexRefusal::kShareLookupFailed;
    }
    for (const std::string &excluded : kExcludedShareNames) {
        if (excluded == share->szName) {
            return IndexRefusal::kExcludedShare;
        }
    }
    int isEncrypted = 0;
    int isReadOnly = 0;
    if (VLIBShareIsEncryptedGet(share, &isEncrypted) < 0 || VLIBShareIsReadOnlyGet(share, &isReadOnly) < 0) {
        return IndexRefusal::kShareStateUnreadable;
    }
    return isEncrypted != 0  ? IndexRefusal::kEncryptedShare
           : isReadOnly != 0 ? IndexRefusal::kReadOnlyShare
                             : IndexRefusal::kNone;
}

bool CanShareBeIndexed(_tag_VEXOSHARE *share)
{
    return GetShareIndexRefusal(share) == IndexRefusal::kNone;
}

IndexRefusal GetFullPathIndexRefusal(const std::string &fullPath)
{
    if (IsInRecycleBin(fullPath)) {
        return IndexRefusal::kRecycleBin;
    }
    if (IsInSnapshot(fullPath)) {
        return IndexRefusal::kSnapshot;
    }
    const int fsType = VEXOGetFSType(fullPath.c_str(), 0);
    if (fsType == kFsTypeUnknown) {
        return IndexRefusal::kUnknownFileSystem;
    }
    const IndexRefusal fsRefusal = GetFsTypeRefusal(fsType);
    if (fsRefusal != IndexRefusal::kNone) {
        return fsRefusal;
    }
    std::string shareName;
    std::string sharePath;
    if (!GetShareNamePathByFullPath(shareName, sharePath, fullPath)) {
        FILEIDX_LOG("%s:%d GetShareNamePathByFullPath failed, path=%s", fullPath.c_str());
        return IndexRefusal::kNoShare;
    }
    PVEXOSHARE record = nullptr;
    if (VEXOShareGet(shareName.c_str(), &record) < 0) {
        FILEIDX_LOG("%s:%d VEXOShareGet failed, share=%s", shareName.c_str());
        return IndexRefusal::kShareLookupFailed;
    }
    const ShareRecord share(record, &VEXOShareFree);
    const IndexRefusal shareRefusal = GetShareIndexRefusal(share.get());
    if (shareRefusal != IndexRefusal::kNone) {
        return shareRefusal;
    }
    if (!IsMountPointAllowed(fullPath, share.get())) {
        return IndexRefusal::kMountPoint;
    }
    return IsCanonical(fullPath) ? IndexRefusal::kNone : IndexRefusal::kNotCanonical;
}

bool CanFullPathBeIndexed(const std::string &fullPath)
{
    return GetFullPathIndexRefusal(fullPath) == IndexRefusal::kNone;
}

IndexRefusal GetPathIndexRefusal(const std::string &path)
{
    std::string fullPath;
    if (!GetFullPath(fullPath, path)) {
        FILEIDX_LOG("%s:%d GetFullPath failed, path=%s", path.c_str());
        ErrorHandler::SetError(FILEIDX_ERR_PATH);
        return IndexRefusal::kPathUnresolved;
    }
    return GetFullPathIndexRefusal(fullPath);
}

bool CanPathBeIndexed(const std::string &path)
{
    return GetPathIndexRefusal(path) == IndexRefusal::kNone;
}

IndexRefusal GetSkipIndexRefusal(const std::string &fullPath)
{
    // The type is asked for first, whatever decides in the end.
    const int fsType = VEXOGetFSType(fullPath.c_str(), 0);
    const size_t lastSlash = fullPath.rfind('/');
    if (lastSlash == std::string::npos) {
        return IndexRefusal::kNoDirectory;
    }
    if (IsSystemPreservedFileName(fullPath.substr(lastSlash + 1))) {
        return IndexRefusal::kReservedName;
    }
    if (IsInRecycleBin(fullPath)) {
        return IndexRefusal::kRecycleBin;
    }
    if (IsInSnapshot(fullPath)) {
        return IndexRefusal::kSnapshot;
    }
    // Unlike CanFullPathBeIndexed, the crawler keeps entries whose file system cannot be told.
    return fsType == kFsTypeUnknown ? IndexRefusal::kNone : GetFsTypeRefusal(fsType);
}

bool IsSkipIndex(const std::string &fullPath)
{
    return GetSkipIndexRefusal(fullPath) != IndexRefusal::kNone;
}

}  // namespace FILEINDEX
}  // namespace VEXO

// ---- Per-share storage locations ----

int FILEIDXQueuePathGet(const char *szName, char *szOutQueuePath, int cbOutLen)
{
    return VEXO::FILEINDEX::StoragePathGet(szName, szOutQueuePath, cbOutLen, "__null != szOutQueuePath",
                                           VEXO::FILEINDEX::kQueueFileName, false);
}

int FILEIDXDBPathGet(const char *szName, char *szOutDBPath, int cbOutLen)
{
    return VEXO::FILEINDEX::StoragePathGet(szName, szOutDBPath, cbOutLen, "__null != szOutDBPath",
                                           VEXO::FILEINDEX::kDatabaseDirName, true);
}
