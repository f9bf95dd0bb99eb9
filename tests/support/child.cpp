// Forked child processes for tests: ready signal, kill and reap.
#include "tests/support/child.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/file.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>

namespace fileindex_test {

Child::Child(const std::function<void(const Ready &ready)> &body) : m_pid(-1), m_reaped(false)
{
    int fds[2];
    if (pipe2(fds, O_CLOEXEC) != 0) {
        return;
    }
    m_pid = fork();
    if (m_pid == 0) {
        close(fds[0]);
        const int readyFd = fds[1];
        body([readyFd] {
            const char byte = 'r';
            (void)write(readyFd, &byte, 1);
        });
        _exit(0);
    }
    close(fds[1]);
    char byte;
    // Returns on the ready byte, or with 0 when the child ended without being ready.
    while (read(fds[0], &byte, 1) < 0 && errno == EINTR) {
    }
    close(fds[0]);
}

Child::~Child()
{
    if (m_pid > 0 && !m_reaped) {
        Kill(SIGKILL);
        Wait();
    }
}

int Child::Wait()
{
    int status = 0;
    while (waitpid(m_pid, &status, 0) < 0 && errno == EINTR) {
    }
    m_reaped = true;
    return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

int Child::WaitFor(std::chrono::milliseconds limit)
{
    const auto deadline = std::chrono::steady_clock::now() + limit;
    for (;;) {
        siginfo_t info = {};
        const int looked = waitid(P_PID, static_cast<id_t>(m_pid), &info, WEXITED | WNOHANG | WNOWAIT);
        if (looked == 0 && info.si_pid == m_pid) {
            return Wait();  // it has ended, and is reaped now
        }
        if ((looked != 0 && errno != EINTR) || std::chrono::steady_clock::now() >= deadline) {
            return -1;
        }
        usleep(5000);
    }
}

void Child::Kill(int signal)
{
    kill(m_pid, signal);
}

LockHolder::LockHolder(const std::string &path, bool exclusive)
    : Child([path, exclusive](const Ready &ready) {
          const int fd = open(path.c_str(), O_RDWR | O_CREAT, 0644);
          if (fd < 0 || flock(fd, exclusive ? LOCK_EX : LOCK_SH) != 0) {
              _exit(1);
          }
          ready();
          for (;;) {
              pause();
          }
      })
{
}

}  // namespace fileindex_test
