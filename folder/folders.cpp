// Folders: the folder list file, its merge with change reports, lookup and the paged listing.
#include "fileindex/folder.h"

#include <algorithm>
#include <iterator>
#include <optional>

#include "appliance_paths.h"
#include "config/json_io.h"
#include "config/log.h"
#include "fileindex/error.h"
#include "fileindex/utils.h"
#include "folder/change_report.h"
#include "folder/folder_list_text.h"
#include "platform/unicode.h"
#include "folder/listing.h"

FILEIDX_LOG_UNIT("folders.cpp");

namespace VEXO {
namespace FILEINDEX {

namespace {

constexpr size_t kMaxFolders = 1000;

// The ascending order of the paged listing for one sort key: "name" by display name, a media flag
// with false before true, anything else by path; names and paths compared ignoring letter case.
class CompareFolder {
public:
    explicit CompareFolder(const std::string &sortBy)
        : m_text(sortBy == "name" ? &Folder::m_name : &Folder::m_path),
          m_flag(sortBy == "document" ? &Folder::m_bDocument
                 : sortBy == "audio"  ? &Folder::m_bAudio
                 : sortBy == "video"  ? &Folder::m_bVideo
                 : sortBy == "photo"  ? &Folder::m_bPhoto
                                      : nullptr)
    {
    }

    bool operator()(const Folder &a, const Folder &b) const
    {
        if (m_flag != nullptr) {
            return !(a.*m_flag) && b.*m_flag;
        }
        return VLIBCUnicodeUTF8StrCaseCmp((a.*m_text).c_str(), (b.*m_text).c_str()) < 0;
    }

private:
    std::string Folder::*m_text;
    bool Folder::*m_flag;
};

}  // namespace

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
    std::string path;
    std::string fullPath;
    if (!RetrieveStringFromJsonObj(path, "path", request) || !GetFullPath(fullPath, path)) {
        FILEIDX_LOG("%s:%d Bad param: %s", toString(request).c_str());
        ErrorHandler::SetError(FILEIDX_ERR_BAD_PARAM);
        return false;
    }

    auto entry = m_folders.find(path);
    std::optional<Folder> previous;  // the record as it was, when the path had one
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
        previous = entry->second;
        Folder merged = entry->second;
        merged.Load(path, request);
        entry->second = merged;
    }

    // The setting that governed the path before: the table as it was, walked in its order.
    GoverningSetting before(fullPath);
    for (const auto &folder : m_folders) {
        if (&folder.second != &entry->second) {
            before.Consider(folder.second);
        } else if (previous) {
            before.Consider(*previous);
        }
    }
    out = DiffMediaTypes(before.Record(), entry->second.asJson());
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
        if (IsListedForShare(entry.first, share)) {
            out.push_back(entry.second);
        }
    }
    return true;
}

bool Folders::List(Json::Value &out, unsigned long offset, unsigned long limit, const std::string &sort_by,
                   const std::string &sort_direction, const Json::Value &additional)
{
    std::vector<Folder> folders;
    List(folders);
    CallContext context(Reuse::kOncePerCall);
    ListPage(std::move(folders), out, offset, limit, sort_by, sort_direction, additional, context);
    return true;
}

void ListPage(std::vector<Folder> folders, Json::Value &out, unsigned long offset, unsigned long limit,
              const std::string &sort_by, const std::string &sort_direction, const Json::Value &additional,
              CallContext &context)
{
    out = Json::Value(Json::objectValue);
    out["total"] = Json::UInt64(folders.size());
    out["offset"] = Json::UInt64(offset);
    // Stable, so that folders the key does not tell apart stay in path order. A stable merge also
    // never strays outside the vector when the platform's comparison is not a strict order (texts
    // mixing valid and invalid UTF-8).
    std::stable_sort(folders.begin(), folders.end(), CompareFolder(sort_by));

    const unsigned long count = offset >= folders.size() ? 0 : std::min<unsigned long>(folders.size() - offset, limit);
    // A descending page is the first count folders of the ascending order, reversed: the offset is
    // not applied.
    const bool descending = sort_direction == "DESC";
    const auto first = folders.begin() + static_cast<long>(descending || count == 0 ? 0 : offset);
    std::vector<std::string> fullPaths;
    std::transform(first, first + static_cast<long>(count), std::back_inserter(fullPaths),
                   [](const Folder &folder) { return folder.m_fullPath; });
    // Each folder's "status" searches its share's queue files: one reading of each serves the page.
    context.queues.ReadOnceFor(std::move(fullPaths));
    Json::Value page(Json::arrayValue);
    for (unsigned long i = 0; i < count; ++i) {
        const Folder &folder = first[static_cast<long>(descending ? count - 1 - i : i)];
        page.append(RecordWithAdditional(folder, additional, context));
    }
    out["folder"] = page;
}

}  // namespace FILEINDEX
}  // namespace VEXO
