// What the benchmark programs share: a sandbox appliance under the build's root, the generated data
// (shares, folder settings, queue files), a measure of peak memory, and the command line: Google
// Benchmark's own flags plus --tiny, which shrinks every data set and runs each benchmark once, so
// that CI keeps the programs building and running without timing anything.
#ifndef FILEINDEX_BENCH_SANDBOX_H
#define FILEINDEX_BENCH_SANDBOX_H

#include <cstddef>
#include <functional>
#include <string>
#include <vector>

#include <benchmark/benchmark.h>

namespace fileindex_bench {

// Parses the command line (Google Benchmark's flags and --tiny); exits on anything else.
void Initialize(int &argc, char **argv);
// full at full size, tiny with --tiny.
size_t Size(size_t full, size_t tiny);
// Registers a benchmark timed in milliseconds; with --tiny it runs once.
benchmark::internal::Benchmark *Register(const std::string &name, const std::function<void(benchmark::State &)> &run);
// Runs the registered benchmarks and returns the program's exit code.
int RunBenchmarks();

// Prints why and ends the program: the data a benchmark needs could not be made.
[[noreturn]] void Fail(const std::string &why);

// Empties the sandbox root and makes the directories a fresh appliance has.
void ResetSandbox();
// Declares shares share00, share01, ... on volume1 with their directories and writes the share
// database. Returns their names.
std::vector<std::string> DeclareShares(size_t count);
std::string SharePath(const std::string &share);
// The share's event queue file (its metadata directory is made).
std::string QueuePath(const std::string &share);

// count folders, dealt out over the shares in turn: /<share>/projects/folder-NNNN, their directories
// made. Returned in the order made.
std::vector<std::string> MakeFolders(const std::vector<std::string> &shares, size_t count);
// The full path of a share-relative folder path of MakeFolders.
std::string FullPathOf(const std::string &folder);
// Writes folder.conf as the library writes it: every folder with a name and all four media flags.
void WriteFolderConf(const std::vector<std::string> &folders);

// Writes a queue file of lines records about files inside the given full paths of folders, in the
// mix a busy share shows: file events and moves as the notification daemon writes them, the
// library's own folder-setting events with their change report and reindex records of other paths
// as its record writer makes them, a few names written with escapes ("\u00e9", "\/"), a few with
// bytes that are not UTF-8 and a few records with their members in another order. Written as it is
// generated, never held in memory. Returns its size.
size_t WriteQueue(const std::string &path, size_t lines, const std::vector<std::string> &fullFolders);

// How much a process's peak resident memory grows while run runs, in KiB (-1 when the system does
// not tell): measured in a child process that has handed its free heap memory back first.
long PeakMemoryGrowthKiB(const std::function<void()> &run);

// Starts fileindex-standin-daemon, with these arguments besides --output kStandInCommands, as the
// command of the emulated "fileindexd" service, and waits for its socket; StopStandInDaemon ends it.
extern const std::string kStandInCommands;
void StartStandInDaemon(const std::vector<std::string> &arguments);
void StopStandInDaemon();

// The baseline of every queue benchmark: one std::getline pass over the file; returns the lines.
size_t GetlinePass(const std::string &path);

}  // namespace fileindex_bench

#endif
