#include "fileindex/folder.h"

#include "appliance_paths.h"
#include "config/json_io.h"
#include "config/log.h"
#include "fileindex/error.h"
#include "fileindex/utils.h"
#include "folder/change_report.h"

namespace VEXO {
namespace FILEINDEX {

namespace {
constexpr size_t kMaxFolders = 1000;
}

std::string Folders::GetPath() const
{
    return FILEINDEX_FOLDER_CONF_PATH;
}

std::string Folders::GetLockPath() const
{
    return FILEINDEX_FOLDER_LOCK_PATH;
}

bool Folders::Load()
{
    if (!LoadJson()) {
        return false;
    }
    if (!m_jsConfig.isObject()) {
        FILEIDX_LOG("%s:%d Malformed folders: %s", toString(m_jsConfig).c_str());
        ErrorHandler::SetError(FILEIDX_ERR_MALFORMED_CONFIG);
        return false;
    }
    for (auto member = m_jsConfig.begin(); member != m_jsConfig.end(); ++member) {
        const std::string path = member.name();
        Folder folder;
        folder.Load(path, *member);
        m_folders.emplace(path, folder);
    }
    return true;
}

bool Folders::Save()
{
    // An object, so AddToJson adds every record.
    m_jsConfig = Json::Value(Json::objectValue);
    for (const auto &entry : m_folders) {
        entry.second.AddToJson(m_jsConfig);
    }
    return SaveJson();
}

bool Folders::Get(Json::Value &out, const std::string &path)
{
    const auto found = m_folders.find(path);
    if (found == m_folders.end()) {
        FILEIDX_LOG("%s:%d No such folder: %s", path.c_str());
        ErrorHandler::SetError(FILEIDX_ERR_NO_SUCH_FOLDER);
        return false;
    }
    out = found->second.asJson();
    return true;
}

bool Folders::Upsert(Json::Value &out, const Json::Value &request)
{
    std::vector<Folder> before;
    if (!List(before)) {
        return false;
    }
    std::string path;
    std::string fullPath;
    if (!RetrieveStringFromJsonObj(path, "path", request) || !GetFullPath(fullPath, path)) {
        FILEIDX_LOG("%s:%d Bad param: %s", toString(request).c_str());
        ErrorHandler::SetError(FILEIDX_ERR_BAD_PARAM);
        return false;
    }

    auto entry = m_folders.find(path);
    if (entry == m_folders.end()) {
        Folder folder;
        folder.Reload(path, request);
        entry = m_folders.emplace(path, folder).first;
        if (m_folders.size() > kMaxFolders) {
            FILEIDX_LOG("%s:%d Exceed max folder size");
            ErrorHandler::SetError(FILEIDX_ERR_EXCEED_MAX_FOLDER);
            return false;
        }
    } else {
        Folder merged = entry->second;
        merged.Load(path, request);
        entry->second = merged;
    }

    out = DiffMediaTypes(GetMostSuitableCfg(before, fullPath), entry->second.asJson());
    return true;
}

bool Folders::Delete(Json::Value &out, const std::string &path)
{
    std::vector<Folder> before;
    if (!List(before)) {
        return false;
    }
    m_folders.erase(path);
    std::vector<Folder> after;
    if (!List(after)) {
        return false;
    }
    std::string fullPath;
    if (!GetFullPath(fullPath, path)) {
        return true;
    }
    out = Json::Value(Json::objectValue);
    out[path] = DiffMediaTypes(GetMostSuitableCfg(before, fullPath), GetMostSuitableCfg(after, fullPath));
    return true;
}

bool Folders::List(std::vector<Folder> &out)
{
    return List(out, std::string());
}

bool Folders::List(std::vector<Folder> &out, const std::string &share)
{
    out.clear();
    for (const auto &entry : m_folders) {
        std::string folderShare;
        if (share.empty() || (GetShareNameByPath(folderShare, entry.first) && folderShare == share)) {
            out.push_back(entry.second);
        }
    }
    return true;
}

}  // namespace FILEINDEX
}  // namespace VEXO
