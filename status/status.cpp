// Status: the status file's pause state, share marks and updated marks.
#include "fileindex/status.h"

#include <cstring>

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

// An operation meets a member the JSON library would throw on: it fails alone, with the document
// as it was, so that every other operation keeps working on the file.
bool RefuseUnreadableMember()
{
    FILEIDX_LOG("%s:%d json exception");
    ErrorHandler::SetError(FILEIDX_ERR_LOAD_CONFIG);
    return false;
}

// Adds or removes share in the per-share mark object key, which is created as null when absent.
// added tells whether share was newly added. A mark that is neither an object nor null cannot take
// a share: false, document untouched.
bool SetShareMark(Json::Value &document, const char *key, const std::string &share, bool flag, bool &added)
{
    added = false;
    const Json::Value *existing = document.find(key, key + strlen(key));
    if (existing != nullptr && !existing->isObject() && !existing->isNull()) {
        return RefuseUnreadableMember();
    }
    Json::Value &marks = document[key];
    if (!flag) {
        marks.removeMember(share);
        return true;
    }
    added = !marks.isMember(share);
    marks[share] = true;
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
    // No operation can work on a top level other than an object: it is refused like an unparsable
    // file. A member of the wrong type fails only the operations that touch it.
    if (!m_jsConfig.isObject()) {
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
    // A number, null or boolean reads as the JSON library reads it (1 is true). A text, an array or
    // an object (the share marks share the top level) cannot be read as a boolean.
    const Json::Value *member = m_jsConfig.find(name.data(), name.data() + name.size());
    if (member == nullptr) {
        return false;
    }
    if (!member->isConvertibleTo(Json::booleanValue)) {
        return RefuseUnreadableMember();
    }
    return member->asBool();
}

bool Status::ShareSetNeedReindex(const std::string &share, bool flag)
{
    bool added = false;
    return SetShareMark(m_jsConfig, kNeedReindex, share, flag, added);
}

bool Status::ShareIsNeedReindex(const std::string &share)
{
    return HasShareMark(m_jsConfig, kNeedReindex, share);
}

bool Status::ShareSetNoSpace(const std::string &share, bool flag)
{
    bool added = false;
    if (!SetShareMark(m_jsConfig, kNoSpace, share, flag, added)) {
        return false;
    }
    // The administrators hear of a share only when it is newly marked.
    if (added && !NotifyNoSpace()) {
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
