// A configuration lock held by another process: who holds it, waiting for it to be released, the
// failure when it was not, and a lock file that cannot be opened told from a held lock. The library
// never waits for its locks (three attempts within about 30 ms, then FILEIDX_ERR_LOCK); callers that
// may repeat an operation wait here instead.
#ifndef FILEINDEX_TOOL_BUSY_H
#define FILEINDEX_TOOL_BUSY_H

#include <functional>
#include <string>

#include "failure.h"

namespace fileindex_tool {

// One of the library's two lock files: what people call it, and where it is.
struct LockFile {
    const char *what;  // "the folder list lock"
    const char *path;
};
extern const LockFile kFolderListLock;  // guards folder.conf
extern const LockFile kStatusLock;      // guards status.conf

// Who holds a flock on the lock file: "pid 1234 (fileindexctl)", found in /proc/locks by the file's
// device and inode, the command from /proc/<pid>/comm ("pid 1234" alone when that is gone). Empty
// when /proc shows no holder (the lock was released meanwhile, or another pid namespace holds it).
std::string LockHolder(const std::string &lockPath);

// Runs attempt once, and again while it fails and sets busy (a lock another process holds) and
// waitSeconds have not passed since the first attempt, sleeping between attempts for a growing,
// jittered time (10 ms doubling up to 250 ms, each drawn between half and all of it) that never goes
// past the deadline. attempt clears and reads the library's last error itself (in the panel, where
// it has the library to itself). Only for operations whose lock failure leaves nothing behind: the
// attempt is repeated whole. waitSeconds 0 is one attempt.
bool RetryWhileBusy(double waitSeconds, const std::function<bool(bool &busy)> &attempt);

// The library sets FILEIDX_ERR_LOCK also when a lock file cannot be opened or created: its
// directory is missing, a symbolic link stands in its place, or the account may not write there.
// Nobody holds anything then, and waiting does not help. True, with failure (kind kFailed, code 9,
// "<what>: <lock> file <path> cannot be opened or created, so no process holds it: <why>; <what to
// do>"), when lock's file cannot be opened as the library opens it (read and write, never through a
// symbolic link, created when missing: a missing file in a usable directory is created here, as the
// library's own attempt would have created it). With lock null, both lock files are tried, and
// every one that cannot be opened is named.
bool LockFileUnusable(const std::string &what, const LockFile *lock, Failure &failure);

// The failure of an operation whose lock stayed busy: "<what>: <lock> (<path>) is held by <holder>;
// still busy after <waitSeconds> s; retry once that process is done" (without the "still busy" part
// for 0 s), of kind kBusy, code 9.
Failure BusyFailure(const std::string &what, const LockFile &lock, double waitSeconds);

}  // namespace fileindex_tool

#endif
