// The paged listing of 1000 folders with each folder's "status", all in one share whose event queue
// holds 1M records about a tenth of them, next to one std::getline pass over that queue. On the same
// data, the web panel's GET /api/v1/folders of that page with state and validity, next to
// IndexMgr::List of the same page in this process: what the panel adds (HTTP, its checks, the
// records) to the library's listing. Both in wall-clock time, since the panel works in another
// process.
#include <cstdio>

#include "bench/panel_process.h"
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

    const PanelProcess panel;
    const std::unique_ptr<httplib::Client> client = panel.Client();
    Json::Value withValidity = additional;
    withValidity.append("is_valid");
    Register("P6/baseline:List_status_is_valid", [&](benchmark::State &state) {
        for (auto _ : state) {
            Json::Value page;
            if (!IndexMgr::List(page, 0, folders.size(), "path", "", withValidity) ||
                page["folder"].size() != folders.size()) {
                state.SkipWithError("the listing failed");
            }
        }
    })->UseRealTime();
    const std::string target = "/api/v1/folders?offset=0&limit=" + std::to_string(folders.size());
    Register("P6/GET_folders", [&](benchmark::State &state) {
        for (auto _ : state) {
            const httplib::Result result = client->Get(target.c_str());
            if (!result || result->status != 200) {
                state.SkipWithError("the panel did not answer 200");
            }
        }
    })->UseRealTime();
    return RunBenchmarks();
}
