// fileindexctl status|pause|resume: indexing progress and the pause state.
#include <signal.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <ctime>
#include <iostream>
#include <memory>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

#include "commands.h"
#include "failure.h"
#include "fileindex/status.h"
#include "output.h"
#include "path_checks.h"
#include "path_encoding.h"
#include "pause_hours.h"
#include "status_output.h"
#include "status_report.h"

namespace fileindexctl {

using fileindex_tool::ClearLastError;
using fileindex_tool::LibraryFailure;
using fileindex_tool::StatusReport;
using fileindex_tool::TerminalText;
using VEXO::FILEINDEX::StatusMgr;

namespace {

struct StatusOptions {
    std::vector<std::string> paths;  // the folders to show; every indexed folder when empty
    bool watch = false;
    double interval = 1.0;
};

const char kReadHint[] = "the library recorded no reason; the system log has its line";
const char kStatusSaved[] = "status.conf is saved";

int Status(const Context &context, StatusOptions &options)
{
    fileindex_tool::Failure failure;
    if (!TakePaths(context, "status", options.paths, failure)) {
        return Report(context, failure);
    }
    for (const std::string &path : options.paths) {
        if (!fileindex_tool::CheckPathExists("status", path, failure) ||
            !fileindex_tool::CheckIndexedOrAbove("status", path, failure)) {
            return Report(context, failure);
        }
    }
    if (options.watch) {
        return Watch(context, options.paths, options.interval);
    }
    StatusReport report;
    ClearLastError();
    if (!fileindex_tool::TakeStatusReport(options.paths, report)) {
        return Report(context, LibraryFailure("status", kReadHint));
    }
    if (context.json) {
        PrintJson(fileindex_tool::StatusRecord(report));
    } else {
        PrintStatus(report);
    }
    return kSuccess;
}

// Prints the pause state as status.conf now holds it.
int ShowPauseState(const Context &context, const std::string &what)
{
    long long resumeTime = -1;
    if (!StatusMgr::GetPauseInfo(resumeTime)) {
        return Report(context, LibraryFailure(what, kReadHint));
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

int Pause(const Context &context, long long hours)
{
    fileindex_tool::Failure failure;
    if (!fileindex_tool::CheckPauseHours("pause --hours", hours, failure) ||
        !RunWaiting(context, &fileindex_tool::kStatusLock, "pause", kReadHint,
                    [hours]() { return StatusMgr::Pause(static_cast<int>(hours)); }, failure, kStatusSaved)) {
        return Report(context, failure);
    }
    return ShowPauseState(context, "pause");
}

int Resume(const Context &context)
{
    fileindex_tool::Failure failure;
    if (!RunWaiting(context, &fileindex_tool::kStatusLock, "resume", kReadHint, StatusMgr::Resume, failure,
                    kStatusSaved)) {
        return Report(context, failure);
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
    AddPaths(*statusCommand, context, status->paths, "folders to show (default: every indexed folder)");
    statusCommand->add_flag("--watch", status->watch,
                            "redraw until indexing has finished or Ctrl-C; with --json, print the finished state");
    statusCommand->add_option("--interval", status->interval, "seconds between redraws, from 0.05 to 3600")
        ->capture_default_str()
        ->type_name("SECONDS")
        ->check(NumberFrom(0.05, 3600, "a number of seconds"));

    auto hours = std::make_shared<long long>(0);
    CLI::App *pause = AddCommand(app, context, "pause", "pause indexing and tell fileindexd",
                                 [&context, hours]() { return Pause(context, *hours); });
    pause->add_option("--hours", *hours, "resume by itself after this many hours; 0 pauses until 'resume'")
        ->capture_default_str();
    AddWaitOption(*pause, context);
    AddWaitOption(*AddCommand(app, context, "resume", "resume indexing and tell fileindexd",
                              [&context]() { return Resume(context); }),
                  context);
}

}  // namespace fileindexctl
