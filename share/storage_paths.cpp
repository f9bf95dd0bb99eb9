// The per-share storage locations handed out by the flat functions: the event queue file and the
// index database directory inside the share's "@eaDir", made on the way.
#include <cstdio>
#include <cstring>

#include "config/file_io.h"
#include "config/log.h"
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

constexpr int kPlatformBadParameter = 0x0D00;

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
    if (makeFinalDir && !MakeDirectory(path, 0777)) {
        FILEIDX_LOG("%s:%d mkdir failed, path=%s, reason=%m", path.c_str());
    }
    VEXOShareFree(share);
    return static_cast<int>(strlen(szOut));
}

}  // namespace

bool GetQueuePath(std::string &queuePath, const std::string &share)
{
    char buffer[kSharePathSize] = {};
    if (FILEIDXQueuePathGet(share.c_str(), buffer, kSharePathSize) < 0) {
        return false;
    }
    queuePath = buffer;
    return true;
}

}  // namespace FILEINDEX
}  // namespace VEXO

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
