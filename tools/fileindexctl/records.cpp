#include "records.h"

#include <algorithm>
#include <iostream>

namespace fileindexctl {

using VEXO::FILEINDEX::Folder;
using VEXO::FILEINDEX::Folders;

bool ListFolders(std::vector<Folder> &folders, const std::string &share)
{
    Folders list;
    return list.Load() && list.List(folders, share);
}

Json::Value RecordsOf(const std::vector<Folder> &folders, const std::vector<std::string> &paths)
{
    Json::Value records(Json::arrayValue);
    for (const Folder &folder : folders) {
        if (std::find(paths.begin(), paths.end(), folder.m_path) != paths.end()) {
            records.append(folder.asJson());
        }
    }
    return records;
}

Json::Value RecordsOf(const std::vector<Folder> &folders)
{
    Json::Value records(Json::arrayValue);
    for (const Folder &folder : folders) {
        records.append(folder.asJson());
    }
    return records;
}

Json::Value PathArray(const std::vector<std::string> &paths)
{
    Json::Value array(Json::arrayValue);
    for (const std::string &path : paths) {
        array.append(path);
    }
    return array;
}

std::string MediaText(const Json::Value &record)
{
    std::string media;
    for (const char *kind : {"document", "audio", "video", "photo"}) {
        if (record[kind].isBool() && record[kind].asBool()) {
            media += (media.empty() ? "" : ",") + std::string(kind);
        }
    }
    return media.empty() ? "-" : media;
}

void PrintRecord(const Json::Value &record)
{
    std::cout << "path:  " << record["path"].asString() << "\n"
              << "name:  " << record["name"].asString() << "\n"
              << "media: " << MediaText(record) << "\n";
}

void PrintRecordLines(const std::string &prefix, const Json::Value &records)
{
    for (const Json::Value &record : records) {
        std::cout << prefix << " " << record["path"].asString() << " (\"" << record["name"].asString() << "\", "
                  << MediaText(record) << ")\n";
    }
}

}  // namespace fileindexctl
