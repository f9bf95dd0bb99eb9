// StatusMgr: status changes told to the daemon under the lock, and the indexing progress report.
#include <cstdint>
#include <ctime>
#include <functional>
#include <set>

#include "config/log.h"
#include "config/unlock_on_return.h"
#include "fileindex/error.h"
#include "fileindex/index_mgr.h"
#include "fileindex/status.h"
#include "fileindex/utils.h"
#include "share/share_lookup.h"
#include "share/storage_paths.h"
#include "status/call_context.h"
#include "status/folder_events.h"

FILEIDX_LOG_UNIT("status_mgr.cpp");

namespace VEXO {
namespace FILEINDEX {

namespace {

// Lock, load, change, save, then tell the daemon (when command is not empty) while the lock is
// still held, so that it learns of the change before any other writer can make another.
bool ChangeStatus(const std::function<bool(Status &)> &change, const std::string &command = std::string(),
                  const Json::Value &data = Json::Value(Json::objectValue))
{
    Status status;
    UnlockOnReturn unlock(status);
    if (!status.Lock(true) || !status.Load() || !change(status) || !status.Save()) {
        return false;
    }
    if (!command.empty() && !SendCammandToDaemon(command, data)) {
        FILEIDX_LOG("%s:%d SendCammandToDaemon failed");
        return false;
    }
    return true;
}

bool ReadStatus(const std::function<bool(Status &)> &read)
{
    Status status;
    return status.Load() && read(status);
}

// now + hours * 3600 in 32-bit signed arithmetic (wrapping), widened with its sign.
long long ResumeTimeAfter(int hours)
{
    const uint32_t sum = static_cast<uint32_t>(time(nullptr)) + static_cast<uint32_t>(hours) * 3600u;
    return static_cast<int32_t>(sum);
}

// ---- Progress ----

constexpr char kFinished[] = "finished";
constexpr char kProcessing[] = "processing";
constexpr char kPaused[] = "paused";
constexpr char kNoSpace[] = "err_no_space";

// What pending work shows as: "processing" unless indexing is paused, and a timed pause whose time
// has come counts as over although the status file still holds it. -1 (running) is processing,
// 0 (paused without end) paused.
const char *PendingWord(long long resumeTime)
{
    const long long now = static_cast<long long>(time(nullptr));
    return resumeTime != 0 && now >= resumeTime ? kProcessing : kPaused;
}

// The share's event queue file; false, logged, when the share is unknown.
bool QueuePathOfShare(std::string &queue, const std::string &share, ShareLookups &lookups)
{
    if (!lookups.FindQueuePath(share, queue)) {
        FILEIDX_LOG("%s:%d FILEIDXQueuePathGet failed, share=%s", share.c_str());
        return false;
    }
    return true;
}

// True when the queue file holds an event on the folder or inside it (for a move, on either side).
// A line that is not a queue record, a record being appended among them, is logged and passed over.
bool HasPendingEventForFolder(const std::string &path, const std::string &queueFile, CallContext &context)
{
    if (!context.queues.Exists(queueFile)) {
        return false;
    }
    std::string fullPath;
    if (!GetFullPath(fullPath, path, context.shares)) {
        FILEIDX_LOG("%s:%d Cannot get full path: %s", path.c_str());
        return false;
    }
    bool found = false;
    const bool read = context.queues.FindEventInFolder(queueFile, fullPath, [](std::string_view line) {
        FILEIDX_LOG("%s:%d Malformed command: %s", std::string(line).c_str());
    }, found);
    if (!read) {
        FILEIDX_LOG("%s:%d Failed to open queue=%s, reason=%m", queueFile.c_str());
    }
    return found;
}

}  // namespace

bool StatusMgr::SetUpdated(const std::string &name)
{
    return ChangeStatus([&](Status &status) { return status.SetUpdated(name); });
}

bool StatusMgr::IsUpdated(const std::string &name)
{
    return ReadStatus([&](Status &status) { return status.IsUpdated(name); });
}

bool StatusMgr::ShareSetNoSpace(const std::string &share, bool flag)
{
    return ChangeStatus([&](Status &status) { return status.ShareSetNoSpace(share, flag); });
}

bool StatusMgr::ShareIsNoSpace(const std::string &share)
{
    return ReadStatus([&](Status &status) { return status.ShareIsNoSpace(share); });
}

bool StatusMgr::ShareSetNeedReindex(const std::string &share, bool flag)
{
    return ChangeStatus([&](Status &status) { return status.ShareSetNeedReindex(share, flag); });
}

bool StatusMgr::ShareIsNeedReindex(const std::string &share)
{
    return ReadStatus([&](Status &status) { return status.ShareIsNeedReindex(share); });
}

bool StatusMgr::ShareRevive(const std::string &share)
{
    Json::Value data;
    data["share_name"] = share;
    return ChangeStatus([&](Status &status) { return status.ShareSetNoSpace(share, false); },
                        "revive_share_worker", data);
}

bool StatusMgr::Resume()
{
    return ChangeStatus([](Status &status) { return status.Resume(); }, "resume");
}

bool StatusMgr::Pause(const int &hours)
{
    if (hours < 0) {
        ErrorHandler::SetError(FILEIDX_ERR_BAD_PARAM);
        return false;
    }
    const long long resumeTime = hours == 0 ? 0 : ResumeTimeAfter(hours);
    Json::Value data;
    data["resume_time"] = Json::Int64(resumeTime);
    return ChangeStatus([&](Status &status) { return status.Pause(resumeTime); }, "pause", data);
}

bool StatusMgr::GetPauseInfo(long long &resumeTime)
{
    return ReadStatus([&](Status &status) { return status.GetPauseInfo(resumeTime); });
}

bool StatusMgr::GetStatus(std::string &status)
{
    std::vector<Folder> folders;
    if (!IndexMgr::List(folders)) {
        return false;
    }
    std::set<std::string> shares;
    for (const Folder &folder : folders) {
        std::string share;
        if (!GetShareNameByPath(share, folder.m_path)) {
            FILEIDX_LOG("%s:%d Failed to get share name from path: %s", folder.m_path.c_str());
            return false;
        }
        if (CanPathBeIndexed(folder.m_path)) {
            shares.insert(share);
        }
    }
    bool pending = false;
    ShareLookups asked(Reuse::kAskEveryTime);
    for (const std::string &share : shares) {
        std::string queue;
        if (!QueuePathOfShare(queue, share, asked)) {
            return false;
        }
        if (IsFileExist(queue) || IsFileExist(QueueCompanionPath(queue))) {
            pending = true;
            break;
        }
    }
    if (!pending) {
        status = kFinished;
        return true;
    }
    long long resumeTime = -1;
    if (!GetPauseInfo(resumeTime)) {
        return false;
    }
    status = PendingWord(resumeTime);
    return true;
}

std::string StatusMgr::GetFolderStatus(const std::string &path)
{
    CallContext asked(Reuse::kAskEveryTime);
    return FILEINDEX::GetFolderStatus(path, asked);
}

std::string GetFolderStatus(const std::string &path, CallContext &context)
{
    if (GetPathIndexRefusal(path, context.shares) != IndexRefusal::kNone) {
        return kPaused;  // a folder that may not be indexed shows as paused, on purpose
    }
    std::string share;
    if (!GetShareNameByPath(share, path)) {
        FILEIDX_LOG("%s:%d Failed to get share name from path: %s", path.c_str());
        return kFinished;
    }
    if (context.ShareIsNoSpace(share)) {
        return kNoSpace;
    }
    std::string queue;
    if (!QueuePathOfShare(queue, share, context.shares)) {
        return kFinished;
    }
    long long resumeTime = -1;  // stays "running" when the pause state cannot be read
    context.GetPauseInfo(resumeTime);
    if (HasPendingEventForFolder(path, queue, context) ||
        HasPendingEventForFolder(path, QueueCompanionPath(queue), context)) {
        return PendingWord(resumeTime);
    }
    return kFinished;
}

}  // namespace FILEINDEX
}  // namespace VEXO
