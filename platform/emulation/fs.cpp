// File-system and storage queries, answered by the host's own file systems.
#include "platform/fs.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/statfs.h>
#include <sys/statvfs.h>

#include <cerrno>
#include <cstring>
#include <optional>
#include <string>

#include "api.h"
#include "faults.h"
#include "journal.h"
#include "json_text.h"
#include "share/storage_paths.h"
#include "shares.h"

namespace VEXO {
namespace EMULATION {
namespace {

// The platform's file-system type codes, numbered from 0 as docs/emulation.md lists them.
enum FsTypeCode {
    kFsOther,                                                               // a file system not known here
    kFsExt, kFsBtrfs, kFsXfs, kFsTmpfs, kFsOverlay, kFsFat, kFsEcryptfs,   // 1-7: local
    kFsNfs, kFsCifs,                                                        // 8-9: remote
    kFsIso9660, kFsUdf,                                                     // 10-11: images
    kFsFuse,                                                                // 12: local
    kFsSquashfs,                                                            // 13: image
};
static_assert(kFsSquashfs == 13, "the codes are the platform's");

struct MagicCode {
    unsigned long magic;  // statfs f_type
    int code;
};

constexpr MagicCode kFsTypes[] = {
    {0xEF53UL, kFsExt},             // ext2, ext3, ext4
    {0x9123683EUL, kFsBtrfs},
    {0x58465342UL, kFsXfs},
    {0x01021994UL, kFsTmpfs},
    {0x858458F6UL, kFsTmpfs},       // ramfs
    {0x794C7630UL, kFsOverlay},
    {0x4D44UL, kFsFat},             // vfat, msdos
    {0x2011BAB0UL, kFsFat},         // exfat
    {0xF15FUL, kFsEcryptfs},
    {0x6969UL, kFsNfs},
    {0xFF534D42UL, kFsCifs},        // cifs
    {0xFE534D42UL, kFsCifs},        // smb2
    {0x517BUL, kFsCifs},            // smb
    {0x9660UL, kFsIso9660},
    {0x15013346UL, kFsUdf},
    {0x65735546UL, kFsFuse},
    {0x73717368UL, kFsSquashfs},
};

// The names the platform keeps its own metadata under, hidden from users and from indexing.
constexpr const char *kHiddenDirNames[] = {FILEINDEX::kMetadataDirName};

int CodeOfMagic(unsigned long magic)
{
    for (const MagicCode &entry : kFsTypes) {
        if (entry.magic == magic) {
            return entry.code;
        }
    }
    return kFsOther;
}

bool IsMountRoot(const char *path, const struct stat &dir)
{
    struct statx info;
    if (statx(AT_FDCWD, path, 0, STATX_BASIC_STATS, &info) == 0 && (info.stx_attributes_mask & STATX_ATTR_MOUNT_ROOT) &&
        (info.stx_attributes & STATX_ATTR_MOUNT_ROOT)) {
        return true;  // also catches bind mounts, which keep their device
    }
    struct stat parent;
    if (stat((std::string(path) + "/..").c_str(), &parent) != 0) {
        return false;
    }
    return parent.st_dev != dir.st_dev || parent.st_ino == dir.st_ino;
}

}  // namespace
}  // namespace EMULATION
}  // namespace VEXO

using namespace VEXO::EMULATION;

extern "C" VEXOEMU_API int VEXOGetFSType(const char *szPath, int /*flags*/)
{
    return Guarded(-1, [&] {
        if (const std::optional<int> forced = ForcedResult("VEXOGetFSType", szPath)) {
            return *forced;
        }
        struct statfs info;
        if (szPath == nullptr) {
            EMU_SET_ERROR(kErrBadArgument);
            return -1;
        }
        if (statfs(szPath, &info) != 0) {
            EMU_SET_ERROR(kErrFileSystem);
            return -1;
        }
        return CodeOfMagic(static_cast<unsigned long>(info.f_type) & 0xFFFFFFFFUL);
    });
}

extern "C" VEXOEMU_API int VEXOFSIsRemoteFS(int fsType)
{
    return Guarded(0, [&] {
        if (const std::optional<int> forced = ForcedResult("VEXOFSIsRemoteFS", nullptr)) {
            return *forced;
        }
        return fsType == kFsNfs || fsType == kFsCifs ? 1 : 0;
    });
}

