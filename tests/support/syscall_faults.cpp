#include "tests/support/syscall_faults.h"

#include <dlfcn.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <cstdio>
#include <mutex>

namespace fileindex_test {
namespace {

struct Armed {
    std::atomic<int> errnoValue{0};
    std::atomic<int> hits{0};
};

Armed g_faults[3];

Armed &FaultOf(Syscall call)
{
    return g_faults[static_cast<int>(call)];
}

// True (errno set) when the call is to fail.
bool Fires(Syscall call)
{
    Armed &armed = FaultOf(call);
    const int value = armed.errnoValue.load();
    if (value == 0) {
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

SyscallFault::SyscallFault(Syscall call, int errnoValue) : m_call(call)
{
    FaultOf(call).hits = 0;
    FaultOf(call).errnoValue = errnoValue;
}

SyscallFault::~SyscallFault()
{
    FaultOf(m_call).errnoValue = 0;
}

int SyscallFault::Hits() const
{
    return FaultOf(m_call).hits.load();
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

}  // namespace fileindex_test

using fileindex_test::Syscall;

extern "C" {

int chmod(const char *path, mode_t mode)
{
    if (fileindex_test::Fires(Syscall::kChmod)) {
        return -1;
    }
    static const auto next = fileindex_test::Next<int (*)(const char *, mode_t)>("chmod");
    return next(path, mode);
}

int fsync(int fd)
{
    if (fileindex_test::Fires(Syscall::kFsync)) {
        return -1;
    }
    static const auto next = fileindex_test::Next<int (*)(int)>("fsync");
    return next(fd);
}

ssize_t write(int fd, const void *buffer, size_t size)
{
    fileindex_test::RecordIfSocket(fd, size);
    static const auto next = fileindex_test::Next<ssize_t (*)(int, const void *, size_t)>("write");
    return next(fd, buffer, size);
}

int rename(const char *from, const char *to)
{
    if (fileindex_test::Fires(Syscall::kRename)) {
        return -1;
    }
    static const auto next = fileindex_test::Next<int (*)(const char *, const char *)>("rename");
    return next(from, to);
}

}
