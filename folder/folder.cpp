// Folder: one folder setting, its record in folder.conf and its computed information.
#include "fileindex/folder.h"

#include "config/json_io.h"
#include "config/log.h"
#include "fileindex/error.h"
#include "fileindex/utils.h"
#include "folder/listing.h"
#include "share/share_lookup.h"

FILEIDX_LOG_UNIT("folder.cpp");

namespace VEXO {
namespace FILEINDEX {

Folder::Folder() : m_bDocument(false), m_bAudio(false), m_bVideo(false), m_bPhoto(false) {}

bool Folder::Load(const std::string &path, const Json::Value &record)
{
    m_path = path;
    RetrieveStringFromJsonObj(m_name, "name", record);
    RetrieveBoolFromJsonObj(m_bDocument, "document", record);
    RetrieveBoolFromJsonObj(m_bAudio, "audio", record);
    RetrieveBoolFromJsonObj(m_bVideo, "video", record);
    RetrieveBoolFromJsonObj(m_bPhoto, "photo", record);
    return FILEINDEX::GetFullPath(m_fullPath, m_path);
}

bool Folder::Reload(const std::string &path, const Json::Value &record)
{
    m_path.clear();
    m_name.clear();
    m_bDocument = false;
    m_bAudio = false;
    m_bVideo = false;
    m_bPhoto = false;
    return Load(path, record);
}

bool Folder::SetPath(const std::string &path)
{
    m_path = path;
    return FILEINDEX::GetFullPath(m_fullPath, path);
}

std::string Folder::GetFullPath() const
{
    if (!m_fullPath.empty()) {
        return m_fullPath;
    }
    std::string fullPath;
    if (!FILEINDEX::GetFullPath(fullPath, m_path)) {
        FILEIDX_LOG("%s:%d Failed to get full path from %s", m_path.c_str());
    }
    return fullPath;
}

Json::Value Folder::asJson() const
{
    Json::Value record(Json::objectValue);
    record["path"] = m_path;
    record["name"] = m_name;
    record["document"] = m_bDocument;
    record["audio"] = m_bAudio;
    record["video"] = m_bVideo;
    record["photo"] = m_bPhoto;
    return record;
}

Json::Value Folder::asJson(const Json::Value &additional) const
{
    CallContext asked(Reuse::kAskEveryTime);
    return RecordWithAdditional(*this, additional, asked);
}

bool Folder::GetAdditional(Json::Value &out, const std::string &key) const
{
    CallContext asked(Reuse::kAskEveryTime);
    return FILEINDEX::GetAdditional(*this, out, key, asked);
}

bool Folder::GetAdditional(Json::Value &out, const Json::Value &keys) const
{
    CallContext asked(Reuse::kAskEveryTime);
    return FILEINDEX::GetAdditional(*this, out, keys, asked);
}

Json::Value RecordWithAdditional(const Folder &folder, const Json::Value &additional, CallContext &context)
{
    Json::Value record = folder.asJson();
    if (!GetAdditional(folder, record["additional"], additional, context)) {
        FILEIDX_LOG("%s:%d GetAdditional failed");
    }
    return record;
}

bool GetAdditional(const Folder &folder, Json::Value &out, const std::string &key, CallContext &context)
{
    if (key == "status") {
        out = GetFolderStatus(folder.m_path, context);
        return true;
    }
    if (key == "is_valid") {
        out = GetPathIndexRefusal(folder.m_path, context.shares) == IndexRefusal::kNone;
        return true;
    }
    FILEIDX_LOG("%s:%d Unknown additional: %s", key.c_str());
    ErrorHandler::SetError(FILEIDX_ERR_BAD_PARAM);
    return false;
}

bool GetAdditional(const Folder &folder, Json::Value &out, const Json::Value &keys, CallContext &context)
{
    out = Json::Value(Json::objectValue);
    if (!keys.isArray()) {
        FILEIDX_LOG("%s:%d Bad param: %s", toString(keys).c_str());
        ErrorHandler::SetError(FILEIDX_ERR_BAD_PARAM);
        return false;
    }
    for (const Json::Value &key : keys) {
        if (!key.isString()) {
            FILEIDX_LOG("%s:%d Bad param: %s", toString(key).c_str());
            ErrorHandler::SetError(FILEIDX_ERR_BAD_PARAM);
            return false;
        }
        // An unknown key stays in out as null and does not fail the list.
        const std::string name = key.asString();
        if (!GetAdditional(folder, out[name], name, context)) {
            FILEIDX_LOG("%s:%d Failed to get additional: %s", name.c_str());
        }
    }
    return true;
}

bool Folder::AddToJson(Json::Value &object) const
{
    if (!object.isObject()) {
        return false;
    }
    object[m_path] = asJson();
    return true;
}

}  // namespace FILEINDEX
}  // namespace VEXO
