// The library's folder records as fileindexctl reads and shows them.
#ifndef FILEINDEXCTL_RECORDS_H
#define FILEINDEXCTL_RECORDS_H

#include <string>
#include <vector>

#include <json/value.h>

#include "fileindex/folder.h"

namespace fileindexctl {

// The folder settings of one share (exact name), or all of them for "", read from folder.conf
// without its lock. False when folder.conf cannot be read (the library's error code tells why).
bool ListFolders(std::vector<VEXO::FILEINDEX::Folder> &folders, const std::string &share = std::string());
// The folders among folders whose paths are in paths, as a JSON array of records in list order.
Json::Value RecordsOf(const std::vector<VEXO::FILEINDEX::Folder> &folders, const std::vector<std::string> &paths);
Json::Value RecordsOf(const std::vector<VEXO::FILEINDEX::Folder> &folders);

// The paths as a JSON array of strings, the request form of the library's batch operations.
Json::Value PathArray(const std::vector<std::string> &paths);

// The media a record indexes, "document,photo", or "-" for none.
std::string MediaText(const Json::Value &record);
// One record as "path", "name" and "media" lines.
void PrintRecord(const Json::Value &record);
// Each record as one line: prefix, path, name and media.
void PrintRecordLines(const std::string &prefix, const Json::Value &records);

}  // namespace fileindexctl

#endif
