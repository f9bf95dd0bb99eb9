// Child processes for tests about what several processes do at once: a forked child runs a body,
// tells the parent when it is ready, and is killed and reaped when the handle goes away.
#ifndef FILEINDEX_TESTS_CHILD_H
#define FILEINDEX_TESTS_CHILD_H

#include <sys/types.h>

#include <chrono>
#include <functional>
#include <string>

namespace fileindex_test {

class Child {
public:
    using Ready = std::function<void()>;
    // Forks and runs body(ready) in the child, which then exits with status 0 (or the status body
    // passes to _exit). The constructor returns once the child called ready() or ended.
    explicit Child(const std::function<void(const Ready &ready)> &body);
    ~Child();
    Child(const Child &) = delete;
    Child &operator=(const Child &) = delete;

    // Waits for the child to end; its exit status, or 128 + signal.
    int Wait();
    // The same, but waits at most limit: -1 when the child still runs then.
    int WaitFor(std::chrono::milliseconds limit);
    void Kill(int signal);

private:
    pid_t m_pid;
    bool m_reaped;
};

// A child process that holds a flock on path (exclusive or shared) until the handle goes away.
class LockHolder : public Child {
public:
    LockHolder(const std::string &path, bool exclusive);
};

}  // namespace fileindex_test

#endif
