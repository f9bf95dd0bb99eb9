// Reads the text of folder.conf straight into folder records, for listings that need no
// Json::Value of it.
#ifndef FILEINDEX_FOLDER_FOLDER_LIST_TEXT_H
#define FILEINDEX_FOLDER_FOLDER_LIST_TEXT_H

#include <string>
#include <vector>

#include "fileindex/folder.h"

namespace VEXO {
namespace FILEINDEX {

// The records Folders::Load followed by Folders::List makes of text, made the same way (each path
// resolved in path order with GetFullPath, with its log lines and error codes), into out. False,
// with out untouched and nothing resolved, when text is not a JSON object or holds something only
// the JSON library can judge (see json_token.h); the caller then loads it through Folders.
bool ReadFolderListText(const std::string &text, std::vector<Folder> &out);

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
