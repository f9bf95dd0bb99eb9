// Whether fileindexd can be told anything, and the failure of a change it was not told of.
#ifndef FILEINDEX_TOOL_DAEMON_PROBE_H
#define FILEINDEX_TOOL_DAEMON_PROBE_H

#include <string>

#include "failure.h"

namespace fileindex_tool {

// Whether fileindexd takes connections on its socket. problem says why not: no socket (the
// service is not running), nobody listening (it stopped without removing its socket), or its
// backlog is full; empty when reachable.
struct DaemonState {
    bool reachable = false;
    std::string problem;
};
// Connects to the daemon's socket without waiting and closes the connection without sending
// anything (fileindexd takes a connection without a frame as nothing).
DaemonState ProbeDaemon();

// The failure of an operation that talks to fileindexd, read after it returned false: the library
// logs a failed daemon command but records no code for it. When it recorded none and fileindexd
// cannot be reached: kDaemonNotTold, "<what>: fileindexd was not told: <problem>; <state>; start the indexing
// service, then run the same command again", state saying what stands nonetheless ("status.conf is
// saved"; left out when empty). Otherwise the failure lies elsewhere: LibraryFailure(what,
// withoutCode).
Failure DaemonFailure(const std::string &what, const std::string &state, const std::string &withoutCode);

}  // namespace fileindex_tool

#endif
