// Whole-queue scans over a share's event queue of 1M records, each next to one std::getline pass
// over the same file: the event queue's search for a pending reindex, and the progress report's
// search for pending work in a folder. Both look for something the queue does not hold, so they
// read every line. Each also reports how much its scan raises the process's peak memory.
#include "bench/sandbox.h"
#include "daemon/event_queue.h"
#include "fileindex/status.h"

using namespace fileindex_bench;

int main(int argc, char **argv)
{
    Initialize(argc, argv);
    ResetSandbox();
    const std::vector<std::string> shares = DeclareShares(1);
    const std::vector<std::string> folders = MakeFolders(shares, 101);
    std::vector<std::string> busy;  // every folder but the last has events
    for (size_t i = 0; i + 1 < folders.size(); ++i) {
        busy.push_back(FullPathOf(folders[i]));
    }
    const std::string idle = folders.back();
    const std::string queue = QueuePath(shares[0]);
    const size_t lines = Size(1000000, 1000);
    const size_t bytes = WriteQueue(queue, lines, busy);

    const auto scan = [bytes](benchmark::State &state, const std::function<void()> &run) {
        state.counters["peak_growth_KiB"] = static_cast<double>(PeakMemoryGrowthKiB(run));
        for (auto _ : state) {
            run();
        }
        state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * bytes));
    };
    Register("P2/baseline:getline", [&](benchmark::State &state) {
        scan(state, [&] {
            if (GetlinePass(queue) != lines) {
                state.SkipWithError("the queue lost lines");
            }
        });
    });
    Register("P2/HasQueuedReindexEvent", [&](benchmark::State &state) {
        const std::string path = FullPathOf(idle);
        scan(state, [&] {
            if (VEXO::FILEINDEX::HasQueuedReindexEvent(path, queue)) {
                state.SkipWithError("a reindex of the idle folder was found");
            }
        });
    });
    Register("P2/GetFolderStatus", [&](benchmark::State &state) {
        scan(state, [&] {
            if (VEXO::FILEINDEX::StatusMgr::GetFolderStatus(idle) != "finished") {
                state.SkipWithError("the idle folder is not finished");
            }
        });
    });
    return RunBenchmarks();
}
