// The indexed-path queries against a folder list of 1000 folders over 20 shares, each next to one
// plain JsonCpp parse of the same folder.conf.
#include <fstream>

#include <json/reader.h>

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
    WriteFolderConf(folders);
    // Paths that no folder covers, so that every query walks the whole list.
    const std::string path = "/" + shares.back() + "/elsewhere/a";
    const std::string fullPath = FullPathOf(path);

    Register("P1/baseline:jsoncpp_parse", [](benchmark::State &state) {
        for (auto _ : state) {
            std::ifstream in(FILEINDEX_FOLDER_CONF_PATH, std::ios::binary);
            Json::Value document;
            std::string errors;
            if (!Json::parseFromStream(Json::CharReaderBuilder(), in, &document, &errors)) {
                state.SkipWithError("folder.conf does not parse");
            }
            benchmark::DoNotOptimize(document);
        }
    });
    Register("P1/IsPathIndexed", [&](benchmark::State &state) {
        for (auto _ : state) {
            benchmark::DoNotOptimize(IndexMgr::IsPathIndexed(path));
        }
    });
    Register("P1/IsPathContainIndexed", [&](benchmark::State &state) {
        for (auto _ : state) {
            benchmark::DoNotOptimize(IndexMgr::IsPathContainIndexed(path));
        }
    });
    Register("P1/IsFullPathIndexed", [&](benchmark::State &state) {
        for (auto _ : state) {
            benchmark::DoNotOptimize(IndexMgr::IsFullPathIndexed(fullPath));
        }
    });
    return RunBenchmarks();
}
