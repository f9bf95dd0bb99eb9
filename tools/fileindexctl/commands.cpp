// What every fileindexctl subcommand shares: --json, --wait, path arguments, and running a library
// call under --wait.
#include "commands.h"

#include <unistd.h>

#include <cstdlib>
#include <iostream>
#include <sstream>
#include <string>

#include "daemon_probe.h"
#include "fileindex/error.h"
#include "path_checks.h"
#include "path_encoding.h"

namespace fileindexctl {

const std::vector<std::string> kSortKeys = {"name", "path", "document", "audio", "video", "photo"};
const std::vector<std::string> kAdditionalKeys = {"status", "is_valid"};
const std::vector<std::string> kMedia = {"document", "audio", "video", "photo"};
const std::vector<std::string> kSwitchValues = {"on", "off"};

CLI::App *AddCommand(CLI::App &parent, Context &context, const std::string &name, const std::string &description,
                     std::function<int()> run)
{
    CLI::App *command = parent.add_subcommand(name, description);
    AddJsonFlag(*command, context);
    command->callback([&context, run]() { context.action = run; });
    return command;
}

void AddJsonFlag(CLI::App &command, Context &context)
{
    command.add_flag("--json", context.json, "print one JSON document (docs/fileindexctl.md gives each shape)");
}

namespace {

// A number as people write it: 1000000 rather than 1e+06, 0.05 rather than 0.050000.
std::string NumberText(double number)
{
    std::ostringstream text;
    text.precision(15);
    text << number;
    return text.str();
}

}  // namespace

CLI::Validator NumberFrom(double low, double high, const std::string &what, bool whole)
{
    return CLI::Validator(
        [low, high, what, whole](std::string &text) {
            char *end = nullptr;
            const double number = strtod(text.c_str(), &end);
            const bool fits = !text.empty() && *end == '\0' && number >= low && number <= high &&
                              (!whole || text.find_first_not_of("0123456789") == std::string::npos);
            return fits ? std::string()
                        : "'" + text + "' is not " + what + " from " + NumberText(low) + " to " + NumberText(high);
        },
        "");
}

void AddWaitOption(CLI::App &command, Context &context, const std::string &description)
{
    command.add_option("--wait", context.wait, description)
        ->check(NumberFrom(0, 3600, "a number of seconds"))
        ->capture_default_str()
        ->type_name("SECONDS");
}

bool RunWaiting(const Context &context, const fileindex_tool::LockFile *lock, const std::string &what,
                const std::string &withoutCode, const std::function<bool()> &call, fileindex_tool::Failure &failure,
                const char *daemonState)
{
    using fileindex_tool::FailureKind;
    bool busyAtLast = false;
    const bool done = fileindex_tool::RetryWhileBusy(lock == nullptr ? 0 : context.wait, [&](bool &busy) {
        fileindex_tool::ClearLastError();
        if (call()) {
            return true;
        }
        // The operation's own lock failed: held by another process, or its file cannot be opened.
        if (lock != nullptr && VEXO::FILEINDEX::ErrorHandler::GetError() == VEXO::FILEINDEX::FILEIDX_ERR_LOCK) {
            busy = !fileindex_tool::LockFileUnusable(what, lock, failure);
        } else {
            failure = daemonState != nullptr ? fileindex_tool::DaemonFailure(what, daemonState, withoutCode)
                                             : fileindex_tool::LibraryFailure(what, withoutCode);
            busy = failure.kind == FailureKind::kBusy;
        }
        busyAtLast = busy;
        return false;
    });
    if (!done && lock != nullptr && busyAtLast) {
        failure = fileindex_tool::BusyFailure(what, *lock, context.wait);
    }
    return done;
}

bool Confirmed(const Context &context, const std::string &what, const std::string &question,
               fileindex_tool::Failure &failure)
{
    using fileindex_tool::FailureKind;
    if (context.yes) {
        return true;
    }
    if (isatty(STDIN_FILENO) != 1) {
        failure = fileindex_tool::ToolFailure(FailureKind::kInvalid, fileindex_tool::Failure::kNoCode,
                                              what + ": this cannot be undone and needs confirmation; give --yes "
                                              "when standard input is not a terminal");
        return false;
    }
    std::cerr << question << "? [y/N] " << std::flush;
    std::string answer;
    std::getline(std::cin, answer);
    if (answer == "y" || answer == "Y" || answer == "yes") {
        return true;
    }
    failure = fileindex_tool::ToolFailure(FailureKind::kFailed, fileindex_tool::Failure::kNoCode,
                                          what + ": not confirmed; nothing was changed");
    return false;
}

CLI::Option *AddPaths(CLI::App &command, Context &context, std::vector<std::string> &paths,
                      const std::string &description)
{
    command.add_flag("--path-bytes", context.pathBytes,
                     "read each PATH as percent-encoded bytes, the \"path_bytes\" form of the JSON records");
    return command.add_option("PATH", paths, description);
}

bool TakePaths(const Context &context, const std::string &what, std::vector<std::string> &paths,
               fileindex_tool::Failure &failure, bool asFolders)
{
    for (std::string &path : paths) {
        if (context.pathBytes && !fileindex_tool::PercentDecode(path, path)) {
            failure = fileindex_tool::ToolFailure(
                fileindex_tool::FailureKind::kInvalid, fileindex_tool::Failure::kNoCode,
                what + ": " + fileindex_tool::TerminalText(path) + " is not percent-encoded (a \"%\" must be "
                "followed by two hex digits); --path-bytes takes the \"path_bytes\" form of the JSON records");
            return false;
        }
        if (asFolders && !fileindex_tool::NormaliseFolderPath(what, path, path, failure)) {
            return false;
        }
        while (path.size() > 1 && path.back() == '/') {
            path.pop_back();
        }
    }
    return true;
}

}  // namespace fileindexctl
