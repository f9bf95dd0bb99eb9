// The indexability rules: which shares, full paths and share-relative paths may be indexed, which
// entries the crawler skips, and the rule that refused each.
#include <cstdlib>
#include <memory>
#include <vector>

#include "config/log.h"
#include "fileindex/error.h"
#include "fileindex/utils.h"
#include "platform/fs.h"
#include "platform/share_db.h"
#include "share/share_lookup.h"
#include "share/storage_paths.h"

FILEIDX_LOG_UNIT("utils.cpp");

namespace VEXO {
namespace FILEINDEX {

namespace {

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
// cannot be told); elsewhere it is another volume grafted into the share. Whether the share uses
// encryption is asked once per share facts.
bool IsMountPointAllowed(const std::string &fullPath, ShareFacts &share)
{
    if (VEXOFSDirIsMntPoint(fullPath.c_str()) != 1) {
        return true;
    }
    if (share.mountPointAllowed < 0) {
        int usesEncryption = 0;
        const bool unencrypted = VLIBShareIsEncryptionGet(share.record, &usesEncryption) == 0 && usesEncryption == 0;
        share.mountPointAllowed = unencrypted ? 0 : 1;
    }
    if (share.mountPointAllowed == 0) {
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
    ShareLookups asked(Reuse::kAskEveryTime);
    return GetFullPathIndexRefusal(fullPath, asked);
}

// The folder's own path is judged at every call; the share's record and its share-wide rule may be
// the ones lookups got for an earlier folder of the share.
IndexRefusal GetFullPathIndexRefusal(const std::string &fullPath, ShareLookups &lookups)
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
    // Held until the end, so that a record of its own is released after the last test, as always.
    const std::shared_ptr<ShareFacts> share = lookups.FindShareFacts(shareName);
    if (share == nullptr) {
        FILEIDX_LOG("%s:%d VEXOShareGet failed, share=%s", shareName.c_str());
        return IndexRefusal::kShareLookupFailed;
    }
    if (share->refusal != IndexRefusal::kNone) {
        return share->refusal;
    }
    if (!IsMountPointAllowed(fullPath, *share)) {
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
    ShareLookups asked(Reuse::kAskEveryTime);
    return GetPathIndexRefusal(path, asked);
}

IndexRefusal GetPathIndexRefusal(const std::string &path, ShareLookups &lookups)
{
    std::string fullPath;
    if (!GetFullPath(fullPath, path, lookups)) {
        FILEIDX_LOG("%s:%d GetFullPath failed, path=%s", path.c_str());
        ErrorHandler::SetError(FILEIDX_ERR_PATH);
        return IndexRefusal::kPathUnresolved;
    }
    return GetFullPathIndexRefusal(fullPath, lookups);
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
