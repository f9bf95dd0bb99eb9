// The subcommands of fileindexctl. Each Add...Commands function adds one family of subcommands;
// the subcommand the command line chooses leaves its action in the context, and main runs it once
// the whole command line has been parsed.
#ifndef FILEINDEXCTL_COMMANDS_H
#define FILEINDEXCTL_COMMANDS_H

#include <functional>
#include <string>

#include <CLI/CLI.hpp>

namespace fileindexctl {

struct Context {
    bool json = false;               // --json: one JSON document instead of tables
    std::function<int()> action;     // the chosen subcommand; returns the exit status
};

// Adds a subcommand with the --json flag that every subcommand has; run becomes the context's
// action when the command line chooses it.
CLI::App *AddCommand(CLI::App &parent, Context &context, const std::string &name, const std::string &description,
                     std::function<int()> run);

void AddFolderCommands(CLI::App &app, Context &context);
void AddIndexCommands(CLI::App &app, Context &context);
void AddStatusCommands(CLI::App &app, Context &context);
void AddShareCommands(CLI::App &app, Context &context);

}  // namespace fileindexctl

#endif
