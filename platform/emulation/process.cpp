// Host processes started, waited for and stopped for exec and the emulated services.
#include "process.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <time.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <sstream>

namespace VEXO {
namespace EMULATION {
namespace {

// What the helper processes of a launch report through the pipe, one whole message per write.
struct LaunchMessage {
    int kind;   // kLaunchedPid, kExecFailed or kForkFailed
    int value;  // the pid or the errno
};
constexpr int kLaunchedPid = 1;
constexpr int kExecFailed = 2;
constexpr int kForkFailed = 3;

// argv as execv wants it; the strings must outlive the call.
std::vector<char *> ExecArgv(const std::vector<std::string> &argv)
{
    std::vector<char *> pointers;
    pointers.reserve(argv.size() + 1);
    for (const std::string &arg : argv) {
        pointers.push_back(const_cast<char *>(arg.c_str()));
    }
    pointers.push_back(nullptr);
    return pointers;
}

// In a freshly forked child: the program starts with default signal handling and nothing blocked,
// whatever the host process set up. Only async-signal-safe calls from here on.
void ResetSignalsInChild()
{
    struct sigaction defaults = {};
    defaults.sa_handler = SIG_DFL;
    sigemptyset(&defaults.sa_mask);
    for (int sig = 1; sig < NSIG; ++sig) {
        sigaction(sig, &defaults, nullptr);  // fails harmlessly for SIGKILL, SIGSTOP and reserved ones
    }
    sigset_t none;
    sigemptyset(&none);
    sigprocmask(SIG_SETMASK, &none, nullptr);
}

void SendInChild(int fd, int kind, int value)
{
    const LaunchMessage message = {kind, value};
    ssize_t written;
    do {
        written = write(fd, &message, sizeof(message));
    } while (written < 0 && errno == EINTR);
}

pid_t WaitForChild(pid_t pid, int &status)
{
    pid_t waited;
    do {
        waited = waitpid(pid, &status, 0);
    } while (waited < 0 && errno == EINTR);
    return waited;
}

ssize_t ReadRetrying(int fd, void *buffer, size_t size)
{
    ssize_t got;
    do {
        got = read(fd, buffer, size);
    } while (got < 0 && errno == EINTR);
    return got;
}

// State letter and start time of a process from /proc/<pid>/stat; false when there is none.
bool ReadProcessStat(pid_t pid, char &state, unsigned long long &startTime)
{
    const int fd = open(("/proc/" + std::to_string(pid) + "/stat").c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0) {
        return false;
    }
    char buffer[1024];
    const ssize_t got = ReadRetrying(fd, buffer, sizeof(buffer) - 1);
    close(fd);
    if (got <= 0) {
        return false;
    }
    const std::string line(buffer, static_cast<size_t>(got));
    // "pid (comm) state ppid ... starttime ...": comm may hold spaces and parentheses.
    const size_t commEnd = line.rfind(')');
    if (commEnd == std::string::npos) {
        return false;
    }
    std::istringstream fields(line.substr(commEnd + 1));
    std::string field;
    fields >> state;
    for (int index = 4; index < 22 && (fields >> field); ++index) {
    }
    return static_cast<bool>(fields >> startTime);
}

void SleepMilliseconds(long milliseconds)
{
    timespec pause = {milliseconds / 1000, (milliseconds % 1000) * 1000000L};
    while (nanosleep(&pause, &pause) != 0 && errno == EINTR) {
    }
}

bool WaitUntilGone(const LaunchedProcess &process, long milliseconds)
{
    for (long waited = 0; waited < milliseconds; waited += 10) {
        if (!ProcessAlive(process)) {
            return true;
        }
        SleepMilliseconds(10);
    }
    return !ProcessAlive(process);
}

}  // namespace

RunOutcome RunAndWait(const std::string &path, const std::vector<std::string> &argv)
{
    std::vector<char *> args = ExecArgv(argv);
    // The child reports a failed exec through this pipe; a successful exec closes it unwritten.
    int report[2];
    if (pipe2(report, O_CLOEXEC) != 0) {
        return RunOutcome::kNotRun;
    }
    const pid_t child = fork();
    if (child == 0) {
        close(report[0]);
        ResetSignalsInChild();
        execv(path.c_str(), args.data());
        SendInChild(report[1], kExecFailed, errno);
        _exit(127);
    }
    close(report[1]);
    if (child < 0) {
        close(report[0]);
        return RunOutcome::kNotRun;
    }
    LaunchMessage message = {0, 0};
    const bool execFailed = ReadRetrying(report[0], &message, sizeof(message)) == sizeof(message);
    close(report[0]);
    int status = 0;
    if (WaitForChild(child, status) != child || execFailed) {
        return RunOutcome::kNotRun;
    }
    return WIFEXITED(status) && WEXITSTATUS(status) == 0 ? RunOutcome::kSucceeded : RunOutcome::kFailed;
}

bool LaunchDetached(const std::vector<std::string> &argv, LaunchedProcess &process)
{
    if (argv.empty()) {
        return false;
    }
    std::vector<char *> args = ExecArgv(argv);
    const int devNull = open("/dev/null", O_RDONLY | O_CLOEXEC);
    if (devNull < 0) {
        return false;
    }
    // report: the helpers tell the program's pid and failures. go: the program waits for its end
    // before it execs, so that its start time is read while it surely exists.
    int report[2];
    int go[2];
    if (pipe2(report, O_CLOEXEC) != 0) {
        close(devNull);
        return false;
    }
    if (pipe2(go, O_CLOEXEC) != 0) {
        close(report[0]);
        close(report[1]);
        close(devNull);
        return false;
    }
    // Two forks: the middle process exits at once, so the program is nobody's child here and never
    // lingers as a zombie of the caller.
    const pid_t middle = fork();
    if (middle == 0) {
        close(report[0]);
        const pid_t program = fork();
        if (program == 0) {
            close(go[1]);
            char ignored;
            while (read(go[0], &ignored, 1) < 0 && errno == EINTR) {
            }
            setsid();
            if (devNull == STDIN_FILENO) {
                fcntl(devNull, F_SETFD, 0);  // dup2 onto itself would keep close-on-exec
            } else {
                dup2(devNull, STDIN_FILENO);
            }
            ResetSignalsInChild();
            execv(args[0], args.data());
            SendInChild(report[1], kExecFailed, errno);
            _exit(127);
        }
        SendInChild(report[1], program > 0 ? kLaunchedPid : kForkFailed, program > 0 ? program : errno);
        _exit(0);
    }
    close(report[1]);
    close(go[0]);
    close(devNull);
    LaunchMessage message = {0, 0};
    const bool reported = middle > 0 && ReadRetrying(report[0], &message, sizeof(message)) == sizeof(message);
    if (reported && message.kind == kLaunchedPid) {
        char state = 0;
        process.pid = message.value;
        if (!ReadProcessStat(process.pid, state, process.startTime)) {
            process.startTime = 0;
        }
    }
    close(go[1]);  // lets the program exec
    bool failed = !reported || message.kind != kLaunchedPid;
    // The pipe ends when the program has exec'd (closing its copy) or given up.
    while (ReadRetrying(report[0], &message, sizeof(message)) == sizeof(message)) {
        failed = true;
    }
    close(report[0]);
    if (middle > 0) {
        int status = 0;
        WaitForChild(middle, status);
    }
    return !failed;
}

bool ProcessAlive(const LaunchedProcess &process)
{
    char state = 0;
    unsigned long long startTime = 0;
    if (process.pid <= 0 || !ReadProcessStat(process.pid, state, startTime)) {
        return false;
    }
    if (state == 'Z' || state == 'X') {
        return false;
    }
    return process.startTime == 0 || process.startTime == startTime;
}

void WaitForPath(const std::string &path, const LaunchedProcess &process, int seconds)
{
    struct stat status;
    for (int waited = 0; waited < seconds * 100 && lstat(path.c_str(), &status) != 0 && ProcessAlive(process);
         ++waited) {
        SleepMilliseconds(10);
    }
}

bool TerminateProcess(const LaunchedProcess &process)
{
    if (!ProcessAlive(process)) {
        return true;
    }
    if (kill(process.pid, SIGTERM) != 0) {
        return errno == ESRCH;
    }
    if (WaitUntilGone(process, 5000)) {
        return true;
    }
    if (kill(process.pid, SIGKILL) != 0) {
        return errno == ESRCH;
    }
    return WaitUntilGone(process, 2000);
}

}  // namespace EMULATION
}  // namespace VEXO
