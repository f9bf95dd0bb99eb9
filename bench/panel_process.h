// fileindex-panel as the panel benchmarks run it: a process on a free loopback port of the sandbox
// appliance, asked over HTTP with its token.
#ifndef FILEINDEX_BENCH_PANEL_PROCESS_H
#define FILEINDEX_BENCH_PANEL_PROCESS_H

#include <sys/types.h>

#include <string>

#include <httplib.h>

namespace fileindex_bench {

class PanelProcess {
public:
    // Starts the panel and reads the URL it prints; Fail()s when it does not start.
    PanelProcess();
    // SIGTERM, and waits for it to end.
    ~PanelProcess();
    PanelProcess(const PanelProcess &) = delete;
    PanelProcess &operator=(const PanelProcess &) = delete;

    // A client for the panel, the token already in its headers.
    std::unique_ptr<httplib::Client> Client() const;

    // The process's open descriptors and resident memory, from /proc.
    size_t Descriptors() const;
    long ResidentKiB() const;

private:
    pid_t m_pid = -1;
    int m_port = 0;
    std::string m_token;
};

}  // namespace fileindex_bench

#endif
