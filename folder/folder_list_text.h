// Reads the text of folder.conf straight into folder records, for listings that need no
// Json::Value of it.
#ifndef FILEINDEX_FOLDER_FOLDER_LIST_TEXT_H
#define FILEINDEX_FOLDER_FOLDER_LIST_TEXT_H

#include <string>
#include <vector>

#include "fileindex/folder.h"
#include "share/share_lookup.h"

namespace VEXO {
namespace FILEINDEX {

// The records Folders::Load followed by Folders::List makes of text, made the same way (each path
// resolved in path order with GetFullPath, with its log lines and error codes, the shares' paths
// taken from lookups), into out. False, with out untouched and nothing resolved, when text is not a
// JSON object or holds something only the JSON library can judge (see json_token.h); the caller
// then loads it through Folders.
bool ReadFolderListText(const std::string &text, std::vector<Folder> &out, ShareLookups &lookups);

// Folders::Load followed by Folders::List(out, share), folder.conf read with ReadFolderListText
// where it can be: the same folders, the same log lines and error codes, and the same look-ups in
// the share database where lookups keeps nothing. False, out untouched, when folder.conf cannot be
// loaded.
bool LoadFolderList(std::vector<Folder> &out, const std::string &share, ShareLookups &lookups);

// Whether the folder at path belongs in Folders::List(out, share): every folder for an empty share,
// else a folder whose path names the share exactly.
bool IsListedForShare(const std::string &path, const std::string &share);

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
