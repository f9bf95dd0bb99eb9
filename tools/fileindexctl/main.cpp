// fileindexctl: shows and changes the appliance's file index through libfileindex's exported
// interface. Tables for people by default, one JSON document with --json; a failure is one line on
// standard error (and the error object with --json) and an exit status of its kind (output.h).
#include <string>

#include <CLI/CLI.hpp>

#include "commands.h"
#include "daemon_probe.h"
#include "fileindex/error.h"
#include "output.h"
#include "path_checks.h"
#include "path_encoding.h"

namespace fileindexctl {

CLI::App *AddCommand(CLI::App &parent, Context &context, const std::string &name, const std::string &description,
                     std::function<int()> run)
{
    CLI::App *command = parent.add_subcommand(name, description);
    command->add_flag("--json", context.json, "print one JSON document (docs/fileindexctl.md gives each shape)");
    command->callback([&context, run]() { context.action = run; });
    return command;
}

void AddWaitOption(CLI::App &command, Context &context)
{
    command.add_option("--wait", context.wait,
                       "while another program holds the lock this command needs, try again for up to this many "
                       "seconds (0: give up at once); a lock still busy then exits 75")
        ->check(CLI::Range(0.0, 3600.0))
        ->capture_default_str()
        ->type_name("SECONDS");
}

bool RunWaiting(const Context &context, const fileindex_tool::LockFile *lock, const std::string &what,
                const std::string &withoutCode, const std::function<bool()> &call, fileindex_tool::Failure &failure,
                const char *daemonState)
{
    if (fileindex_tool::RetryWhileBusy(lock == nullptr ? 0 : context.wait, call)) {
        return true;
    }
    if (lock != nullptr && VEXO::FILEINDEX::ErrorHandler::GetError() == VEXO::FILEINDEX::FILEIDX_ERR_LOCK) {
        failure = fileindex_tool::BusyFailure(what, *lock, context.wait);
    } else if (daemonState != nullptr) {
        failure = fileindex_tool::DaemonFailure(what, daemonState, withoutCode);
    } else {
        failure = fileindex_tool::LibraryFailure(what, withoutCode);
    }
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

int main(int argc, char **argv)
{
    using namespace fileindexctl;

    CLI::App app{"Show and change the appliance's file index: indexed folders, indexing progress, pause and "
                 "resume, shares.",
                 "fileindexctl"};
    app.set_version_flag("--version", "fileindexctl " FILEINDEX_VERSION);
    app.require_subcommand(1);
    app.failure_message([](const CLI::App *, const CLI::Error &error) {
        return "fileindexctl: " + std::string(error.what()) + " (see --help)\n";
    });
    app.footer("Every subcommand takes --json and has its own --help. Paths are share-relative, /<share>/<folder>, "
               "unless a subcommand says otherwise.\n"
               "A busy lock: folder get/add/set/remove, share remove/rename/revive, pause and resume take their "
               "lock before they do anything, so they try again while another program holds it, for up to --wait "
               "seconds. The other subcommands take no lock of their own, or may have done part of their work "
               "when they meet one, and fail at once.\n"
               "Exit status: 0 success, 1 a library call failed (one line on standard error names the error "
               "code and what to try), 2 wrong command line, 3 the path may not be indexed, 4 no such share, "
               "path or folder, 5 fileindexd was not told (the line says what stands), 75 a lock stayed busy.");

    Context context;
    AddFolderCommands(app, context);
    AddIndexCommands(app, context);
    AddStatusCommands(app, context);
    AddShareCommands(app, context);

    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError &error) {
        const int status = app.exit(error);
        return status == 0 ? kSuccess : kUsage;
    }
    return context.action ? context.action() : kUsage;
}
