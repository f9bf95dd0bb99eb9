// The command channel to fileindexd: one framed JSON command per connection, never answered.
#include <signal.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

#include "appliance_paths.h"
#include "config/owned_fd.h"
#include "daemon/command_frame.h"
#include "fileindex/utils.h"

namespace VEXO {
namespace FILEINDEX {

namespace {

constexpr size_t kMaxWriteSize = 1024;
constexpr int kEintrAllowance = 3;

// Writes n bytes in pieces of at most 1024, each continuing where the last one ended. An
// interrupted write is tried again, three times in all; any other failed write (the daemon stopped
// reading for the whole send time-out, or hung up) fails the frame, which the daemon then sees cut
// short and never damaged.
bool WriteLoop(int fd, const char *buffer, size_t n)
{
    size_t offset = 0;
    int eintrAllowance = kEintrAllowance;
    while (offset < n) {
        const ssize_t written = write(fd, buffer + offset, std::min(n - offset, kMaxWriteSize));
        if (written > 0) {
            offset += static_cast<size_t>(written);
            continue;
        }
        if (errno == EINTR && eintrAllowance > 0) {
            --eintrAllowance;
            continue;
        }
        return false;
    }
    return true;
}

// The send time-out is set before connecting: it also bounds the wait of a connection that a
// daemon, alive but no longer accepting, leaves in its full backlog.
// A socket that is not open when the connection cannot be made.
OwnedFd ConnectToDaemon()
{
    OwnedFd fd(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    const timeval sendTimeout = {1, 0};
    if (!fd.IsOpen() || setsockopt(fd.Get(), SOL_SOCKET, SO_SNDTIMEO, &sendTimeout, sizeof(sendTimeout)) != 0) {
        return OwnedFd();
    }
    sockaddr_un address;
    memset(&address, 0, sizeof(address));
    address.sun_family = AF_UNIX;
    static_assert(sizeof(FILEINDEX_DAEMON_SOCKET_PATH) <= sizeof(address.sun_path), "socket path too long");
    memcpy(address.sun_path, FILEINDEX_DAEMON_SOCKET_PATH, sizeof(FILEINDEX_DAEMON_SOCKET_PATH));
    if (connect(fd.Get(), reinterpret_cast<const sockaddr *>(&address), sizeof(address)) != 0) {
        return OwnedFd();
    }
    return fd;
}

}  // namespace

bool SendCammandToDaemon(const std::string &type, const Json::Value &data)
{
    // A daemon that has gone away must give a failed write, not kill the caller.
    signal(SIGPIPE, SIG_IGN);
    const OwnedFd fd = ConnectToDaemon();
    if (!fd.IsOpen()) {
        return false;
    }
    // The length and the rest of the frame go out as two separate writes.
    const std::string frame = EncodeCommandFrame(type, data);
    return WriteLoop(fd.Get(), frame.data(), kFrameLengthSize) &&
           WriteLoop(fd.Get(), frame.data() + kFrameLengthSize, frame.size() - kFrameLengthSize);
}

}  // namespace FILEINDEX
}  // namespace VEXO
