// Makes chosen system calls of this process fail, and records socket writes, for tests of failure
// paths and framing. The test executable defines these calls itself and passes them on to the C
// library unless a fault is armed.
#ifndef FILEINDEX_TESTS_SYSCALL_FAULTS_H
#define FILEINDEX_TESTS_SYSCALL_FAULTS_H

#include <cstddef>
#include <functional>
#include <vector>

namespace fileindex_test {

enum class Syscall { kChmod, kFsync, kRename };

// While the guard exists, every call of the given kind fails with errnoValue.
class SyscallFault {
public:
    SyscallFault(Syscall call, int errnoValue);
    ~SyscallFault();
    SyscallFault(const SyscallFault &) = delete;
    SyscallFault &operator=(const SyscallFault &) = delete;

    // How many calls failed because of this fault.
    int Hits() const;

private:
    Syscall m_call;
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

}  // namespace fileindex_test

#endif
