// The share database of the platform interface, answered from shares.json.
#include "platform/share_db.h"

#include <algorithm>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <optional>
#include <string>

#include "api.h"
#include "faults.h"
#include "shares.h"

namespace VEXO {
namespace EMULATION {
namespace {

// The record VEXOShareGet hands out: the public part first, then the flags the getters read.
struct ShareRecord {
    VEXOSHARE pub;
    bool encrypted;
    bool usesEncryption;
    bool readOnly;
};

static_assert(offsetof(ShareRecord, pub) == 0, "a PVEXOSHARE must point at its ShareRecord");

const ShareRecord *RecordOf(const VEXOSHARE *share)
{
    return reinterpret_cast<const ShareRecord *>(share);
}

void CopyTruncated(char *buffer, int size, const std::string &text)
{
    const size_t length = std::min(text.size(), static_cast<size_t>(size) - 1);
    std::memcpy(buffer, text.data(), length);
    buffer[length] = '\0';
}

// The share find picks for key from the current database; shares keeps the answer alive. Null, with
// the error state set, when key is null or the outputs are not usable (kErrBadArgument), the
// database fails (kErrStateFile) or holds no such share (kErrNoSuchShare).
const ShareInfo *LookUp(std::shared_ptr<const ShareList> &shares,
                        const ShareInfo *(*find)(const ShareList &, const char *), const char *key, bool outputsUsable)
{
    if (key == nullptr || !outputsUsable) {
        EMU_SET_ERROR(kErrBadArgument);
        return nullptr;
    }
    shares = LoadShares();
    const ShareInfo *share = shares != nullptr ? find(*shares, key) : nullptr;
    if (shares != nullptr && share == nullptr) {
        EMU_SET_ERROR(kErrNoSuchShare);
    }
    return share;
}

// The common shape of the three flag getters.
int GetFlag(const char *op, const VEXOSHARE *share, int *flag, bool ShareRecord::*member)
{
    return Guarded(-1, [&] {
        const std::optional<int> forced = ForcedResult(op, share != nullptr ? share->szName : nullptr);
        if (forced) {
            if (flag != nullptr) {
                *flag = 0;
            }
            return *forced;
        }
        if (share == nullptr || flag == nullptr) {
            EMU_SET_ERROR(kErrBadArgument);
            return -1;
        }
        *flag = RecordOf(share)->*member ? 1 : 0;
        return 0;
    });
}

}  // namespace
}  // namespace EMULATION
}  // namespace VEXO

using namespace VEXO::EMULATION;

extern "C" VEXOEMU_API int VEXOShareGet(const char *szName, PVEXOSHARE *ppShare)
{
    return Guarded(-1, [&] {
        if (ppShare != nullptr) {
            *ppShare = nullptr;
        }
        if (const std::optional<int> forced = ForcedResult("VEXOShareGet", szName)) {
            return *forced < 0 ? *forced : -1;  // a forced look-up never yields a record
        }
        std::shared_ptr<const ShareList> shares;
        const ShareInfo *share = LookUp(shares, FindShareByName, szName, ppShare != nullptr);
        if (share == nullptr) {
            return -1;
        }
        ShareRecord *record = static_cast<ShareRecord *>(std::calloc(1, sizeof(ShareRecord)));
        if (record == nullptr || (record->pub.szName = strdup(share->name.c_str())) == nullptr ||
            (record->pub.szPath = strdup(share->path.c_str())) == nullptr) {
            VEXOShareFree(record != nullptr ? &record->pub : nullptr);
            EMU_SET_ERROR(kErrInternal);
            return -1;
        }
        record->encrypted = share->encrypted;
        record->usesEncryption = share->usesEncryption;
        record->readOnly = share->readOnly;
        *ppShare = &record->pub;
        return 0;
    });
}

extern "C" VEXOEMU_API void VEXOShareFree(PVEXOSHARE pShare)
{
    if (pShare == nullptr) {
        return;
    }
    std::free(pShare->szName);
    std::free(pShare->szPath);
    std::free(pShare);
}

extern "C" VEXOEMU_API int VEXOShareNamePathGet(const char *szFullPath, char *szName, int cbName, char *szSharePath,
                                                int cbSharePath)
{
    return Guarded(-1, [&] {
        const bool buffersUsable = szName != nullptr && cbName > 0 && szSharePath != nullptr && cbSharePath > 0;
        if (const std::optional<int> forced = ForcedResult("VEXOShareNamePathGet", szFullPath)) {
            if (buffersUsable) {
                szName[0] = '\0';
                szSharePath[0] = '\0';
            }
            return *forced;
        }
        std::shared_ptr<const ShareList> shares;
        const ShareInfo *share = LookUp(shares, FindShareHolding, szFullPath, buffersUsable);
        if (share == nullptr) {
            return -1;
        }
        CopyTruncated(szName, cbName, share->name);
        CopyTruncated(szSharePath, cbSharePath, share->path);
        return 0;
    });
}

extern "C" VEXOEMU_API int VEXOShareIsShareRecycle(const char *szPath)
{
    return Guarded(0, [&] {
        if (const std::optional<int> forced = ForcedResult("VEXOShareIsShareRecycle", szPath)) {
            return *forced;
        }
        if (szPath == nullptr) {
            EMU_SET_ERROR(kErrBadArgument);
            return 0;
        }
        bool inRecycleBin = false;
        return IsInShareSubdirectory(szPath, "#recycle", inRecycleBin) && inRecycleBin ? 1 : 0;
    });
}

extern "C" VEXOEMU_API int VLIBShareIsEncryptedGet(const VEXOSHARE *pShare, int *pIsEncrypted)
{
    return GetFlag("VLIBShareIsEncryptedGet", pShare, pIsEncrypted, &ShareRecord::encrypted);
}

extern "C" VEXOEMU_API int VLIBShareIsEncryptionGet(const VEXOSHARE *pShare, int *pUsesEncryption)
{
    return GetFlag("VLIBShareIsEncryptionGet", pShare, pUsesEncryption, &ShareRecord::usesEncryption);
}

extern "C" VEXOEMU_API int VLIBShareIsReadOnlyGet(const VEXOSHARE *pShare, int *pIsReadOnly)
{
    return GetFlag("VLIBShareIsReadOnlyGet", pShare, pIsReadOnly, &ShareRecord::readOnly);
}
