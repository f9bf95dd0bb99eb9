// IndexMgr::Upsert of 1000 new folders over 20 shares, with the stand-in daemon listening on the
// daemon socket: the save, the monitor registrations, the service start, one command frame and one
// queued event per folder. Before each call the folder list, the queues and the records of the
// previous call are removed, so that every call adds the same 1000 folders to an empty list.
#include <filesystem>

#include <json/value.h>

#include "appliance_paths.h"
#include "bench/sandbox.h"
#include "fileindex/index_mgr.h"

using namespace fileindex_bench;
using VEXO::FILEINDEX::IndexMgr;

int main(int argc, char **argv)
{
    Initialize(argc, argv);
    ResetSandbox();
    const std::vector<std::string> shares = DeclareShares(Size(20, 2));
    const std::vector<std::string> folders = MakeFolders(shares, Size(1000, 10));
    Json::Value request(Json::arrayValue);
    for (const std::string &folder : folders) {
        Json::Value setting;
        setting["path"] = folder;
        setting["name"] = folder.substr(folder.rfind('/') + 1);
        setting["photo"] = true;
        request.append(setting);
    }
    StartStandInDaemon({});

    Register("P4/Upsert", [&](benchmark::State &state) {
        for (auto _ : state) {
            state.PauseTiming();
            std::filesystem::remove(FILEINDEX_FOLDER_CONF_PATH);
            std::filesystem::remove(FILEINDEX_EMULATION_STATE_DIR "/journal.jsonl");
            std::filesystem::remove(kStandInCommands);
            for (const std::string &share : shares) {
                std::filesystem::remove(QueuePath(share));
            }
            state.ResumeTiming();
            if (!IndexMgr::Upsert(request)) {
                state.SkipWithError("the upsert failed");
            }
        }
    })->UseRealTime();
    const int status = RunBenchmarks();
    StopStandInDaemon();
    return status;
}
