// The panel under load: 8 clients poll GET /api/v1/status back to back and 2 clients add and remove
// a folder of their own in turn, for 30 s, against the stand-in daemon working through the queues.
// Reported: requests, failures (any answer but 200 and 503), busy answers (503), the p50 and p99
// latencies of polls and of changes, and how the panel's descriptors and resident memory moved
// between the end of a warm-up and the end of the run.
#include <algorithm>
#include <atomic>
#include <chrono>
#include <filesystem>
#include <mutex>
#include <thread>

#include "bench/panel_process.h"
#include "bench/sandbox.h"

using namespace fileindex_bench;

namespace {

using Clock = std::chrono::steady_clock;

struct Tally {
    std::mutex mutex;
    std::vector<double> polls, changes;  // milliseconds
    long failed = 0, busy = 0;

    void Add(bool change, const httplib::Result &result, Clock::time_point began)
    {
        const double milliseconds = std::chrono::duration<double, std::milli>(Clock::now() - began).count();
        std::lock_guard<std::mutex> hold(mutex);
        (change ? changes : polls).push_back(milliseconds);
        if (!result || (result->status != 200 && result->status != 503)) {
            ++failed;
        } else if (result->status == 503) {
            ++busy;
        }
    }
};

double Percentile(std::vector<double> values, double fraction)
{
    if (values.empty()) {
        return 0;
    }
    std::sort(values.begin(), values.end());
    return values[static_cast<size_t>(fraction * static_cast<double>(values.size() - 1))];
}

// Runs 8 pollers and 2 changers until the deadline.
void Load(const PanelProcess &panel, const std::vector<std::string> &own, Clock::duration length, Tally &tally)
{
    const Clock::time_point deadline = Clock::now() + length;
    std::vector<std::thread> clients;
    for (int i = 0; i < 8; ++i) {
        clients.emplace_back([&] {
            const std::unique_ptr<httplib::Client> client = panel.Client();
            while (Clock::now() < deadline) {
                const Clock::time_point began = Clock::now();
                tally.Add(false, client->Get("/api/v1/status"), began);
            }
        });
    }
    for (const std::string &path : own) {
        clients.emplace_back([&, path] {
            const std::unique_ptr<httplib::Client> client = panel.Client();
            const std::string add = "[{\"path\": \"" + path + "\", \"name\": \"load\", \"photo\": true}]";
            const std::string remove = "[\"" + path + "\"]";
            for (bool adding = true; Clock::now() < deadline; adding = !adding) {
                const Clock::time_point began = Clock::now();
                tally.Add(true, adding ? client->Post("/api/v1/folders", add, "application/json")
                                       : client->Post("/api/v1/folders/remove", remove, "application/json"),
                          began);
            }
        });
    }
    for (std::thread &client : clients) {
        client.join();
    }
}

}  // namespace

int main(int argc, char **argv)
{
    Initialize(argc, argv);
    ResetSandbox();
    const std::vector<std::string> shares = DeclareShares(2);
    const std::vector<std::string> folders = MakeFolders(shares, Size(100, 4));
    WriteFolderConf(folders);
    std::vector<std::string> own;
    for (const std::string &share : shares) {
        own.push_back("/" + share + "/load");
        std::filesystem::create_directories(SharePath(share) + "/load");
    }
    StartStandInDaemon({"--process-queues", "--record-time", "1"});
    const PanelProcess panel;

    Register("P7/load", [&](benchmark::State &state) {
        for (auto _ : state) {
            Tally warmUp, tally;
            Load(panel, own, std::chrono::milliseconds(Size(3000, 200)), warmUp);
            const size_t descriptors = panel.Descriptors();
            const long resident = panel.ResidentKiB();
            Load(panel, own, std::chrono::milliseconds(Size(30000, 500)), tally);
            // The clients have hung up; give the panel a moment to close their connections.
            std::this_thread::sleep_for(std::chrono::milliseconds(500));
            state.counters["requests"] = static_cast<double>(tally.polls.size() + tally.changes.size());
            state.counters["failed"] = static_cast<double>(tally.failed);
            state.counters["busy_503"] = static_cast<double>(tally.busy);
            state.counters["poll_p50_ms"] = Percentile(tally.polls, 0.5);
            state.counters["poll_p99_ms"] = Percentile(tally.polls, 0.99);
            state.counters["change_p50_ms"] = Percentile(tally.changes, 0.5);
            state.counters["change_p99_ms"] = Percentile(tally.changes, 0.99);
            state.counters["descriptors_before"] = static_cast<double>(descriptors);
            state.counters["descriptors_after"] = static_cast<double>(panel.Descriptors());
            state.counters["resident_KiB_before"] = static_cast<double>(resident);
            state.counters["resident_KiB_after"] = static_cast<double>(panel.ResidentKiB());
            if (tally.failed != 0) {
                state.SkipWithError("a request failed with something other than 503");
            }
        }
    })->UseRealTime()->Iterations(1)->Repetitions(1);
    const int status = RunBenchmarks();
    StopStandInDaemon();
    return status;
}
