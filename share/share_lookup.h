// Share look-ups that other rooms make too, with the buffer sizes the platform's calls are given:
// 492 bytes for a share name, 4096 for a path, each zero-filled; and ShareLookups, what one call
// keeps of the answers.
#ifndef FILEINDEX_SHARE_SHARE_LOOKUP_H
#define FILEINDEX_SHARE_SHARE_LOOKUP_H

#include <map>
#include <memory>
#include <string>

#include "fileindex/utils.h"

namespace VEXO {
namespace FILEINDEX {

constexpr int kShareNameSize = 492;
constexpr int kSharePathSize = 4096;

// The share holding a full path and the share's own path (VEXOShareNamePathGet). Failure: false,
// outputs untouched, "VEXOShareNamePathGet failed, path=<path>"; no error code is set.
bool FindShareOfFullPath(std::string &share, std::string &sharePath, const std::string &fullPath);

// The share's event queue path, from FILEIDXQueuePathGet (which logs its own failures). False when
// that fails; the caller logs what the failure means to it.
bool GetQueuePath(std::string &queuePath, const std::string &share);

// Whether a call keeps what it learns from the platform and the files it reads. kAskEveryTime asks
// at every question, as every operation always has. kOncePerCall keeps each answer for the rest of
// the call (a listing of many folders): a failed look-up alone is not kept but asked again, so that
// each folder it concerns fails, logs and sets its error code as it would on its own.
enum class Reuse { kAskEveryTime, kOncePerCall };

// A share's record (VEXOShareGet) and the share-wide rule of what may be indexed judged on it
// (GetShareIndexRefusal). The record is released with the last handle to it.
struct ShareFacts {
    ShareFacts(_tag_VEXOSHARE *record, IndexRefusal refusal) : record(record), refusal(refusal) {}
    ~ShareFacts();
    ShareFacts(const ShareFacts &) = delete;
    ShareFacts &operator=(const ShareFacts &) = delete;

    _tag_VEXOSHARE *const record;
    const IndexRefusal refusal;
    int mountPointAllowed = -1;  // -1 until asked: whether a mount point in the share may be indexed
};

// What one call learns about shares from the share database, each answer asked for once per share
// with Reuse::kOncePerCall (successful answers only), at every question with kAskEveryTime.
class ShareLookups {
public:
    explicit ShareLookups(Reuse reuse) : m_reuse(reuse) {}
    ShareLookups(const ShareLookups &) = delete;
    ShareLookups &operator=(const ShareLookups &) = delete;

    Reuse reuse() const { return m_reuse; }

    // The share's path (VEXOShareGet). False, nothing logged or set, when the share is unknown.
    bool FindSharePath(const std::string &share, std::string &sharePath);
    // The share's record and its share-wide rule; null, nothing logged or set, when VEXOShareGet
    // fails. Each call to it makes a new record with kAskEveryTime.
    std::shared_ptr<ShareFacts> FindShareFacts(const std::string &share);
    // The share's event queue path (GetQueuePath, which makes the share's "@eaDir"); false when the
    // share is unknown (FILEIDXQueuePathGet logs).
    bool FindQueuePath(const std::string &share, std::string &queuePath);

private:
    const Reuse m_reuse;
    std::map<std::string, std::string> m_sharePaths;
    std::map<std::string, std::shared_ptr<ShareFacts>> m_shareFacts;
    std::map<std::string, std::string> m_queuePaths;
};

// GetFullPath, GetPathIndexRefusal and GetFullPathIndexRefusal (fileindex/utils.h), the share
// database's answers taken from lookups: the same results, log lines and error codes.
bool GetFullPath(std::string &fullPath, const std::string &path, ShareLookups &lookups);
IndexRefusal GetPathIndexRefusal(const std::string &path, ShareLookups &lookups);
IndexRefusal GetFullPathIndexRefusal(const std::string &fullPath, ShareLookups &lookups);

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
