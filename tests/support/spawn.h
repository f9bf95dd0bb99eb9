// Programs a test runs as their users do: a process of its own, with its standard streams going
// where the test reads them and the test's environment, a variable or two changed.
#ifndef FILEINDEX_TESTS_SPAWN_H
#define FILEINDEX_TESTS_SPAWN_H

#include <sys/types.h>

#include <string>
#include <vector>

namespace fileindex_test {

// Where one standard stream of the program goes: a file opened with flags (mode 0644 when created),
// or a descriptor of the test.
struct Redirect {
    int stream;  // STDIN_FILENO, STDOUT_FILENO or STDERR_FILENO
    std::string path;
    int flags = 0;
    int fd = -1;  // used when path is empty

    static Redirect File(int stream, const std::string &path, int flags) { return {stream, path, flags, -1}; }
    static Redirect Descriptor(int stream, int fd) { return {stream, std::string(), 0, fd}; }
};

// Starts program with args (argv[0] is program itself), the streams redirected, and the test's
// environment with each "NAME=value" of variables in place of that name's entry. Returns the pid;
// -1, with a failed expectation, when it could not be started. The caller waits for it.
pid_t SpawnProgram(const std::string &program, const std::vector<std::string> &args,
                   const std::vector<Redirect> &redirects, const std::vector<std::string> &variables = {});

}  // namespace fileindex_test

#endif
