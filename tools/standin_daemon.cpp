// fileindex-standin-daemon: listens on the indexing daemon's socket in its place and appends one
// line per command received, the command's JSON text exactly as it arrived, to a file or to
// standard output. A frame that breaks the framing rules is written as {"malformed": reason}.
// With --process-queues it also works through the shares' event queues as fileindexd would
// (standin_queue_worker.h), so that indexing progress moves on to "finished". It ends on SIGTERM or
// SIGINT, whatever it is doing and whatever signal mask it inherited, and once its socket is gone.
//
// Frame: a 4-byte length in host byte order counting the terminating NUL, the JSON text, the NUL.
// One frame per connection. The socket appears only once it accepts connections, so a program
// that waits for the socket file may send at once.
#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <iostream>
#include <memory>
#include <string>

#include <CLI/CLI.hpp>
#include <json/reader.h>
#include <json/writer.h>

#include "appliance_paths.h"
#include "standin_queue_worker.h"

namespace {

// How often the stand-in looks at its socket, and the queue worker for work, while no command
// arrives.
constexpr int kStepMilliseconds = 50;

volatile sig_atomic_t g_stop = 0;

void OnSignal(int)
{
    g_stop = 1;
}

bool ReadExactly(int fd, char *buffer, size_t size)
{
    while (size > 0) {
        const ssize_t got = read(fd, buffer, size);
        if (got < 0 && errno == EINTR) {
            continue;
        }
        if (got <= 0) {
            return false;
        }
        buffer += got;
        size -= static_cast<size_t>(got);
    }
    return true;
}

bool ParseJson(const std::string &text, Json::Value &value)
{
    Json::CharReaderBuilder builder;
    Json::CharReaderBuilder::strictMode(&builder.settings_);
    builder["strictRoot"] = false;
    std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    return reader->parse(text.data(), text.data() + text.size(), &value, nullptr);
}

std::string Malformed(const std::string &reason)
{
    Json::Value line;
    line["malformed"] = reason;
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    return Json::writeString(builder, line);
}

// The line to record for one connection; empty when the peer sent nothing at all.
std::string ReadFrame(int fd)
{
    uint32_t length = 0;
    ssize_t got;
    while ((got = read(fd, &length, 1)) < 0 && errno == EINTR) {
    }
    if (got == 0) {
        return std::string();
    }
    if (got < 0 || !ReadExactly(fd, reinterpret_cast<char *>(&length) + 1, sizeof(length) - 1)) {
        return Malformed("connection closed inside the length");
    }
    if (length == 0 || length > (64u << 20)) {
        return Malformed("length " + std::to_string(length));
    }
    std::string payload(length, '\0');
    if (!ReadExactly(fd, &payload[0], length)) {
        return Malformed("connection closed inside the text");
    }
    char extra;
    if (read(fd, &extra, 1) > 0) {
        return Malformed("bytes after the frame");
    }
    if (payload.back() != '\0') {
        return Malformed("text not terminated by NUL");
    }
    payload.pop_back();
    Json::Value command;
    if (payload.find('\0') != std::string::npos || !ParseJson(payload, command)) {
        return Malformed("not JSON text");
    }
    return payload;
}

// The listening socket, non-blocking: a connection that goes away between the wait and accept4
// must not leave the stand-in blocked there, deaf to signals.
int Listen(const std::string &socketPath)
{
    const std::string staging = socketPath + ".staging";
    const int fd = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
    sockaddr_un address = {};
    address.sun_family = AF_UNIX;
    if (fd < 0 || staging.size() >= sizeof(address.sun_path)) {
        return -1;
    }
    memcpy(address.sun_path, staging.c_str(), staging.size() + 1);
    unlink(staging.c_str());
    if (bind(fd, reinterpret_cast<sockaddr *>(&address), sizeof(address)) != 0 || listen(fd, 64) != 0 ||
        rename(staging.c_str(), socketPath.c_str()) != 0) {
        close(fd);
        return -1;
    }
    return fd;
}

// Whether path still names the file seen as known.
bool IsSameFile(const std::string &path, const struct stat &known)
{
    struct stat now;
    return stat(path.c_str(), &now) == 0 && now.st_ino == known.st_ino && now.st_dev == known.st_dev;
}

}  // namespace

