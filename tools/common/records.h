// The JSON records fileindexctl --json prints and the panel serves, built from the library's own
// records. Byte-string members come as the pair of path_encoding.h ("path" and "path_bytes", "name"
// and "name_bytes", ...).
#ifndef FILEINDEX_TOOL_RECORDS_H
#define FILEINDEX_TOOL_RECORDS_H

#include <string>
#include <vector>

#include <json/value.h>

#include "fileindex/folder.h"

namespace fileindex_tool {

// A folder setting: {"path", "path_bytes", "name", "name_bytes", "document", "audio", "video",
// "photo"}, and "additional" ({"status": word, "is_valid": bool}, as the library computed it) when
// the library's record has it. libraryRecord is Folder::asJson or an element of IndexMgr::List's
// page.
Json::Value FolderRecord(const Json::Value &libraryRecord);
// FolderRecord of each folder, in the vector's order.
Json::Value FolderRecords(const std::vector<VEXO::FILEINDEX::Folder> &folders);
// A page of IndexMgr::List: {"total", "offset", "folders": [FolderRecord...]}. Takes the page, so
// that a caller done with it can move it in rather than have it copied.
Json::Value FolderPage(Json::Value libraryPage);

// The folders whose paths are among paths, in list order.
std::vector<VEXO::FILEINDEX::Folder> FoldersAt(const std::vector<VEXO::FILEINDEX::Folder> &folders,
                                                const std::vector<std::string> &paths);
// The paths as a JSON array of strings, the request form of the library's batch operations.
Json::Value PathArray(const std::vector<std::string> &paths);

// A share's marks in status.conf: {"share_name", "share_name_bytes", "no_space", "need_reindex"}.
// Reads status.conf without its lock, twice; a mark that cannot be read counts as absent.
Json::Value ShareMarks(const std::string &share);

// The shares that hold indexed folders (from the folders' paths) together with the shares that
// status.conf marks, in ascending byte order, each once. status.conf is read without its lock; an
// unreadable one adds no share.
std::vector<std::string> KnownShares(const std::vector<VEXO::FILEINDEX::Folder> &folders);

}  // namespace fileindex_tool

#endif
