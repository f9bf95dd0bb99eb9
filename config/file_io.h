// Whole-file reads and atomic replacement. Every descriptor opened here is close-on-exec.
#ifndef FILEINDEX_CONFIG_FILE_IO_H
#define FILEINDEX_CONFIG_FILE_IO_H

#include <functional>
#include <string>

namespace VEXO {
namespace FILEINDEX {

// Reads the whole file into content. False when it cannot be opened or read.
bool ReadWholeFile(const std::string &path, std::string &content);

// Calls visit with each newline-separated line of the file (without its newline; a last line
// without one included) until visit returns false. False when the file cannot be opened or read.
bool ForEachLine(const std::string &path, const std::function<bool(const std::string &line)> &visit);

// Writes content to a temporary file beside path (mode 0644), syncs it, renames it over path and
// syncs the directory, so that a reader without any lock sees either the old or the new content.
// On any failure the temporary file is removed and path keeps its previous content. Temporary files
// left behind by killed processes are swept by the next replacement.
bool ReplaceFileAtomically(const std::string &path, const std::string &content);

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
