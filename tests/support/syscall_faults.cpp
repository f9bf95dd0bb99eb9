// The test executable's interposed system calls: armed faults and recorded socket writes.
#include "tests/support/syscall_faults.h"

#include <dirent.h>
#include <dlfcn.h>
#include <fcntl.h>
#include <stdarg.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <cstdio>
#include <mutex>

namespace fileindex_test {
namespace {

constexpr int kKinds = static_cast<int>(Syscall::kCount);

struct Armed {
    std::atomic<int> errnoValue{0};
    std::atomic<int> hits{0};
    int skip = 0;  // the calls in scope that pass before one fails
    int seen = 0;
};

Armed g_faults[kKinds];
std::atomic<int> g_armed{0};  // faults and traces armed; calls are looked at only while non-zero
std::string g_scope;
std::mutex g_traceMutex;
bool g_tracing = false;
std::vector<Syscall> g_trace;

Armed &FaultOf(Syscall call)
{
    return g_faults[static_cast<int>(call)];
}

std::string PathOfFd(int fd)
{
    char link[64];
    char target[4096];
    snprintf(link, sizeof(link), "/proc/self/fd/%d", fd);
    const ssize_t length = readlink(link, target, sizeof(target));
    return length > 0 ? std::string(target, static_cast<size_t>(length)) : std::string();
}

std::string PathAt(int dirFd, const char *name)
{
    return name[0] == '/' || dirFd == AT_FDCWD ? name : PathOfFd(dirFd) + "/" + name;
}

// True (errno set) when the call is to fail. where() names the file the call is about.
template <typename Where>
bool Fires(Syscall call, const Where &where)
{
    if (g_armed.load() == 0) {
        return false;
    }
    Armed &armed = FaultOf(call);
    const int value = armed.errnoValue.load();
    const bool tracing = [] {
        std::lock_guard<std::mutex> lock(g_traceMutex);
        return g_tracing;
    }();
    if (!tracing && value == 0) {
        return false;
    }
    const std::string path = where();
    const bool inScope = path == g_scope || path.rfind(g_scope + "/", 0) == 0;
    if (tracing && inScope) {
        std::lock_guard<std::mutex> lock(g_traceMutex);
        g_trace.push_back(call);
    }
    const bool repeats = value == SyscallFault::kNothingWritten && armed.hits < 1000;
    if (value == 0 || !inScope || (armed.seen++ != armed.skip && !repeats)) {
        return false;
    }
    ++armed.hits;
    errno = value;
    return true;
}

std::atomic<bool> g_recordingSocketWrites{false};
std::mutex g_socketWritesMutex;
std::vector<size_t> g_socketWrites;
std::function<void()> g_onSocketWrite;

void RecordIfSocket(int fd, size_t size)
{
    struct stat st;
    if (g_recordingSocketWrites && fstat(fd, &st) == 0 && S_ISSOCK(st.st_mode)) {
        std::function<void()> onWrite;
        {
            std::lock_guard<std::mutex> lock(g_socketWritesMutex);
            g_socketWrites.push_back(size);
            onWrite = g_onSocketWrite;
        }
        if (onWrite) {
            onWrite();
        }
    }
}

template <typename Function>
Function Next(const char *name)
{
    return reinterpret_cast<Function>(dlsym(RTLD_NEXT, name));
}

}  // namespace

const char *SyscallName(Syscall call)
{
    static const char *const kNames[kKinds] = {"chmod", "close", "fchmod", "flock", "fstat",  "fsync",  "ftruncate", "lseek",
                                               "mkostemp", "open", "openat", "pread", "read", "rename", "write"};
    return kNames[static_cast<int>(call)];
}

SyscallFault::SyscallFault(Syscall call, int errnoValue, const std::string &scope, int skip) : m_call(call)
{
    Armed &armed = FaultOf(call);
    armed.hits = 0;
    armed.seen = 0;
    armed.skip = skip;
    g_scope = scope;
    armed.errnoValue = errnoValue;
    ++g_armed;
}

SyscallFault::~SyscallFault()
{
    FaultOf(m_call).errnoValue = 0;
    --g_armed;
}

int SyscallFault::Hits() const
{
    return FaultOf(m_call).hits.load();
}

SyscallTrace::SyscallTrace(const std::string &scope)
{
    std::lock_guard<std::mutex> lock(g_traceMutex);
    g_scope = scope;
    g_trace.clear();
    g_tracing = true;
    ++g_armed;
}

SyscallTrace::~SyscallTrace()
{
    std::lock_guard<std::mutex> lock(g_traceMutex);
    g_tracing = false;
    --g_armed;
}

std::vector<Syscall> SyscallTrace::Calls() const
{
    std::lock_guard<std::mutex> lock(g_traceMutex);
    return g_trace;
}

SocketWriteRecorder::SocketWriteRecorder(std::function<void()> onWrite)
{
    std::lock_guard<std::mutex> lock(g_socketWritesMutex);
    g_socketWrites.clear();
    g_onSocketWrite = std::move(onWrite);
    g_recordingSocketWrites = true;
}

SocketWriteRecorder::~SocketWriteRecorder()
{
    g_recordingSocketWrites = false;
    std::lock_guard<std::mutex> lock(g_socketWritesMutex);
    g_onSocketWrite = nullptr;
}

std::vector<size_t> SocketWriteRecorder::Sizes() const
{
    std::lock_guard<std::mutex> lock(g_socketWritesMutex);
    return g_socketWrites;
}

size_t OpenDescriptorCount()
{
    size_t count = 0;
    DIR *dir = opendir("/proc/self/fd");
    while (dir != nullptr && readdir(dir) != nullptr) {
        ++count;
    }
    closedir(dir);
    return count - 3;  // ".", ".." and the directory's own descriptor
}

}  // namespace fileindex_test

