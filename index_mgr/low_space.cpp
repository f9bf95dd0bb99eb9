// Telling administrators that a share ran out of space, and the space test behind it.
#include "appliance_paths.h"
#include "config/log.h"
#include "fileindex/utils.h"
#include "platform/error_state.h"
#include "platform/fs.h"
#include "platform/service.h"
#include "platform/share_db.h"

FILEIDX_LOG_UNIT("utils.cpp");

namespace VEXO {
namespace FILEINDEX {

namespace {

// Free space a share's volume needs for indexing to go on.
constexpr unsigned long long kMinFreeSpace = 0xA00000;  // 10 MiB
// Platform errors that mean the volume (0x2900) or the quota (0x2400) is really short of space.
constexpr int kErrNoSpace = 0x2900;
constexpr int kErrQuotaExceeded = 0x2400;
constexpr int kExecOption = 1;

}  // namespace

bool IsShareSpaceEnough(const std::string &share)
{
    PVEXOSHARE record = nullptr;
    if (VEXOShareGet(share.c_str(), &record) < 0) {
        FILEIDX_LOG("%s:%d VEXOShareGet failed, share=%s", share.c_str());
        return false;
    }
    bool enough = VEXOQuotaIsEnough(0, record->szPath, kMinFreeSpace) != 0;
    if (!enough) {
        // Only a definite shortage counts; a quota that cannot be read does not stop indexing.
        const int reason = VLIBCErrGet();
        enough = reason != kErrNoSpace && reason != kErrQuotaExceeded;
    }
    VEXOShareFree(record);
    return enough;
}

bool NotifyNoSpace()
{
    const char *const argv[] = {
        FILEINDEX_NOTIFY_TOOL_PATH,
        "-e",
        "false",
        "-c",
        "VEXO.KTP.AdminCenter.Application",
        "@administrators",
        "fileindex:fileindex_title",
        "fileindex:notify_no_space",
        "<a data-vexo-app=\"VEXO.KTP.AdminCenter.Application\" data-vexo-fn=\"VEXO.KTP.AdminCenter.MediaIndex.Main\" "
        "data-vexo-tab=\"fileIndex\">",
        "</a>",
        nullptr,
    };
    return VLIBCExecv(FILEINDEX_NOTIFY_TOOL_PATH, argv, kExecOption) == 0;
}

}  // namespace FILEINDEX
}  // namespace VEXO
