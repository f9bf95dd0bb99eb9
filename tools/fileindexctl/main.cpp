// fileindexctl: shows and changes the appliance's file index through libfileindex's exported
// interface. Tables for people by default, one JSON document with --json; exit status 0 on
// success, 1 with one line on standard error naming the library's error code when a call fails,
// 2 when the command line is wrong.
#include <string>

#include <CLI/CLI.hpp>

#include "commands.h"
#include "output.h"

namespace fileindexctl {

CLI::App *AddCommand(CLI::App &parent, Context &context, const std::string &name, const std::string &description,
                     std::function<int()> run)
{
    CLI::App *command = parent.add_subcommand(name, description);
    command->add_flag("--json", context.json, "print one JSON document: the library's own records");
    command->callback([&context, run]() { context.action = run; });
    return command;
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
               "code and what to try), 2 wrong command line.");

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
