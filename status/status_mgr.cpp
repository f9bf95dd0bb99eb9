#include <cstdint>
#include <ctime>
#include <functional>

#include "config/log.h"
#include "config/unlock_on_return.h"
#include "fileindex/error.h"
#include "fileindex/status.h"
#include "fileindex/utils.h"

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

}  // namespace FILEINDEX
}  // namespace VEXO
