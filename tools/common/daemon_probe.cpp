// Whether fileindexd takes connections, and the failure of a change it was not told of.
#include "daemon_probe.h"

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "appliance_paths.h"
#include "fileindex/error.h"
#include "path_encoding.h"

namespace fileindex_tool {

DaemonState ProbeDaemon()
{
    const std::string socketPath = FILEINDEX_DAEMON_SOCKET_PATH;
    DaemonState state;
    const int fd = socket(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0);
    if (fd < 0) {
        state.problem = std::string("no socket could be made: ") + strerror(errno);
        return state;
    }
    sockaddr_un address = {};
    address.sun_family = AF_UNIX;
    strncpy(address.sun_path, socketPath.c_str(), sizeof(address.sun_path) - 1);
    if (connect(fd, reinterpret_cast<const sockaddr *>(&address), sizeof(address)) == 0) {
        state.reachable = true;
    } else if (errno == ENOENT) {
        state.problem = "no socket at " + TerminalText(socketPath) + ": the indexing service is not running";
    } else if (errno == ECONNREFUSED) {
        state.problem = "nobody listens on " + TerminalText(socketPath) + ": the indexing service has stopped";
    } else if (errno == EAGAIN) {
        state.problem = "fileindexd takes no more connections on " + TerminalText(socketPath) + " (its backlog is full)";
    } else {
        state.problem = "cannot connect to " + TerminalText(socketPath) + ": " + strerror(errno);
    }
    close(fd);
    return state;
}

Failure DaemonFailure(const std::string &what, const std::string &state, const std::string &withoutCode)
{
    if (VEXO::FILEINDEX::ErrorHandler::GetError() != VEXO::FILEINDEX::FILEIDX_ERR_NONE) {
        return LibraryFailure(what, withoutCode);
    }
    const DaemonState daemon = ProbeDaemon();
    if (daemon.reachable) {
        return LibraryFailure(what, withoutCode);
    }
    return ToolFailure(FailureKind::kDaemonNotTold, Failure::kNoCode,
                       what + ": fileindexd was not told: " + daemon.problem + "; " + (state.empty() ? "" : state + "; ") +
                           "start the indexing service, then run the same command again");
}

}  // namespace fileindex_tool
