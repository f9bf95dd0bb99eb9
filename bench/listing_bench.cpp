// The paged listing of 1000 folders with each folder's "status", all in one share whose event queue
// holds 1M records about a tenth of them, next to one std::getline pass over that queue.
#include <cstdio>

#include "bench/sandbox.h"
#include "fileindex/index_mgr.h"

using namespace fileindex_bench;
using VEXO::FILEINDEX::IndexMgr;

int main(int argc, char **argv)
{
    Initialize(argc, argv);
    ResetSandbox();
    const std::vector<std::string> shares = DeclareShares(1);
    const std::vector<std::string> folders = MakeFolders(shares, Size(1000, 10));
    WriteFolderConf(folders);
    std::vector<std::string> busy;
    for (size_t i = 0; i < folders.size(); i += 10) {
        busy.push_back(FullPathOf(folders[i]));
    }
    const std::string queue = QueuePath(shares[0]);
    const size_t lines = Size(1000000, 1000);
    WriteQueue(queue, lines, busy);

    Register("P3/baseline:getline", [&](benchmark::State &state) {
        for (auto _ : state) {
            if (GetlinePass(queue) != lines) {
                state.SkipWithError("the queue lost lines");
            }
        }
    });
    Json::Value additional(Json::arrayValue);
    additional.append("status");
    const auto list = [&](benchmark::State &state) {
        Json::Value page;
        if (!IndexMgr::List(page, 0, folders.size(), "name", "ASC", additional) ||
            page["folder"].size() != folders.size()) {
            state.SkipWithError("the listing failed");
        }
    };
    Register("P3/List_status", [&](benchmark::State &state) {
        state.counters["peak_growth_KiB"] = static_cast<double>(PeakMemoryGrowthKiB([&] { list(state); }));
        for (auto _ : state) {
            list(state);
        }
    });
    // The same listing with the queue file moved away: what the status of 1000 folders costs
    // besides reading the queue (the share look-ups, indexability tests and status file reads that
    // each folder's status makes), in time and in memory.
    Register("P3/part:List_status_without_queue", [&](benchmark::State &state) {
        const std::string away = queue + ".away";
        std::rename(queue.c_str(), away.c_str());
        state.counters["peak_growth_KiB"] = static_cast<double>(PeakMemoryGrowthKiB([&] { list(state); }));
        for (auto _ : state) {
            list(state);
        }
        std::rename(away.c_str(), queue.c_str());
    });
    return RunBenchmarks();
}
