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
