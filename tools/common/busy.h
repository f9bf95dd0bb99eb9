// A configuration lock held by another process: who holds it, waiting for it to be released, and
// the failure when it was not. The library never waits for its locks (three attempts within about
// 30 ms, then FILEIDX_ERR_LOCK); callers that may repeat an operation wait here instead.
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

// Runs call once, and again while it fails with FILEIDX_ERR_LOCK and waitSeconds have not passed
// since the first attempt, sleeping between attempts for a growing, jittered time (10 ms doubling up
// to 250 ms, each drawn between half and all of it) that never goes past the deadline. The last
// error is cleared before each attempt, so it tells why the last one failed. Only for operations
// whose lock failure leaves nothing behind: the call is repeated whole. waitSeconds 0 is one attempt.
bool RetryWhileBusy(double waitSeconds, const std::function<bool()> &call);
// The same for a program whose threads share the library (the panel): attempt clears and reads the
// last error itself, where it has the library to itself, and sets busy when it failed on a lock;
// the sleeps between attempts happen outside it.
bool RetryWhileBusy(double waitSeconds, const std::function<bool(bool &busy)> &attempt);

// The failure of an operation whose lock stayed busy: "<what>: <lock> (<path>) is held by <holder>;
// still busy after <waitSeconds> s; retry once that process is done" (without the "still busy" part
// for 0 s), of kind kBusy, code 9.
Failure BusyFailure(const std::string &what, const LockFile &lock, double waitSeconds);

}  // namespace fileindex_tool

#endif