using fileindex_test::Fires;
using fileindex_test::Next;
using fileindex_test::PathAt;
using fileindex_test::PathOfFd;
using fileindex_test::Syscall;

// The interposed calls: each fails when its fault fires for the file where names, and otherwise
// goes on to the C library.
#define FILEINDEX_INTERPOSE(Result, name, kind, where, Parameters, Arguments) \
    Result name Parameters                                                   \
    {                                                                        \
        if (Fires(Syscall::kind, [&] { return std::string(where); })) {      \
            return -1;                                                       \
        }                                                                    \
        static const auto next = Next<Result(*) Parameters>(#name);          \
        return next Arguments;                                               \
    }

extern "C" {

FILEINDEX_INTERPOSE(int, chmod, kChmod, path, (const char *path, mode_t mode), (path, mode))
FILEINDEX_INTERPOSE(int, fchmod, kFchmod, PathOfFd(fd), (int fd, mode_t mode), (fd, mode))
FILEINDEX_INTERPOSE(int, flock, kFlock, PathOfFd(fd), (int fd, int operation), (fd, operation))
FILEINDEX_INTERPOSE(int, fstat, kFstat, PathOfFd(fd), (int fd, struct stat *st), (fd, st))
FILEINDEX_INTERPOSE(int, fsync, kFsync, PathOfFd(fd), (int fd), (fd))
FILEINDEX_INTERPOSE(int, ftruncate, kFtruncate, PathOfFd(fd), (int fd, off_t length), (fd, length))
FILEINDEX_INTERPOSE(off_t, lseek, kLseek, PathOfFd(fd), (int fd, off_t offset, int whence), (fd, offset, whence))
FILEINDEX_INTERPOSE(int, mkostemp, kMkostemp, pathTemplate, (char *pathTemplate, int flags), (pathTemplate, flags))
FILEINDEX_INTERPOSE(ssize_t, pread, kPread, PathOfFd(fd), (int fd, void *buffer, size_t size, off_t offset),
                    (fd, buffer, size, offset))
FILEINDEX_INTERPOSE(ssize_t, read, kRead, PathOfFd(fd), (int fd, void *buffer, size_t size), (fd, buffer, size))
FILEINDEX_INTERPOSE(int, rename, kRename, from, (const char *from, const char *to), (from, to))

int close(int fd)
{
    static const auto next = Next<int (*)(int)>("close");
    if (Fires(Syscall::kClose, [&] { return PathOfFd(fd); })) {
        const int reason = errno;
        next(fd);
        errno = reason;
        return -1;
    }
    return next(fd);
}

// open and openat take a mode only when they may create.
#define FILEINDEX_CREATION_MODE(flags)                              \
    mode_t mode = 0;                                                \
    if (((flags) & (O_CREAT | O_TMPFILE)) != 0) {                   \
        va_list args;                                               \
        va_start(args, flags);                                      \
        mode = static_cast<mode_t>(va_arg(args, int));              \
        va_end(args);                                               \
    }

int open(const char *path, int flags, ...)
{
    FILEINDEX_CREATION_MODE(flags)
    if (Fires(Syscall::kOpen, [&] { return std::string(path); })) {
        return -1;
    }
    static const auto next = Next<int (*)(const char *, int, ...)>("open");
    return next(path, flags, mode);
}

int openat(int dirFd, const char *path, int flags, ...)
{
    FILEINDEX_CREATION_MODE(flags)
    if (Fires(Syscall::kOpenat, [&] { return PathAt(dirFd, path); })) {
        return -1;
    }
    static const auto next = Next<int (*)(int, const char *, int, ...)>("openat");
    return next(dirFd, path, flags, mode);
}

ssize_t write(int fd, const void *buffer, size_t size)
{
    fileindex_test::RecordIfSocket(fd, size);
    if (Fires(Syscall::kWrite, [&] { return PathOfFd(fd); })) {
        return errno == fileindex_test::SyscallFault::kNothingWritten ? 0 : -1;
    }
    static const auto next = Next<ssize_t (*)(int, const void *, size_t)>("write");
    return next(fd, buffer, size);
}

}
