// fileindexctl status|pause|resume: indexing progress and the pause state.
#include <signal.h>
#include <unistd.h>

#include <algorithm>
#include <ctime>
#include <iostream>
#include <memory>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

#include "commands.h"
#include "fileindex/index_mgr.h"
#include "fileindex/status.h"
#include "output.h"

namespace fileindexctl {

using VEXO::FILEINDEX::Folder;
using VEXO::FILEINDEX::IndexMgr;
using VEXO::FILEINDEX::StatusMgr;

namespace {

volatile sig_atomic_t g_interrupted = 0;

void OnInterrupt(int)
{
    g_interrupted = 1;
}

// "until resumed", or "until <local time>" for a timed pause.
std::string PauseText(long long resumeTime)
{
    if (resumeTime == 0) {
        return "until resumed";
    }
    const time_t when = static_cast<time_t>(resumeTime);
    char text[64];
    struct tm local;
    strftime(text, sizeof(text), "%Y-%m-%d %H:%M:%S %Z", localtime_r(&when, &local));
    return std::string("until ") + text;
}

struct StatusOptions {
    std::vector<std::string> paths;  // the folders to show; every indexed folder when empty
    bool watch = false;
    double interval = 1.0;
};

// The overall word, the pause state and each folder's word, as the library reports them now.
struct Snapshot {
    std::string status;
    long long resumeTime = -1;
    std::vector<std::pair<std::string, std::string>> folders;
};

bool TakeSnapshot(const std::vector<std::string> &paths, Snapshot &snapshot)
{
    ClearLastError();
    std::vector<std::string> folders = paths;
    if (folders.empty()) {
        std::vector<Folder> list;
        if (!IndexMgr::List(list)) {
            return false;
        }
        for (const Folder &folder : list) {
            folders.push_back(folder.m_path);
        }
    }
    if (!StatusMgr::GetStatus(snapshot.status) || !StatusMgr::GetPauseInfo(snapshot.resumeTime)) {
        return false;
    }
    for (const std::string &path : folders) {
        snapshot.folders.emplace_back(path, StatusMgr::GetFolderStatus(path));
    }
    return true;
}

Json::Value SnapshotJson(const Snapshot &snapshot)
{
    Json::Value document;
    document["status"] = snapshot.status;
    document["resume_time"] = static_cast<Json::Int64>(snapshot.resumeTime);
    document["folder"] = Json::Value(Json::objectValue);
    for (const auto &folder : snapshot.folders) {
        document["folder"][folder.first] = folder.second;
    }
    return document;
}

std::string SnapshotText(const Snapshot &snapshot)
{
    std::ostringstream text;
    text << "indexing: " << snapshot.status;
    if (snapshot.resumeTime != -1) {
        const std::string until = PauseText(snapshot.resumeTime);
        text << (snapshot.status == "paused" ? " " + until : " (paused " + until + ")");
    }
    text << "\n";
    if (!snapshot.folders.empty()) {
        Table table({"FOLDER", "STATUS"});
        for (const auto &folder : snapshot.folders) {
            table.Add({folder.first, folder.second});
        }
        table.Print(text);
    }
    return text.str();
}

// Redraws until the overall status is "finished" or the user interrupts. On a terminal the
// previous drawing is replaced; otherwise each change is printed below the last. With --json
// nothing is drawn: the one document is printed once indexing has finished.
int Watch(const Context &context, const StatusOptions &options)
{
    struct sigaction action = {};
    action.sa_handler = OnInterrupt;
    sigaction(SIGINT, &action, nullptr);
    sigaction(SIGTERM, &action, nullptr);
    const bool terminal = isatty(STDOUT_FILENO) == 1;
    std::string drawn;
    for (;;) {
        Snapshot snapshot;
        if (!TakeSnapshot(options.paths, snapshot)) {
            return Fail("status");
        }
        const std::string text = SnapshotText(snapshot);
        if (!context.json && text != drawn) {
            if (terminal && !drawn.empty()) {
                std::cout << "\033[" << std::count(drawn.begin(), drawn.end(), '\n') << "A\033[J";
            } else if (!drawn.empty()) {
                std::cout << "\n";
            }
            std::cout << text << std::flush;
            drawn = text;
        }
        if (snapshot.status == "finished") {
            if (context.json) {
                PrintJson(SnapshotJson(snapshot));
            }
            return kSuccess;
        }
        for (double waited = 0; waited < options.interval; waited += 0.05) {
            if (g_interrupted) {
                return kInterrupted;
            }
            usleep(50000);
        }
    }
}

int Status(const Context &context, const StatusOptions &options)
{
    if (options.watch) {
        return Watch(context, options);
    }
    Snapshot snapshot;
    if (!TakeSnapshot(options.paths, snapshot)) {
        return Fail("status");
    }
    if (context.json) {
        PrintJson(SnapshotJson(snapshot));
    } else {
        std::cout << SnapshotText(snapshot);
    }
    return kSuccess;
}

// Prints the pause state as status.conf now holds it.
int ShowPauseState(const Context &context, const std::string &what)
{
    long long resumeTime = -1;
    if (!StatusMgr::GetPauseInfo(resumeTime)) {
        return Fail(what);
    }
    if (context.json) {
        Json::Value document;
        document["resume_time"] = static_cast<Json::Int64>(resumeTime);
        PrintJson(document);
    } else if (resumeTime == -1) {
        std::cout << "indexing runs\n";
    } else {
        std::cout << "indexing paused " << PauseText(resumeTime) << "\n";
    }
    return kSuccess;
}

int Pause(const Context &context, int hours)
{
    ClearLastError();
    if (!StatusMgr::Pause(hours)) {
        return Fail("pause", kDaemonHint);
    }
    return ShowPauseState(context, "pause");
}

int Resume(const Context &context)
{
    ClearLastError();
    if (!StatusMgr::Resume()) {
        return Fail("resume", kDaemonHint);
    }
    return ShowPauseState(context, "resume");
}

}  // namespace

void AddStatusCommands(CLI::App &app, Context &context)
{
    auto status = std::make_shared<StatusOptions>();
    CLI::App *statusCommand = AddCommand(
        app, context, "status", "indexing progress, overall and per folder: finished, processing, paused, err_no_space",
        [&context, status]() { return Status(context, *status); });
    statusCommand->add_option("PATH", status->paths, "folders to show (default: every indexed folder)");
    statusCommand->add_flag("--watch", status->watch,
                            "redraw until indexing has finished or Ctrl-C; with --json, print the finished state");
    statusCommand->add_option("--interval", status->interval, "seconds between redraws")
        ->capture_default_str()
        ->check(CLI::PositiveNumber);

    auto hours = std::make_shared<int>(0);
    AddCommand(app, context, "pause", "pause indexing and tell fileindexd",
               [&context, hours]() { return Pause(context, *hours); })
        ->add_option("--hours", *hours, "resume by itself after this many hours; 0 pauses until 'resume'")
        ->capture_default_str();
    AddCommand(app, context, "resume", "resume indexing and tell fileindexd", [&context]() { return Resume(context); });
}

}  // namespace fileindexctl
