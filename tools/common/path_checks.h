// The checks fileindexctl and the panel make on a share name or a share-relative path before they
// hand it to the library, so that a request the library would store as a folder that can never be
// indexed, or refuse without saying why, fails first with a clear reason. Each takes what, the
// operation as the message names it ("folder add /photo/x"), and on a refusal fills failure and
// returns false. None takes a lock or writes anything; they may set the library's last error.
#ifndef FILEINDEX_TOOL_PATH_CHECKS_H
#define FILEINDEX_TOOL_PATH_CHECKS_H

#include <string>
#include <vector>

#include "failure.h"
#include "fileindex/folder.h"

namespace fileindex_tool {

// The form a folder is stored under: trailing "/" removed ("/photo/holiday/" is /photo/holiday).
// Refused (kInvalid): an empty path, one that does not begin with "/", an empty component ("//"),
// a "." or ".." component, and one longer than 4095 bytes.
bool NormaliseFolderPath(const std::string &what, const std::string &given, std::string &path, Failure &failure);

// The share is in the share database. Refused: a name that is empty or holds "/" (kInvalid); a
// share the database does not know (kNotFound, code 2, "share <name> does not exist").
bool CheckShareExists(const std::string &what, const std::string &share, Failure &failure);

// The path's share exists (as above) and so does the path itself, as a directory or any other
// entry (kNotFound, code 2, "<path> does not exist").
bool CheckPathExists(const std::string &what, const std::string &path, Failure &failure);

// The share is in the share database or holds folder settings in folders (a share that is gone
// from the database may still have settings to remove or move). Refused as CheckShareExists, with
// "share <name> does not exist and holds no folder settings".
bool CheckShareKnown(const std::string &what, const std::string &share,
                     const std::vector<VEXO::FILEINDEX::Folder> &folders, Failure &failure);

// The path is an indexed folder, lies inside one or holds one (IndexMgr::IsPathIndexed or
// IsPathContainIndexed; folder.conf read without its lock). Refused: kNotFound, code 4, "<path> is not
// an indexed folder, nor inside or above one".
bool CheckIndexedOrAbove(const std::string &what, const std::string &path, Failure &failure);

// A path that is not in the folder list: kNotFound, code 4, "<path> is not in the folder list".
Failure NotInFolderList(const std::string &what, const std::string &path);

// The library's indexability rules accept the path as a folder to index (kRefused, "<path> may not
// be indexed: <the rule's text>", the text fileindexctl check gives).
bool CheckMayBeIndexed(const std::string &what, const std::string &path, Failure &failure);

}  // namespace fileindex_tool

#endif