int main(int argc, char **argv)
{
    CLI::App app{"Stand-in for the indexing daemon: records the commands sent to its socket."};
    std::string socketPath = FILEINDEX_DAEMON_SOCKET_PATH;
    std::string outputPath;
    int count = 0;
    bool processQueues = false;
    int recordMilliseconds = 300;
    app.add_option("--socket", socketPath, "socket to listen on")->capture_default_str();
    app.add_option("--output", outputPath, "file to append command lines to (default: standard output)");
    app.add_option("--count", count, "exit after this many commands (default: run until SIGTERM)");
    app.add_flag("--process-queues", processQueues, "work through the shares' event queues as fileindexd would");
    app.add_option("--record-time", recordMilliseconds, "milliseconds one queue record takes")
        ->capture_default_str()
        ->check(CLI::NonNegativeNumber);
    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError &error) {
        return app.exit(error) == 0 ? 0 : 2;  // a wrong command line is status 2, as for fileindexctl
    }

    // SIGTERM and SIGINT are blocked except while the stand-in waits for a connection, which ppoll
    // unblocks them for atomically: a signal that comes at any other moment ends the next wait
    // instead of being taken between the check of g_stop and a blocking call, and a mask inherited
    // with them blocked does not keep them out.
    struct sigaction action = {};
    action.sa_handler = OnSignal;
    sigaction(SIGTERM, &action, nullptr);
    sigaction(SIGINT, &action, nullptr);
    signal(SIGPIPE, SIG_IGN);
    sigset_t stopSignals, waiting;
    sigemptyset(&stopSignals);
    sigaddset(&stopSignals, SIGTERM);
    sigaddset(&stopSignals, SIGINT);
    sigprocmask(SIG_BLOCK, &stopSignals, &waiting);
    sigdelset(&waiting, SIGTERM);
    sigdelset(&waiting, SIGINT);

    const int output = outputPath.empty()
                           ? STDOUT_FILENO
                           : open(outputPath.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644);
    if (output < 0) {
        std::cerr << "cannot open " << outputPath << ": " << strerror(errno) << "\n";
        return 1;
    }
    const int listener = Listen(socketPath);
    if (listener < 0) {
        std::cerr << "cannot listen on " << socketPath << ": " << strerror(errno) << "\n";
        return 1;
    }
    // The stand-in ends once its socket is gone or replaced (a sandbox rebuilt under it), so that
    // none is left behind unreachable, and none takes the queues of a later appliance.
    struct stat listening;
    if (stat(socketPath.c_str(), &listening) != 0) {
        return 1;
    }
    fileindex_standin::QueueWorker worker{std::chrono::milliseconds(recordMilliseconds)};
    const timespec step = {0, kStepMilliseconds * 1000000L};
    for (int received = 0; !g_stop && (count == 0 || received < count) && IsSameFile(socketPath, listening);) {
        if (processQueues) {
            worker.Step();
        }
        pollfd incoming = {listener, POLLIN, 0};
        if (ppoll(&incoming, 1, &step, &waiting) <= 0) {
            continue;
        }
        const int connection = accept4(listener, nullptr, nullptr, SOCK_CLOEXEC);
        if (connection < 0) {
            continue;
        }
        std::string line = ReadFrame(connection);
        close(connection);
        if (line.empty()) {
            continue;
        }
        Json::Value command;
        if (processQueues && ParseJson(line, command)) {
            worker.OnCommand(command);
        }
        line += '\n';
        if (write(output, line.data(), line.size()) != static_cast<ssize_t>(line.size())) {
            std::cerr << "cannot write a command line: " << strerror(errno) << "\n";
        }
        ++received;
    }
    close(listener);
    if (IsSameFile(socketPath, listening)) {
        unlink(socketPath.c_str());
    }
    return 0;
}
