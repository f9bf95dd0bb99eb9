// OwnedFd: a descriptor with exactly one owner, closed when its owner goes away, on every path.
//
// Move-only: a descriptor moves from the function that opened it to its caller and is never copied,
// so it is closed exactly once. Closing on destruction keeps errno, so that the reason of a failure
// survives the release of what the failed call had opened. A Config's lock descriptor is not one:
// the lock is released by an explicit Unlock, and destructors never unlock.
#ifndef FILEINDEX_CONFIG_OWNED_FD_H
#define FILEINDEX_CONFIG_OWNED_FD_H

#include <unistd.h>

#include <cerrno>

namespace VEXO {
namespace FILEINDEX {

class OwnedFd {
public:
    OwnedFd() = default;
    // Takes ownership of fd; a negative fd (a failed open) owns nothing.
    explicit OwnedFd(int fd) : m_fd(fd) {}
    ~OwnedFd() { CloseKeepingErrno(); }
    OwnedFd(OwnedFd &&other) noexcept : m_fd(other.Release()) {}
    OwnedFd &operator=(OwnedFd &&other) noexcept
    {
        if (this != &other) {
            CloseKeepingErrno();
            m_fd = other.Release();
        }
        return *this;
    }
    OwnedFd(const OwnedFd &) = delete;
    OwnedFd &operator=(const OwnedFd &) = delete;

    int Get() const { return m_fd; }
    bool IsOpen() const { return m_fd >= 0; }

    // Gives the descriptor up without closing it; the caller owns it from now on.
    int Release()
    {
        const int fd = m_fd;
        m_fd = -1;
        return fd;
    }

    // Closes now, for a caller that must know whether close succeeded (a save whose data may only
    // reach the disk at close): false with close's errno. True when nothing was open.
    bool Close()
    {
        const int fd = Release();
        return fd < 0 || close(fd) == 0;
    }

private:
    void CloseKeepingErrno()
    {
        if (m_fd >= 0) {
            const int reason = errno;
            close(Release());
            errno = reason;
        }
    }

    int m_fd = -1;
};

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
