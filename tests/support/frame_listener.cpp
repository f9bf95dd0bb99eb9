// A listener on the daemon socket that records each connection's bytes.
#include "tests/support/frame_listener.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <chrono>
#include <cstdint>
#include <cstring>

#include <gtest/gtest.h>

#include "appliance_paths.h"

namespace fileindex_test {

namespace {

sockaddr_un DaemonAddress()
{
    sockaddr_un address = {};
    address.sun_family = AF_UNIX;
    strcpy(address.sun_path, FILEINDEX_DAEMON_SOCKET_PATH);
    return address;
}

int ConnectToListener()
{
    const int fd = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    const sockaddr_un address = DaemonAddress();
    EXPECT_EQ(connect(fd, reinterpret_cast<const sockaddr *>(&address), sizeof(address)), 0) << strerror(errno);
    return fd;
}

}  // namespace

FrameListener::FrameListener(Mode mode)
    : m_mode(mode), m_listenFd(-1), m_fillerFd(-1), m_stopPipe{-1, -1}
{
    unlink(FILEINDEX_DAEMON_SOCKET_PATH);
    m_listenFd = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    const sockaddr_un address = DaemonAddress();
    EXPECT_EQ(bind(m_listenFd, reinterpret_cast<const sockaddr *>(&address), sizeof(address)), 0) << strerror(errno);
    EXPECT_EQ(listen(m_listenFd, mode == Mode::kBacklogFull ? 0 : 16), 0);
    if (mode == Mode::kBacklogFull) {
        m_fillerFd = ConnectToListener();
    }
    EXPECT_EQ(pipe2(m_stopPipe, O_CLOEXEC), 0);
    m_thread = std::thread(&FrameListener::Run, this);
}

FrameListener::~FrameListener()
{
    (void)write(m_stopPipe[1], "x", 1);
    m_thread.join();
    close(m_listenFd);
    if (m_fillerFd >= 0) {
        close(m_fillerFd);
    }
    close(m_stopPipe[0]);
    close(m_stopPipe[1]);
    unlink(FILEINDEX_DAEMON_SOCKET_PATH);
}

bool FrameListener::WaitForStop(int milliseconds)
{
    pollfd stop = {m_stopPipe[0], POLLIN, 0};
    return poll(&stop, 1, milliseconds) > 0;
}

void FrameListener::Run()
{
    if (m_mode == Mode::kBacklogFull && WaitForStop(5000)) {
        return;
    }
    for (;;) {
        pollfd fds[2] = {{m_listenFd, POLLIN, 0}, {m_stopPipe[0], POLLIN, 0}};
        if (poll(fds, 2, -1) < 0 || (fds[1].revents & POLLIN) != 0) {
            return;
        }
        const int connection = accept4(m_listenFd, nullptr, nullptr, SOCK_CLOEXEC);
        if (connection < 0) {
            continue;
        }
        if (m_mode == Mode::kStallThenRead && WaitForStop(2500)) {
            close(connection);
            return;
        }
        std::string bytes;
        if (m_mode == Mode::kReadAll || m_mode == Mode::kStallThenRead) {
            char buffer[4096];
            ssize_t got;
            while ((got = read(connection, buffer, sizeof(buffer))) > 0) {
                bytes.append(buffer, static_cast<size_t>(got));
            }
        }
        close(connection);
        std::lock_guard<std::mutex> lock(m_mutex);
        m_connections.push_back(bytes);
        m_changed.notify_all();
    }
}

std::vector<std::string> FrameListener::Connections(size_t count)
{
    std::unique_lock<std::mutex> lock(m_mutex);
    m_changed.wait_for(lock, std::chrono::seconds(5), [&] { return m_connections.size() >= count; });
    return m_connections;
}

std::string FrameListener::TextOfFrame(const std::string &frame)
{
    uint32_t length = 0;
    if (frame.size() < sizeof(length)) {
        ADD_FAILURE() << "frame shorter than its length prefix";
        return std::string();
    }
    memcpy(&length, frame.data(), sizeof(length));
    EXPECT_EQ(length, frame.size() - sizeof(length)) << "length must count the text and its NUL";
    EXPECT_EQ(frame.back(), '\0');
    return frame.substr(sizeof(length), frame.size() - sizeof(length) - 1);
}

}  // namespace fileindex_test
