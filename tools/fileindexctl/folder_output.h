// The library's folder settings as fileindexctl reads them and shows them to people.
#ifndef FILEINDEXCTL_FOLDER_OUTPUT_H
#define FILEINDEXCTL_FOLDER_OUTPUT_H

#include <string>
#include <vector>

#include <json/value.h>

#include "fileindex/folder.h"
#include "records.h"

namespace fileindexctl {

// The folder settings of one share (exact name), or all of them for "", read from folder.conf
// without its lock. False when folder.conf cannot be read (the library's error code tells why).
bool ListFolders(std::vector<VEXO::FILEINDEX::Folder> &folders, const std::string &share = std::string());
using fileindex_tool::FoldersAt;
using fileindex_tool::PathArray;

// The media a library record (Folder::asJson) indexes, "document,photo", or "-" for none.
std::string MediaText(const Json::Value &record);
// One library record as "path", "name" and "media" lines.
void PrintFolder(const Json::Value &record);
// Each folder as one line: prefix, path, name and media.
void PrintFolderLines(const std::string &prefix, const std::vector<VEXO::FILEINDEX::Folder> &folders);

}  // namespace fileindexctl

#endif
