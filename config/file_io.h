// File helpers of the library and of the emulated platform: whole-file reads, files opened in
// directories other users may write, line files, and atomic replacement.
//
// One convention for every helper here that can fail: it returns bool, true when it did its whole
// job, false with errno telling why (the errno of the step that failed; releasing what the helper
// had opened never changes it). Inputs come first, then what the helper produces, as out-parameters
// that are meaningful on success only unless a comment says otherwise. A descriptor a helper opens
// is handed out as an OwnedFd; one it is given is a plain int that the caller keeps owning. Every
// descriptor opened here is close-on-exec.
#ifndef FILEINDEX_CONFIG_FILE_IO_H
#define FILEINDEX_CONFIG_FILE_IO_H

#include <sys/types.h>

#include <functional>
#include <string>
#include <string_view>

#include "config/owned_fd.h"

namespace VEXO {
namespace FILEINDEX {

// Reads the whole file into content. False when it cannot be opened or read.
bool ReadWholeFile(const std::string &path, std::string &content);

// Opens a file in a directory that other users may write (a share's "@eaDir"): a symbolic link in
// place of the file or of its directory is refused (ELOOP), and so is anything but a regular file,
// such as a FIFO that would block (EINVAL). flags are open's, O_NOFOLLOW and O_CLOEXEC added; mode
// is the creation mode for O_CREAT.
bool OpenRegularFile(const std::string &path, int flags, mode_t mode, OwnedFd &fd);

// Makes the directory path (mode before the umask) inside its parent, refusing a symbolic link in
// place of either (ELOOP). An existing directory is fine; anything else already there fails with
// ENOTDIR.
bool MakeDirectory(const std::string &path, mode_t mode);

// Calls visit with each newline-separated line of the file (without its newline; a last line
// without one included) until visit returns false. The file is opened with OpenRegularFile.
// False when it cannot be opened or read. Reads in large blocks and hands each line out where it
// lies in the block, valid during the call only; memory follows the longest line, not the size of
// the file.
bool ForEachLine(const std::string &path, const std::function<bool(std::string_view line)> &visit);

// Appends line, which ends in a newline, to the file fd (opened for reading and appending, and
// locked by the caller) whole or not at all. When the file does not end in a newline (a writer was
// cut short or killed), one is written first, so that the torn line stays alone. A short write is
// continued; when the rest cannot be written the file is cut back to its length before the call.
// written receives the bytes written, on failure too (the newline included), for the caller's log.
bool AppendLine(int fd, const std::string &line, size_t &written);

// Writes content to a temporary file beside path (mode 0644), syncs it, renames it over path and
// syncs the directory, so that a reader without any lock sees either the old or the new content.
// On any failure the temporary file is removed and path keeps its previous content. Temporary
// files of earlier savers are swept first: those whose process is gone (killed mid-save) and those
// older than an hour (their process number may since belong to another program).
bool ReplaceFileAtomically(const std::string &path, const std::string &content);

// The temporary files of ReplaceFileAtomically are named "<name>.tmp.<pid>.<random>": the saver's
// process number, so that a sweep tells an orphan from a save in progress, and the six letters or
// digits that mkostemp puts in place of "XXXXXX". These two functions are the only ones that build
// or read that name.

// The template mkostemp fills in for a save of path by process pid: path + ".tmp.<pid>.XXXXXX".
std::string TempFileTemplate(const std::string &path, pid_t pid);
// True when entry, a name in path's directory, is a temporary file name of the file called name;
// pid receives the saver's process number. False for every other name, such as the file itself,
// another file's temporaries, or a process number that is not a positive decimal pid_t.
bool ParseTempFileName(std::string_view entry, const std::string &name, pid_t &pid);

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