extern "C" VEXOEMU_API int VEXOFSIsImageFS(int fsType)
{
    return Guarded(0, [&] {
        if (const std::optional<int> forced = ForcedResult("VEXOFSIsImageFS", nullptr)) {
            return *forced;
        }
        return fsType == kFsIso9660 || fsType == kFsUdf || fsType == kFsSquashfs ? 1 : 0;
    });
}

extern "C" VEXOEMU_API int VEXOFSDirIsMntPoint(const char *szPath)
{
    return Guarded(-1, [&] {
        if (const std::optional<int> forced = ForcedResult("VEXOFSDirIsMntPoint", szPath)) {
            return *forced;
        }
        if (szPath == nullptr || *szPath == '\0') {
            EMU_SET_ERROR(kErrBadArgument);
            return -1;
        }
        struct stat dir;
        if (stat(szPath, &dir) != 0 || !S_ISDIR(dir.st_mode)) {
            EMU_SET_ERROR(kErrFileSystem);
            return -1;
        }
        return IsMountRoot(szPath, dir) ? 1 : 0;
    });
}

extern "C" VEXOEMU_API int VLIBFhsPathInSnapshot(const char *szPath, int *pInSnapshot)
{
    return Guarded(-1, [&] {
        if (const std::optional<int> forced = ForcedResult("VLIBFhsPathInSnapshot", szPath)) {
            if (pInSnapshot != nullptr) {
                *pInSnapshot = 0;
            }
            return *forced;
        }
        if (szPath == nullptr || pInSnapshot == nullptr) {
            EMU_SET_ERROR(kErrBadArgument);
            return -1;
        }
        bool inSnapshot = false;
        if (!IsInShareSubdirectory(szPath, "#snapshot", inSnapshot)) {
            return -1;
        }
        *pInSnapshot = inSnapshot ? 1 : 0;
        return 0;
    });
}

extern "C" VEXOEMU_API int VEXOEAMKDir(int flags, const char *szPath)
{
    return Guarded(-1, [&] {
        Json::Value args(Json::arrayValue);
        args.append(flags);
        args.append(TextValue(szPath));
        if (const std::optional<int> forced = ForcedResult("VEXOEAMKDir", szPath)) {
            JournalCall("VEXOEAMKDir", args, *forced, true);
            return *forced;
        }
        int result = 0;
        struct stat existing;
        if (szPath == nullptr || *szPath == '\0') {
            EMU_SET_ERROR(kErrBadArgument);
            result = -1;
        } else if (mkdir(szPath, 0777) != 0 &&
                   !(errno == EEXIST && stat(szPath, &existing) == 0 && S_ISDIR(existing.st_mode))) {
            EMU_SET_ERROR(kErrFileSystem);
            result = -1;
        }
        JournalCall("VEXOEAMKDir", args, result, false);
        return result;
    });
}

extern "C" VEXOEMU_API int VEXOEAIsHiddenDir(const char *szName)
{
    return Guarded(0, [&] {
        if (const std::optional<int> forced = ForcedResult("VEXOEAIsHiddenDir", szName)) {
            return *forced;
        }
        if (szName == nullptr) {
            return 0;
        }
        for (const char *hidden : kHiddenDirNames) {
            if (std::strcmp(szName, hidden) == 0) {
                return 1;
            }
        }
        return 0;
    });
}

extern "C" VEXOEMU_API int VEXOQuotaIsEnough(int /*flags*/, const char *szPath, unsigned long long cbSize)
{
    return Guarded(0, [&] {
        if (const std::optional<int> forced = ForcedResult("VEXOQuotaIsEnough", szPath)) {
            return *forced;
        }
        struct statvfs info;
        if (szPath == nullptr) {
            EMU_SET_ERROR(kErrBadArgument);
            return 0;
        }
        if (statvfs(szPath, &info) != 0) {
            EMU_SET_ERROR(kErrFileSystem);
            return 0;
        }
        const unsigned __int128 available = static_cast<unsigned __int128>(info.f_bavail) * info.f_frsize;
        if (available < cbSize) {
            EMU_SET_ERROR(kErrSpaceShort);
            return 0;
        }
        return 1;
    });
}
