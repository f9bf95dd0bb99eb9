// Makes chosen system calls of this process fail, and records socket writes, for tests of failure
// paths and framing. The test executable defines these calls itself and passes them on to the C
// library unless a fault is armed.
#ifndef FILEINDEX_TESTS_SYSCALL_FAULTS_H
#define FILEINDEX_TESTS_SYSCALL_FAULTS_H

#include <cstddef>
#include <functional>
#include <string>
#include <vector>

namespace fileindex_test {

enum class Syscall {
    kChmod, kClose, kFchmod, kFlock, kFstat, kFsync, kFtruncate, kLseek, kMkostemp, kOpen, kOpenat, kPread,
    kRead, kRename, kWrite, kCount
};
const char *SyscallName(Syscall call);

// Fails, with errnoValue, the call of one kind on the directory scope or on files under it that
// comes after the first skip such calls, until the guard's end. A failed close still closes the
// descriptor, as the system does.
class SyscallFault {
public:
    // In place of an errno: the write returns 0, as a full device may, and keeps doing so for
    // the calls after it too (a thousand at most, so that a writer that retries for ever ends).
    static constexpr int kNothingWritten = -1;

    SyscallFault(Syscall call, int errnoValue, const std::string &scope, int skip);
    ~SyscallFault();
    SyscallFault(const SyscallFault &) = delete;
    SyscallFault &operator=(const SyscallFault &) = delete;

    // How many calls failed because of this fault.
    int Hits() const;

private:
    Syscall m_call;
};

// Records the kinds of the calls made on the directory scope or on files under it while it
// exists, in order.
class SyscallTrace {
public:
    explicit SyscallTrace(const std::string &scope);
    ~SyscallTrace();
    SyscallTrace(const SyscallTrace &) = delete;
    SyscallTrace &operator=(const SyscallTrace &) = delete;

    std::vector<Syscall> Calls() const;
};

// Records the size of every write() to a socket made while it exists, in order, and runs onWrite
// (when given) just before each such write reaches the socket.
class SocketWriteRecorder {
public:
    explicit SocketWriteRecorder(std::function<void()> onWrite = nullptr);
    ~SocketWriteRecorder();
    SocketWriteRecorder(const SocketWriteRecorder &) = delete;
    SocketWriteRecorder &operator=(const SocketWriteRecorder &) = delete;

    std::vector<size_t> Sizes() const;
};

// The number of descriptors this process has open.
size_t OpenDescriptorCount();

}  // namespace fileindex_test

#endif
