// The JSON records the tools print and serve, built from the library's records.
#include "records.h"

#include <algorithm>
#include <iterator>
#include <set>

#include "fileindex/status.h"
#include "fileindex/utils.h"
#include "path_encoding.h"

namespace fileindex_tool {

using VEXO::FILEINDEX::Folder;
using VEXO::FILEINDEX::StatusMgr;

namespace {

// status.conf as the library loads it, with the names of the shares its marks hold.
class StatusMarks : public VEXO::FILEINDEX::Status {
public:
    void AddMarkedShares(std::set<std::string> &shares) const
    {
        for (const char *mark : {"no_space", "need_reindex"}) {
            const Json::Value &marked = m_jsConfig[mark];
            if (marked.isObject()) {
                for (const std::string &share : marked.getMemberNames()) {
                    shares.insert(share);
                }
            }
        }
    }
};

// Makes a library record the tool's folder record in place, so that a page of 1000 folders is
// answered without building a second tree of records. Members a folder record does not have are
// removed.
void MakeFolderRecord(Json::Value &record)
{
    static const std::set<std::string> kKept = {"path", "name", "document", "audio", "video", "photo", "additional"};
    std::vector<std::string> others;
    for (auto member = record.begin(); member != record.end(); ++member) {
        if (kKept.count(member.name()) == 0) {
            others.push_back(member.name());
        }
    }
    for (const std::string &other : others) {
        record.removeMember(other);
    }
    for (const char *name : {"path", "name"}) {
        const std::string bytes = record[name].asString();
        SetBytesMember(record, name, bytes);
    }
    for (const char *kind : {"document", "audio", "video", "photo"}) {
        Json::Value &flag = record[kind];
        flag = flag.isBool() && flag.asBool();
    }
}

}  // namespace

Json::Value FolderRecord(const Json::Value &libraryRecord)
{
    Json::Value record = libraryRecord.isObject() ? libraryRecord : Json::Value(Json::objectValue);
    MakeFolderRecord(record);
    return record;
}

Json::Value FolderRecords(const std::vector<Folder> &folders)
{
    Json::Value records(Json::arrayValue);
    for (const Folder &folder : folders) {
        records.append(folder.asJson());
        MakeFolderRecord(records[records.size() - 1]);
    }
    return records;
}

Json::Value FolderPage(Json::Value libraryPage)
{
    Json::Value page;
    page["total"] = libraryPage["total"];
    page["offset"] = libraryPage["offset"];
    page["folders"] = Json::Value(Json::arrayValue);
    if (libraryPage["folder"].isArray()) {
        page["folders"].swap(libraryPage["folder"]);
    }
    for (Json::Value &record : page["folders"]) {
        MakeFolderRecord(record);
    }
    return page;
}

std::vector<Folder> FoldersAt(const std::vector<Folder> &folders, const std::vector<std::string> &paths)
{
    const std::set<std::string> wanted(paths.begin(), paths.end());
    std::vector<Folder> found;
    std::copy_if(folders.begin(), folders.end(), std::back_inserter(found),
                 [&wanted](const Folder &folder) { return wanted.count(folder.m_path) != 0; });
    return found;
}

Json::Value PathArray(const std::vector<std::string> &paths)
{
    Json::Value array(Json::arrayValue);
    for (const std::string &path : paths) {
        array.append(path);
    }
    return array;
}

Json::Value ShareMarks(const std::string &share)
{
    Json::Value marks;
    SetBytesMember(marks, "share_name", share);
    marks["no_space"] = StatusMgr::ShareIsNoSpace(share);
    marks["need_reindex"] = StatusMgr::ShareIsNeedReindex(share);
    return marks;
}

std::vector<std::string> KnownShares(const std::vector<Folder> &folders)
{
    std::set<std::string> shares;
    for (const Folder &folder : folders) {
        std::string share;
        if (VEXO::FILEINDEX::GetShareNameByPath(share, folder.m_path)) {
            shares.insert(share);
        }
    }
    StatusMarks status;
    if (status.Load()) {
        status.AddMarkedShares(shares);
    }
    return std::vector<std::string>(shares.begin(), shares.end());
}

}  // namespace fileindex_tool
