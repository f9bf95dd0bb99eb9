#include "fileindex/status.h"

#include <json/value.h>

#include "appliance_paths.h"
#include "config/log.h"
#include "fileindex/error.h"
#include "fileindex/utils.h"

FILEIDX_LOG_UNIT("status.cpp");

namespace VEXO {
namespace FILEINDEX {

namespace {

const char kResumeTime[] = "resume_time";
const char kNoSpace[] = "no_space";
const char kNeedReindex[] = "need_reindex";
constexpr long long kNotPaused = -1;

// Adds or removes share in the per-share mark object key, which is created as null when absent (any
// other value is left as it is). Returns whether share was newly added.
bool SetShareMark(Json::Value &document, const char *key, const std::string &share, bool flag)
{
    Json::Value &marks = document[key];
    if (!flag) {
        marks.removeMember(share);
        return false;
    }
    const bool added = !marks.isMember(share);
    marks[share] = true;
    return added;
}

// The layout every operation below can read and change without the JSON library throwing: an
// object whose share marks are objects (or null, as clearing an absent mark leaves them) and whose
// updated marks read as booleans. "resume_time" may hold anything: GetPauseInfo reports a pause time
// it cannot read ("json exception") and every other operation only overwrites it.
bool IsStatusLayout(const Json::Value &document)
{
    if (!document.isObject()) {
        return false;
    }
    for (auto member = document.begin(); member != document.end(); ++member) {
        const std::string key = member.name();
        if (key == kResumeTime) {
            continue;
        }
        const bool readable = key == kNoSpace || key == kNeedReindex ? member->isObject() || member->isNull()
                                                                    : member->isConvertibleTo(Json::booleanValue);
        if (!readable) {
            return false;
        }
    }
    return true;
}

bool HasShareMark(const Json::Value &document, const char *key, const std::string &share)
{
    const Json::Value &marks = document[key];
    return marks.isObject() && marks.isMember(share);
}

}  // namespace

std::string Status::GetPath() const
{
    return FILEINDEX_STATUS_CONF_PATH;
}

std::string Status::GetLockPath() const
{
    return FILEINDEX_STATUS_LOCK_PATH;
}

bool Status::Load()
{
    if (!LoadJson()) {
        return false;
    }
    // A document of another shape is refused like an unparsable one, before any operation trips on it.
    if (!IsStatusLayout(m_jsConfig)) {
        FILEIDX_LOG("%s:%d Failed to load json from %s", GetPath().c_str());
        ErrorHandler::SetError(FILEIDX_ERR_LOAD_CONFIG);
        return false;
    }
    return true;
}

bool Status::Save()
{
    return SaveJson();
}

bool Status::SetUpdated(const std::string &name)
{
    m_jsConfig[name] = true;
    return true;
}

bool Status::IsUpdated(const std::string &name)
{
    // The share marks share the top level with the updated marks: asked about as an updated mark,
    // a member the JSON library cannot read as a boolean (an object, a text) is none, rather than
    // an exception out of the library.
    if (!m_jsConfig.isMember(name)) {
        return false;
    }
    const Json::Value &member = m_jsConfig[name];
    return member.isConvertibleTo(Json::booleanValue) && member.asBool();
}

bool Status::ShareSetNeedReindex(const std::string &share, bool flag)
{
    SetShareMark(m_jsConfig, kNeedReindex, share, flag);
    return true;
}

bool Status::ShareIsNeedReindex(const std::string &share)
{
    return HasShareMark(m_jsConfig, kNeedReindex, share);
}

bool Status::ShareSetNoSpace(const std::string &share, bool flag)
{
    // The administrators hear of a share only when it is newly marked.
    if (SetShareMark(m_jsConfig, kNoSpace, share, flag) && !NotifyNoSpace()) {
        FILEIDX_LOG("%s:%d NotifyNoSpace failed");
    }
    return true;
}

bool Status::ShareIsNoSpace(const std::string &share)
{
    return HasShareMark(m_jsConfig, kNoSpace, share);
}

bool Status::Pause(long long resumeTime)
{
    m_jsConfig[kResumeTime] = Json::Int64(resumeTime);
    return true;
}

bool Status::Resume()
{
    m_jsConfig[kResumeTime] = Json::Int64(kNotPaused);
    return true;
}

bool Status::GetPauseInfo(long long &resumeTime)
{
    try {
        resumeTime = m_jsConfig.get(kResumeTime, Json::Int64(kNotPaused)).asInt64();
    } catch (const Json::Exception &) {
        FILEIDX_LOG("%s:%d json exception");
        return false;
    }
    return true;
}

}  // namespace FILEINDEX
}  // namespace VEXO
