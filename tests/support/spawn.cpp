// Programs started with posix_spawn, their streams redirected and their environment adjusted.
#include "tests/support/spawn.h"

#include <spawn.h>
#include <unistd.h>

#include <cstring>

#include <gtest/gtest.h>

namespace fileindex_test {

pid_t SpawnProgram(const std::string &program, const std::vector<std::string> &args,
                   const std::vector<Redirect> &redirects, const std::vector<std::string> &variables)
{
    std::vector<char *> argv{const_cast<char *>(program.c_str())};
    for (const std::string &arg : args) {
        argv.push_back(const_cast<char *>(arg.c_str()));
    }
    argv.push_back(nullptr);
    std::vector<char *> envp;
    for (const std::string &variable : variables) {
        envp.push_back(const_cast<char *>(variable.c_str()));
    }
    for (char **entry = environ; *entry != nullptr; ++entry) {
        const std::string name(*entry, strcspn(*entry, "="));
        bool replaced = false;
        for (const std::string &variable : variables) {
            replaced = replaced || variable.compare(0, name.size() + 1, name + "=") == 0;
        }
        if (!replaced) {
            envp.push_back(*entry);
        }
    }
    envp.push_back(nullptr);
    posix_spawn_file_actions_t files;
    posix_spawn_file_actions_init(&files);
    for (const Redirect &redirect : redirects) {
        if (redirect.path.empty()) {
            posix_spawn_file_actions_adddup2(&files, redirect.fd, redirect.stream);
        } else {
            posix_spawn_file_actions_addopen(&files, redirect.stream, redirect.path.c_str(), redirect.flags, 0644);
        }
    }
    pid_t pid = -1;
    const int spawned = posix_spawn(&pid, program.c_str(), &files, nullptr, argv.data(), envp.data());
    posix_spawn_file_actions_destroy(&files);
    EXPECT_EQ(spawned, 0) << program;
    return spawned == 0 ? pid : -1;
}

}  // namespace fileindex_test
