// Who holds a busy configuration lock, the wait for its release, the failure when it stays busy, and a
// lock file that cannot be opened.
#include "busy.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <fstream>
#include <random>
#include <sstream>
#include <thread>

#include "appliance_paths.h"
#include "fileindex/error.h"
#include "path_encoding.h"

namespace fileindex_tool {

using VEXO::FILEINDEX::ErrorHandler;

const LockFile kFolderListLock = {"the folder list lock", FILEINDEX_FOLDER_LOCK_PATH};
const LockFile kStatusLock = {"the status lock", FILEINDEX_STATUS_LOCK_PATH};

namespace {

// The pid of the first /proc/locks line holding (not waiting for) a lock on the file with this
// device and inode, or -1. A line reads "1: FLOCK  ADVISORY  WRITE 1234 08:01:5678 0 EOF"; a waiter's
// line has "->" after the number.
long FindLockPid(dev_t device, ino_t inode)
{
    std::ifstream locks("/proc/locks");
    std::string line;
    while (std::getline(locks, line)) {
        std::istringstream fields(line);
        std::string number, kind, mode, access, file;
        long pid = -1;
        if (!(fields >> number >> kind) || kind == "->" || !(fields >> mode >> access >> pid >> file)) {
            continue;
        }
        unsigned int major = 0, minor = 0;
        unsigned long long fileInode = 0;
        if (sscanf(file.c_str(), "%x:%x:%llu", &major, &minor, &fileInode) == 3 && major == major(device) &&
            minor == minor(device) && fileInode == inode && pid > 0) {
            return pid;
        }
    }
    return -1;
}

// The directory part of a path: "/a" for "/a/b", "/" for "/b".
std::string DirectoryOf(const std::string &path)
{
    const size_t slash = path.rfind('/');
    return slash == std::string::npos ? "." : path.substr(0, slash == 0 ? 1 : slash);
}

}  // namespace

std::string LockHolder(const std::string &lockPath)
{
    struct stat status;
    if (stat(lockPath.c_str(), &status) != 0) {
        return "";
    }
    const long pid = FindLockPid(status.st_dev, status.st_ino);
    if (pid < 0) {
        return "";
    }
    std::ifstream commFile("/proc/" + std::to_string(pid) + "/comm");
    std::string command;
    std::getline(commFile, command);
    const std::string holder = "pid " + std::to_string(pid);
    return command.empty() ? holder : holder + " (" + TerminalText(command) + ")";
}

bool RetryWhileBusy(double waitSeconds, const std::function<bool(bool &busy)> &attempt)
{
    using Clock = std::chrono::steady_clock;
    const Clock::time_point deadline =
        Clock::now() + std::chrono::duration_cast<Clock::duration>(std::chrono::duration<double>(waitSeconds));
    std::minstd_rand random(static_cast<unsigned>(getpid()) ^
                            static_cast<unsigned>(Clock::now().time_since_epoch().count()));
    std::chrono::milliseconds backOff(10);
    for (;;) {
        bool busy = false;
        const bool done = attempt(busy);
        if (done || !busy) {
            return done;
        }
        const Clock::time_point now = Clock::now();
        if (now >= deadline) {
            return false;
        }
        std::uniform_int_distribution<long> jitter(backOff.count() / 2, backOff.count());
        const Clock::duration sleep =
            std::min<Clock::duration>(std::chrono::milliseconds(jitter(random)), deadline - now);
        std::this_thread::sleep_for(sleep);
        backOff = std::min(backOff * 2, std::chrono::milliseconds(250));
    }
}

bool LockFileUnusable(const std::string &what, const LockFile *lock, Failure &failure)
{
    std::string files;  // "the folder list lock file <path>", and " and the status lock file <path>"
    int unusable = 0;
    int error = 0;
    const LockFile *first = nullptr;
    for (const LockFile *candidate : {&kFolderListLock, &kStatusLock}) {
        if (lock != nullptr && candidate != lock) {
            continue;
        }
        const int fd = open(candidate->path, O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, 0644);
        if (fd >= 0) {
            close(fd);
            continue;
        }
        if (first == nullptr) {
            first = candidate;
            error = errno;
        }
        files += std::string(unusable++ == 0 ? "" : " and ") + candidate->what + " file " + TerminalText(candidate->path);
    }
    if (first == nullptr) {
        return false;
    }
    const std::string directory = TerminalText(DirectoryOf(first->path));
    std::string cause, remedy;
    switch (error) {
    case ENOENT:
        cause = "the directory " + directory + " is missing";
        remedy = "create it, writable by the programs that use the file index";
        break;
    case EACCES:
    case EPERM:
        cause = "this account may not open or create files in " + directory;
        remedy = "run as an account that may, or correct the permissions";
        break;
    case ELOOP:
        cause = "a symbolic link stands at " + TerminalText(first->path) + ", and the library never follows one there";
        remedy = "remove the link";
        break;
    case EROFS:
        cause = "the file system of " + directory + " is read-only";
        remedy = "make it writable";
        break;
    default:
        cause = "the system refuses it";
        remedy = "check " + directory;
        break;
    }
    failure = ToolFailure(FailureKind::kFailed, VEXO::FILEINDEX::FILEIDX_ERR_LOCK,
                          what + ": " + files + " cannot be opened or created, so no process holds " +
                              (unusable == 1 ? "it: " : "them: ") + cause + " (" + strerror(error) + "); " + remedy);
    return true;
}

Failure BusyFailure(const std::string &what, const LockFile &lock, double waitSeconds)
{
    const std::string holder = LockHolder(lock.path);
    std::ostringstream message;
    message << what << ": " << lock.what << " (" << TerminalText(lock.path) << ") is held by "
            << (holder.empty() ? "another process" : holder);
    if (waitSeconds > 0) {
        message << "; still busy after " << waitSeconds << " s";
    }
    message << "; retry once that process is done";
    return ToolFailure(FailureKind::kBusy, VEXO::FILEINDEX::FILEIDX_ERR_LOCK, message.str());
}

}  // namespace fileindex_tool
