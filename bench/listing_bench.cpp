// The paged listing of 1000 folders with each folder's "status", all in one share whose event queue
// holds 1M records about a tenth of them, next to one std::getline pass over that queue.
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
    Register("P3/List_status", [&](benchmark::State &state) {
        Json::Value additional(Json::arrayValue);
        additional.append("status");
        for (auto _ : state) {
            Json::Value page;
            if (!IndexMgr::List(page, 0, folders.size(), "name", "ASC", additional) ||
                page["folder"].size() != folders.size()) {
                state.SkipWithError("the listing failed");
            }
        }
    });
    return RunBenchmarks();
}
