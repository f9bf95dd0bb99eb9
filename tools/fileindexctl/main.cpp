// fileindexctl: shows and changes the appliance's file index through libfileindex's exported
// interface. Tables for people by default, one JSON document with --json; a failure is one line on
// standard error (and the error object with --json) and an exit status of its kind (output.h).
#include <string>

#include <CLI/CLI.hpp>

#include "commands.h"
#include "output.h"
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

CLI::Option *AddPaths(CLI::App &command, Context &context, std::vector<std::string> &paths,
                      const std::string &description)
{
    command.add_flag("--path-bytes", context.pathBytes,
                     "read each PATH as percent-encoded bytes, the \"path_bytes\" form of the JSON records");
    return command.add_option("PATH", paths, description);
}

bool TakePaths(const Context &context, const std::string &what, std::vector<std::string> &paths,
               fileindex_tool::Failure &failure)
{
    if (!context.pathBytes) {
        return true;
    }
    for (std::string &path : paths) {
        if (!fileindex_tool::PercentDecode(path, path)) {
            failure = fileindex_tool::ToolFailure(
                fileindex_tool::FailureKind::kInvalid, fileindex_tool::Failure::kNoCode,
                what + ": " + fileindex_tool::TerminalText(path) + " is not percent-encoded (a \"%\" must be "
                "followed by two hex digits); --path-bytes takes the \"path_bytes\" form of the JSON records");
            return false;
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
               "Exit status: 0 success, 1 a library call failed (one line on standard error names the error "
               "code and what to try), 2 wrong command line, 4 no such share, path or folder, 75 a lock stayed "
               "busy.");

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
