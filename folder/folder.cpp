#include "fileindex/folder.h"

#include "config/log.h"
#include "fileindex/utils.h"

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
