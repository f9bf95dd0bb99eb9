// fileindex-panel started for the benchmarks, its client, descriptors and resident memory.
#include "bench/panel_process.h"

#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <regex>

#include "appliance_paths.h"
#include "bench/sandbox.h"

namespace fileindex_bench {

PanelProcess::PanelProcess()
{
    int out[2];
    if (pipe2(out, O_CLOEXEC) != 0) {
        Fail("no pipe for the panel's output");
    }
    const std::string tokenFile = FILEINDEX_ROOT_DIR "/panel.token";
    const char *argv[] = {FILEINDEX_PANEL, "--listen", "127.0.0.1:0", "--token-file", tokenFile.c_str(), nullptr};
    posix_spawn_file_actions_t files;
    posix_spawn_file_actions_init(&files);
    posix_spawn_file_actions_adddup2(&files, out[1], STDOUT_FILENO);
    const int spawned = posix_spawn(&m_pid, FILEINDEX_PANEL, &files, nullptr, const_cast<char **>(argv), environ);
    posix_spawn_file_actions_destroy(&files);
    close(out[1]);
    std::string url;
    for (char c; spawned == 0 && read(out[0], &c, 1) == 1 && c != '\n';) {
        url += c;
    }
    close(out[0]);
    std::smatch parts;
    if (!std::regex_match(url, parts, std::regex("http://127\\.0\\.0\\.1:([0-9]+)/\\?token=([0-9a-f]+)"))) {
        Fail("fileindex-panel did not start: '" + url + "'");
    }
    m_port = std::stoi(parts[1]);
    m_token = parts[2];
}

PanelProcess::~PanelProcess()
{
    kill(m_pid, SIGTERM);
    waitpid(m_pid, nullptr, 0);
}

std::unique_ptr<httplib::Client> PanelProcess::Client() const
{
    auto client = std::make_unique<httplib::Client>("127.0.0.1", m_port);
    client->set_default_headers({{"Authorization", "Bearer " + m_token}});
    client->set_read_timeout(60, 0);
    return client;
}

size_t PanelProcess::Descriptors() const
{
    const std::filesystem::path fds = "/proc/" + std::to_string(m_pid) + "/fd";
    return static_cast<size_t>(
        std::distance(std::filesystem::directory_iterator(fds), std::filesystem::directory_iterator()));
}

long PanelProcess::ResidentKiB() const
{
    std::ifstream status("/proc/" + std::to_string(m_pid) + "/status");
    for (std::string line; std::getline(status, line);) {
        if (line.compare(0, 6, "VmRSS:") == 0) {
            return std::stol(line.substr(6));
        }
    }
    return -1;
}

}  // namespace fileindex_bench
