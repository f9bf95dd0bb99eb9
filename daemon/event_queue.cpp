// AddCustomEvent, appending to a share's event queue file, and the search for a pending reindex.
#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>

#include "config/file_io.h"
#include "config/log.h"
#include "daemon/event_queue.h"
#include "daemon/queue_record.h"
#include "fileindex/status.h"
#include "fileindex/utils.h"
#include "share/share_lookup.h"
#include "share/storage_paths.h"

FILEIDX_LOG_UNIT("utils.cpp");

namespace VEXO {
namespace FILEINDEX {

namespace {

constexpr int kLockAttempts = 3;
// A queue file the library creates is readable by everyone and written by its owner (root).
constexpr mode_t kQueueFileMode = 0644;

enum class Append { kWritten, kContended, kFailed };

// Appends one record line under an exclusive flock on the queue, in a single write so that
// appends of several processes never interleave, and whole or not at all (AppendLine). The queue
// lies in a directory share users may write: a symbolic link at the queue or at "@eaDir" is
// refused like any file that cannot be opened. Never waits long: three attempts, 0-9 ms apart.
Append AppendRecord(const std::string &queue, const std::string &line)
{
    for (int attempt = 1;; ++attempt) {
        OwnedFd fd;
        if (!OpenRegularFile(queue, O_RDWR | O_CREAT | O_APPEND, kQueueFileMode, fd)) {
            return Append::kFailed;
        }
        if (flock(fd.Get(), LOCK_EX | LOCK_NB) != 0) {
            const int reason = errno;  // what the debug lines' %m names; the descriptor closes after them
            if (reason != EINTR && reason != EAGAIN) {
                FILEIDX_DEBUG("%s:%d flock fail, path=%s, reason=%m", queue.c_str());
                return Append::kFailed;
            }
            if (attempt == kLockAttempts) {
                FILEIDX_DEBUG("%s:%d try lock too many times, path=%s, reason=%m", queue.c_str());
                return Append::kContended;
            }
            usleep(static_cast<useconds_t>((rand() % 10) * 1000));
            continue;
        }
        size_t written = 0;
        const bool appended = AppendLine(fd.Get(), line, written);
        if (!appended) {
            FILEIDX_DEBUG("%s:%d write fail, (%ld, %ld)", static_cast<long>(written), static_cast<long>(line.size()));
        }
        flock(fd.Get(), LOCK_UN);
        return appended ? Append::kWritten : Append::kFailed;
    }
}

// The event could not be queued: mark the share for a full reindex so that no change is lost.
bool FallBackToReindex(const std::string &share)
{
    if (!StatusMgr::ShareSetNeedReindex(share, true)) {
        FILEIDX_LOG("%s:%d ShareSetNeedReindex failed, share=%s", share.c_str());
    }
    return false;
}

}  // namespace

bool HasQueuedReindexEvent(const std::string &path, const std::string &queueFile)
{
    if (!IsFileExist(queueFile)) {
        return false;
    }
    bool found = false;
    QueueRecord record;
    const bool read = ForEachLine(queueFile, [&](std::string_view line) {
        found = ParseQueueRecord(line, record) && record.event == kEventReindex && record.path == path;
        return !found;
    });
    if (!read) {
        FILEIDX_LOG("%s:%d Failed to open queue=%s, reason=%m", queueFile.c_str());
    }
    return found;
}

bool AddCustomEvent(const int &event, const std::string &path, const Json::Value &data)
{
    std::string share;
    std::string sharePath;
    if (!FindShareOfFullPath(share, sharePath, path)) {
        return FallBackToReindex(std::string());
    }
    std::string queue;
    if (!GetQueuePath(queue, share)) {
        FILEIDX_LOG("%s:%d FILEIDXQueuePathGet failed, share=%s", share.c_str());
        return FallBackToReindex(share);
    }
    if (HasQueuedReindexEvent(path, queue) || HasQueuedReindexEvent(path, QueueCompanionPath(queue))) {
        return true;
    }

    std::string line;
    if (!MakeQueueRecordLine(event, path, data, line)) {
        FILEIDX_LOG("%s:%d Refused a record its readers would skip, event=%d, path=%s", event, path.c_str());
        return FallBackToReindex(share);
    }
    switch (AppendRecord(queue, line)) {
    case Append::kWritten:
    case Append::kContended:  // dropped on purpose: another writer is busy with this queue
        return true;
    case Append::kFailed:
        break;
    }
    return FallBackToReindex(share);
}

}  // namespace FILEINDEX
}  // namespace VEXO
