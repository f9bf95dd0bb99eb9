// status.conf as a call reads it (CallContext).
#include "status/call_context.h"

namespace VEXO {
namespace FILEINDEX {

Status *CallContext::LoadedStatus()
{
    if (!m_status || shares.reuse() == Reuse::kAskEveryTime) {
        m_status.emplace();
        if (!m_status->Load()) {
            m_status.reset();
            return nullptr;
        }
    }
    return &*m_status;
}

bool CallContext::ShareIsNoSpace(const std::string &share)
{
    Status *status = LoadedStatus();
    return status != nullptr && status->ShareIsNoSpace(share);
}

bool CallContext::GetPauseInfo(long long &resumeTime)
{
    Status *status = LoadedStatus();
    return status != nullptr && status->GetPauseInfo(resumeTime);
}

}  // namespace FILEINDEX
}  // namespace VEXO
