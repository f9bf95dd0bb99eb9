// The per-call context of a folder's status and validity: what one call has learnt of shares, of
// queue files and of status.conf, and whether it keeps it (Reuse, share/share_lookup.h). The paged
// listing passes one that keeps everything for its whole page, so that each share, each queue file
// and status.conf are read once however many folders it lists; the single-folder operations build
// one that keeps nothing, and so ask exactly as they always have.
#ifndef FILEINDEX_STATUS_CALL_CONTEXT_H
#define FILEINDEX_STATUS_CALL_CONTEXT_H

#include <optional>
#include <string>

#include "fileindex/status.h"
#include "share/share_lookup.h"
#include "status/folder_events.h"

namespace VEXO {
namespace FILEINDEX {

class CallContext {
public:
    explicit CallContext(Reuse reuse) : shares(reuse), queues(reuse) {}

    ShareLookups shares;
    QueueReadings queues;

    // StatusMgr::ShareIsNoSpace and StatusMgr::GetPauseInfo, answered from status.conf as this call
    // read it: once for the whole call with Reuse::kOncePerCall, afresh for each question otherwise.
    // A status.conf that cannot be loaded is not kept: the next question loads it again, and logs
    // and sets its error code again.
    bool ShareIsNoSpace(const std::string &share);
    bool GetPauseInfo(long long &resumeTime);

private:
    Status *LoadedStatus();

    std::optional<Status> m_status;
};

// StatusMgr::GetFolderStatus of a folder's share-relative path, its questions answered in context.
std::string GetFolderStatus(const std::string &path, CallContext &context);

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
