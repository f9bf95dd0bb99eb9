// The benchmarks' sandbox appliance, generated data, peak-memory measure and command line.
#include "bench/sandbox.h"

#include <malloc.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iostream>

#include <benchmark/benchmark.h>
#include <json/value.h>

#include "appliance_paths.h"
#include "config/file_io.h"
#include "config/json_io.h"
#include "daemon/queue_record.h"
#include "platform/service.h"
#include "share/storage_paths.h"

namespace fileindex_bench {

namespace stdfs = std::filesystem;

namespace {

const std::string kRoot = FILEINDEX_ROOT_DIR;
bool g_tiny = false;

// A fixed sequence, so that every run measures the same data.
class Sequence {
public:
    unsigned Next(unsigned bound)
    {
        m_state = m_state * 6364136223846793005ULL + 1442695040888963407ULL;
        return static_cast<unsigned>((m_state >> 33) % bound);
    }

private:
    unsigned long long m_state = 42;
};

long PeakResidentKiB()
{
    std::ifstream status("/proc/self/status");
    for (std::string line; std::getline(status, line);) {
        if (line.compare(0, 6, "VmHWM:") == 0) {
            return std::atol(line.c_str() + 6);
        }
    }
    return -1;
}

// Lowers the recorded peak to what the process holds now.
bool ResetPeakResident()
{
    std::ofstream clear("/proc/self/clear_refs");
    clear << "5";
    clear.flush();
    return clear.good();
}

}  // namespace

void Initialize(int &argc, char **argv)
{
    benchmark::Initialize(&argc, argv);
    for (int i = 1; i < argc; ++i) {
        if (std::strcmp(argv[i], "--tiny") == 0) {
            g_tiny = true;
        } else {
            Fail(std::string("unknown argument: ") + argv[i]);
        }
    }
    if (kRoot.empty()) {
        Fail("the benchmarks need a build with a sandbox FILEINDEX_ROOT");
    }
}

size_t Size(size_t full, size_t tiny)
{
    return g_tiny ? tiny : full;
}

benchmark::internal::Benchmark *Register(const std::string &name, const std::function<void(benchmark::State &)> &run)
{
    benchmark::internal::Benchmark *registered = benchmark::RegisterBenchmark(name.c_str(), run);
    registered->Unit(benchmark::kMillisecond);
    if (g_tiny) {
        registered->Iterations(1);
    }
    return registered;
}

int RunBenchmarks()
{
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}

void Fail(const std::string &why)
{
    std::cerr << "benchmark set-up failed: " << why << "\n";
    std::exit(1);
}

void ResetSandbox()
{
    umask(022);
    stdfs::create_directories(kRoot);
    for (const stdfs::directory_entry &entry : stdfs::directory_iterator(kRoot)) {
        stdfs::remove_all(entry.path());
    }
    for (const char *file : {FILEINDEX_APPLIANCE_FILES}) {
        stdfs::create_directories(stdfs::path(file).parent_path());
    }
    stdfs::create_directories(FILEINDEX_EMULATION_STATE_DIR);
}

std::vector<std::string> DeclareShares(size_t count)
{
    std::vector<std::string> names;
    Json::Value database(Json::arrayValue);
    for (size_t i = 0; i < count; ++i) {
        char name[32];
        std::snprintf(name, sizeof(name), "share%02u", static_cast<unsigned>(i));
        names.push_back(name);
        stdfs::create_directories(SharePath(name));
        Json::Value share;
        share["name"] = name;
        share["path"] = SharePath(name);
        database.append(share);
    }
    if (!VEXO::FILEINDEX::ReplaceFileAtomically(FILEINDEX_EMULATION_STATE_DIR "/shares.json",
                                                VEXO::FILEINDEX::toString(database))) {
        Fail("cannot write the share database");
    }
    return names;
}

std::string SharePath(const std::string &share)
{
    return kRoot + "/volume1/" + share;
}

std::string QueuePath(const std::string &share)
{
    stdfs::create_directories(VEXO::FILEINDEX::MetadataDirPath(SharePath(share)));
    return VEXO::FILEINDEX::StoragePath(SharePath(share), VEXO::FILEINDEX::kQueueFileName);
}

std::vector<std::string> MakeFolders(const std::vector<std::string> &shares, size_t count)
{
    std::vector<std::string> folders;
    for (size_t i = 0; i < count; ++i) {
        char number[32];
        std::snprintf(number, sizeof(number), "%04u", static_cast<unsigned>(i));
        const std::string folder = "/" + shares[i % shares.size()] + "/projects/folder-" + number;
        folders.push_back(folder);
        stdfs::create_directories(FullPathOf(folder));
    }
    return folders;
}

std::string FullPathOf(const std::string &folder)
{
    return kRoot + "/volume1" + folder;
}

void WriteFolderConf(const std::vector<std::string> &folders)
{
    Json::Value document(Json::objectValue);
    for (size_t i = 0; i < folders.size(); ++i) {
        Json::Value &record = document[folders[i]];
        record["path"] = folders[i];
        record["name"] = "Projects folder " + std::to_string(i);
        record["document"] = i % 2 == 0;
        record["audio"] = i % 3 == 0;
        record["video"] = i % 5 == 0;
        record["photo"] = true;
    }
    if (!VEXO::FILEINDEX::ReplaceFileAtomically(FILEINDEX_FOLDER_CONF_PATH, VEXO::FILEINDEX::toString(document))) {
        Fail("cannot write folder.conf");
    }
}

size_t WriteQueue(const std::string &path, size_t lines, const std::vector<std::string> &fullFolders)
{
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    Sequence random;
    // The library's own records, made by its record writer as AddCustomEvent makes them.
    const auto libraryRecord = [](unsigned event, const std::string &recordPath, const Json::Value &data) {
        std::string line;
        if (!VEXO::FILEINDEX::MakeQueueRecordLine(event, recordPath, data, line)) {
            Fail("cannot make a queue record of " + recordPath);
        }
        line.pop_back();
        return line;
    };
    Json::Value changeReport(Json::objectValue);
    for (const char *medium : {"document", "audio", "video", "photo"}) {
        changeReport[medium] = std::string(medium) == "document";
    }
    size_t size = 0;
    for (size_t i = 0; i < lines; ++i) {
        const std::string &folder = fullFolders[random.Next(static_cast<unsigned>(fullFolders.size()))];
        char file[32];
        std::snprintf(file, sizeof(file), "/IMG_%06u.jpg", random.Next(1000000));
        const unsigned kind = random.Next(100);
        std::string line;
        if (kind < 80) {
            line = "{\"event\":" + std::to_string(1u << random.Next(4)) + ",\"path\":\"" + folder + file + "\"}";
        } else if (kind < 86) {
            line = "{\"event\":256,\"path\":\"" + folder + file + "\",\"path_old\":\"" + folder + "/old" + file + "\"}";
        } else if (kind < 95) {
            line = libraryRecord(VEXO::FILEINDEX::kEventFolderSettingChanged, folder, changeReport);
        } else if (kind < 97) {
            line = libraryRecord(VEXO::FILEINDEX::kEventReindex, folder + "/sub", Json::Value());
        } else if (kind < 98) {
            line = "{\"event\":2,\"path\":\"" + folder + "\\/caf\\u00e9" + file + "\"}";
        } else if (kind < 99) {
            line = "{\"event\":2,\"path\":\"" + folder + "/caf\xe9" + file + "\"}";
        } else {
            line = "{\"event\":4,\"path\":\"" + folder + file + "\",\"data\":null}";
        }
        line += '\n';
        out << line;
        size += line.size();
    }
    out.close();
    if (!out) {
        Fail("cannot write the queue " + path);
    }
    return size;
}

long PeakMemoryGrowthKiB(const std::function<void()> &run)
{
    // In a child, which first hands the free memory of its heap back, so that what run allocates
    // shows even where the process had such memory from earlier work.
    int channel[2];
    if (pipe(channel) != 0) {
        return -1;
    }
    const pid_t child = fork();
    if (child == 0) {
        malloc_trim(0);
        long growth = -1;
        if (ResetPeakResident()) {
            const long before = PeakResidentKiB();
            run();
            const long after = PeakResidentKiB();
            growth = before < 0 || after < 0 ? -1 : after - before;
        }
        _exit(write(channel[1], &growth, sizeof(growth)) == sizeof(growth) ? 0 : 1);
    }
    close(channel[1]);
    long growth = -1;
    if (child < 0 || read(channel[0], &growth, sizeof(growth)) != sizeof(growth)) {
        growth = -1;
    }
    close(channel[0]);
    if (child > 0) {
        waitpid(child, nullptr, 0);
    }
    return growth;
}

size_t GetlinePass(const std::string &path)
{
    std::ifstream in(path, std::ios::binary);
    size_t lines = 0;
    for (std::string line; std::getline(in, line);) {
        ++lines;
    }
    return lines;
}

const std::string kStandInCommands = FILEINDEX_ROOT_DIR "/commands.jsonl";

void StartStandInDaemon(const std::vector<std::string> &arguments)
{
    Json::Value commands;
    for (const std::string &word : {std::string(FILEINDEX_STANDIN_DAEMON), std::string("--output"), kStandInCommands}) {
        commands["fileindexd"].append(word);
    }
    for (const std::string &word : arguments) {
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

void StopStandInDaemon()
{
    VLIBServiceStop("fileindexd", 1);
}

}  // namespace fileindex_bench
