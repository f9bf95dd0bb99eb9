// IndexMgr::Upsert of 1000 new folders over 20 shares, with the stand-in daemon listening on the
// daemon socket: the save, the monitor registrations, the service start, one command frame and one
// queued event per folder. Before each call the folder list, the queues and the records of the
// previous call are removed, so that every call adds the same 1000 folders to an empty list.
#include <unistd.h>

#include <filesystem>

#include <json/value.h>

#include "appliance_paths.h"
#include "bench/sandbox.h"
#include "config/file_io.h"
#include "config/json_io.h"
#include "fileindex/index_mgr.h"
#include "platform/service.h"

using namespace fileindex_bench;
using VEXO::FILEINDEX::IndexMgr;

namespace {

const std::string kCommands = FILEINDEX_ROOT_DIR "/commands.jsonl";

void StartStandInDaemon()
{
    Json::Value commands;
    for (const char *word : {FILEINDEX_STANDIN_DAEMON, "--output", kCommands.c_str()}) {
        commands["fileindexd"].append(word);
    }
    if (!VEXO::FILEINDEX::ReplaceFileAtomically(FILEINDEX_EMULATION_STATE_DIR "/service_commands.json",
                                                VEXO::FILEINDEX::toString(commands)) ||
        VLIBServiceStart("fileindexd", 1) < 0) {
        Fail("cannot start the stand-in daemon");
    }
    for (int i = 0; i < 500 && access(FILEINDEX_DAEMON_SOCKET_PATH, F_OK) != 0; ++i) {
        usleep(10000);
    }
}

}  // namespace

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
    StartStandInDaemon();

    Register("P4/Upsert", [&](benchmark::State &state) {
        for (auto _ : state) {
            state.PauseTiming();
            std::filesystem::remove(FILEINDEX_FOLDER_CONF_PATH);
            std::filesystem::remove(FILEINDEX_EMULATION_STATE_DIR "/journal.jsonl");
            std::filesystem::remove(kCommands);
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
    VLIBServiceStop("fileindexd", 1);
    return status;
}
