// folder.conf read straight from its text into folder records, all or one share's.
#include "folder/folder_list_text.h"

#include <algorithm>
#include <optional>
#include <string_view>

#include "config/file_io.h"
#include "config/json_token.h"
#include "fileindex/utils.h"

namespace VEXO {
namespace FILEINDEX {

namespace {

// One member of the document: a folder path and what Folder::Load takes from its record, which is
// the last member of each name and type the record holds (a later member of another type hides an
// earlier one, as in the JSON library).
struct Entry {
    std::string path;
    std::optional<std::string> name;
    std::optional<bool> document;
    std::optional<bool> audio;
    std::optional<bool> video;
    std::optional<bool> photo;
};

class FolderMembers {
public:
    void Key(int depth, const char *begin, const char *end, bool escaped)
    {
        if (depth == 1) {
            m_entries.emplace_back();
            Decode(begin, end, escaped, m_entries.back().path);
            m_inRecord = false;
        } else if (depth == 2 && m_inRecord) {
            std::string_view key(begin, static_cast<size_t>(end - begin));
            if (escaped) {
                Decode(begin, end, escaped, m_key);
                key = m_key;
            }
            m_isName = key == "name";
            m_flag = key == "document" ? &Entry::document
                     : key == "audio"  ? &Entry::audio
                     : key == "video"  ? &Entry::video
                     : key == "photo"  ? &Entry::photo
                                       : nullptr;
        }
    }

    void Value(int depth, JsonToken token, const char *begin, const char *end, bool escaped)
    {
        m_needsLibrary = m_needsLibrary || NeedsJsonLibrary(token, begin, end);
        if (depth == 0) {
            m_isObject = token == JsonToken::kObject;
        } else if (depth == 1) {
            m_inRecord = m_isObject && token == JsonToken::kObject;  // a record, not an object in a list
        } else if (depth == 2 && m_inRecord) {
            Entry &entry = m_entries.back();
            if (m_isName) {
                entry.name.reset();
                if (token == JsonToken::kString) {
                    Decode(begin, end, escaped, entry.name.emplace());
                }
            } else if (m_flag != nullptr) {
                const bool isBool = token == JsonToken::kTrue || token == JsonToken::kFalse;
                entry.*m_flag = isBool ? std::optional<bool>(token == JsonToken::kTrue) : std::nullopt;
            }
        }
    }

    bool Usable() const { return m_isObject && !m_needsLibrary; }

    // The members in path order, the last of each path only.
    std::vector<Entry> TakeEntries()
    {
        const auto byPath = [](const Entry &a, const Entry &b) { return a.path < b.path; };
        if (!std::is_sorted(m_entries.begin(), m_entries.end(), byPath)) {
            std::stable_sort(m_entries.begin(), m_entries.end(), byPath);
        }
        const auto lastOfEachPath = std::unique(m_entries.rbegin(), m_entries.rend(),
                                                [](const Entry &a, const Entry &b) { return a.path == b.path; });
        m_entries.erase(m_entries.begin(), lastOfEachPath.base());
        return std::move(m_entries);
    }

private:
    void Decode(const char *begin, const char *end, bool escaped, std::string &out)
    {
        if (!escaped) {
            out.assign(begin, end);
        } else {
            DecodeJsonString(begin, end, out);
        }
    }

    bool m_needsLibrary = false;
    bool m_isObject = false;
    bool m_inRecord = false;
    std::string m_key;
    bool m_isName = false;                        // the record's member now read is "name"
    std::optional<bool> Entry::*m_flag = nullptr;  // or the media flag it names
    std::vector<Entry> m_entries;
};

}  // namespace

bool ReadFolderListText(const std::string &text, std::vector<Folder> &out, ShareLookups &lookups)
{
    FolderMembers members;
    if (!ScanJsonText(text.data(), text.size(), members) || !members.Usable()) {
        return false;
    }
    out.clear();
    for (Entry &entry : members.TakeEntries()) {
        Folder &folder = out.emplace_back();
        folder.m_path = std::move(entry.path);
        folder.m_name = std::move(entry.name).value_or(std::string());
        folder.m_bDocument = entry.document.value_or(false);
        folder.m_bAudio = entry.audio.value_or(false);
        folder.m_bVideo = entry.video.value_or(false);
        folder.m_bPhoto = entry.photo.value_or(false);
        GetFullPath(folder.m_fullPath, folder.m_path, lookups);
    }
    return true;
}

bool LoadFolderList(std::vector<Folder> &out, const std::string &share, ShareLookups &lookups)
{
    Folders folders;
    const std::string path = folders.GetPath();
    if (!IsFileExist(path)) {
        out.clear();  // the first-run state: no folders
        return true;
    }
    std::string text;
    std::vector<Folder> all;
    if (!ReadWholeFile(path, text) || !ReadFolderListText(text, all, lookups)) {
        return folders.Load() && folders.List(out, share);
    }
    out.clear();
    for (Folder &folder : all) {
        if (IsListedForShare(folder.m_path, share)) {
            out.push_back(std::move(folder));
        }
    }
    return true;
}

bool IsListedForShare(const std::string &path, const std::string &share)
{
    std::string folderShare;
    return share.empty() || (GetShareNameByPath(folderShare, path) && folderShare == share);
}

}  // namespace FILEINDEX
}  // namespace VEXO
