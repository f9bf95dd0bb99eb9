// fileindexctl status|pause|resume: indexing progress and the pause state.
#include <ctime>
#include <iostream>
#include <memory>
#include <string>

#include "commands.h"
#include "fileindex/status.h"
#include "output.h"

namespace fileindexctl {

using VEXO::FILEINDEX::StatusMgr;

namespace {

const char kDaemonHint[] = "the change is saved, but fileindexd did not take the command: is the indexing service "
                           "running? Retry once it is";

// "until resumed", or "until <local time>" for a timed pause; "" when indexing is not paused.
std::string PauseText(long long resumeTime)
{
    if (resumeTime == -1) {
        return std::string();
    }
    if (resumeTime == 0) {
        return "until resumed";
    }
    const time_t when = static_cast<time_t>(resumeTime);
    char text[64];
    struct tm local;
    strftime(text, sizeof(text), "%Y-%m-%d %H:%M:%S %Z", localtime_r(&when, &local));
    return std::string("until ") + text;
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
    auto hours = std::make_shared<int>(0);
    AddCommand(app, context, "pause", "pause indexing and tell fileindexd",
               [&context, hours]() { return Pause(context, *hours); })
        ->add_option("--hours", *hours, "resume by itself after this many hours; 0 pauses until 'resume'")
        ->capture_default_str();
    AddCommand(app, context, "resume", "resume indexing and tell fileindexd", [&context]() { return Resume(context); });
}

}  // namespace fileindexctl
