// fileindexctl's reading and human display of folder settings.
#include "folder_output.h"

#include <algorithm>
#include <iostream>

#include "path_encoding.h"

namespace fileindexctl {

using fileindex_tool::TerminalText;
using VEXO::FILEINDEX::Folder;
using VEXO::FILEINDEX::Folders;

bool ListFolders(std::vector<Folder> &folders, const std::string &share)
{
    Folders list;
    return list.Load() && list.List(folders, share);
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

void PrintFolder(const Json::Value &record)
{
    std::cout << "path:  " << TerminalText(record["path"].asString()) << "\n"
              << "name:  " << TerminalText(record["name"].asString()) << "\n"
              << "media: " << MediaText(record) << "\n";
}

void PrintFolderLines(const std::string &prefix, const std::vector<Folder> &folders)
{
    for (const Folder &folder : folders) {
        std::cout << prefix << " " << TerminalText(folder.m_path) << " (\"" << TerminalText(folder.m_name) << "\", "
                  << MediaText(folder.asJson()) << ")\n";
    }
}

}  // namespace fileindexctl
