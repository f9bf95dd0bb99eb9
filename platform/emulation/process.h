// Starting, waiting for and stopping host processes on behalf of exec and the services.
#ifndef VEXOEMU_PROCESS_H
#define VEXOEMU_PROCESS_H

#include <sys/types.h>

#include <string>
#include <vector>

namespace VEXO {
namespace EMULATION {

enum class RunOutcome {
    kSucceeded,  // the program ran and exited with status 0
    kFailed,     // it ran and exited with another status, or was killed by a signal
    kNotRun,     // it could not be started (fork failed, or exec failed: no such file, not executable)
};

// Runs the program at path with the argument vector and waits for it.
RunOutcome RunAndWait(const std::string &path, const std::vector<std::string> &argv);

// A process the emulation launched: its id and its start time (clock ticks after boot), which
// tells it apart from a later process that reuses the id. A start time of 0 is unknown.
struct LaunchedProcess {
    pid_t pid = 0;
    unsigned long long startTime = 0;
};

// Launches argv (argv[0] is the program's path) in the background: its own session, standard
// input from /dev/null, not a child of this process. False when it could not be started.
bool LaunchDetached(const std::vector<std::string> &argv, LaunchedProcess &process);

// True while the process exists and has not exited (a zombie has exited).
bool ProcessAlive(const LaunchedProcess &process);

// Waits until path exists (lstat), the process has ended, or seconds have passed.
void WaitForPath(const std::string &path, const LaunchedProcess &process, int seconds);

// Sends SIGTERM and waits up to 5 seconds for the process to exit, then sends SIGKILL and waits up
// to 2 more. True when it is gone (also when it was gone already).
bool TerminateProcess(const LaunchedProcess &process);

}  // namespace EMULATION
}  // namespace VEXO

#endif
