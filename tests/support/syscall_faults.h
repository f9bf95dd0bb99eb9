// Makes chosen system calls of this process fail, for tests of failure paths. The test executable
// defines these calls itself and passes them on to the C library unless a fault is armed.
#ifndef FILEINDEX_TESTS_SYSCALL_FAULTS_H
#define FILEINDEX_TESTS_SYSCALL_FAULTS_H

namespace fileindex_test {

enum class Syscall { kChmod, kFsync, kRename };

// The next calls of the given kind fail with errnoValue until Disarm (or the guard's end).
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

}  // namespace fileindex_test

#endif
