// The subcommands of fileindexctl. Each Add...Commands function adds one family of subcommands;
// the subcommand the command line chooses leaves its action in the context, and main runs it once
// the whole command line has been parsed.
#ifndef FILEINDEXCTL_COMMANDS_H
#define FILEINDEXCTL_COMMANDS_H

#include <functional>
#include <string>
#include <vector>

#include <CLI/CLI.hpp>

#include "busy.h"
#include "failure.h"

namespace fileindexctl {

struct Context {
    bool json = false;               // --json: one JSON document instead of tables
    bool pathBytes = false;          // --path-bytes: path arguments are percent-encoded bytes
    double wait = 5;                 // --wait: seconds to retry while a lock is busy
    bool yes = false;                // --yes: confirmed beforehand
    std::function<int()> action;     // the chosen subcommand; returns the exit status
};

// Adds a subcommand with the --json flag that every subcommand has; run becomes the context's
// action when the command line chooses it.
CLI::App *AddCommand(CLI::App &parent, Context &context, const std::string &name, const std::string &description,
                     std::function<int()> run);

// Adds --json to a group of subcommands, so that it may also stand between the group and the subcommand.
void AddJsonFlag(CLI::App &command, Context &context);

// A command-line value that must be a number from low to high (whole when whole is set), refused
// with "'<text>' is not <what> from <low> to <high>".
CLI::Validator NumberFrom(double low, double high, const std::string &what, bool whole = false);

constexpr char kWaitDescription[] = "while another program holds the lock this command needs, try again for up "
                                    "to this many seconds (0: give up at once); a lock still busy then exits 75";
// Adds --wait SECONDS to a subcommand whose lock failure leaves nothing behind (see RunWaiting).
void AddWaitOption(CLI::App &command, Context &context, const std::string &description = kWaitDescription);
// Runs call, and again while it fails because another process holds lock and --wait has not run
// out. lock is the lock the operation takes before it does anything, so that a lock failure leaves
// nothing behind; null for an operation that takes none of its own, or may have done part of its
// work when it meets one: it runs once. On failure, failure is BusyFailure when the lock stayed busy;
// for an operation that tells fileindexd (daemonState not null: what stands when fileindexd was not
// told, "" for nothing to say), DaemonFailure; otherwise LibraryFailure(what, withoutCode), which
// also tells, at the first attempt, a lock file that cannot be opened or created from a busy lock.
bool RunWaiting(const Context &context, const fileindex_tool::LockFile *lock, const std::string &what,
                const std::string &withoutCode, const std::function<bool()> &call, fileindex_tool::Failure &failure,
                const char *daemonState = nullptr);

// Whether the user confirms question ("wipe ... of share photo"): yes with --yes; on a terminal,
// asked on standard error and answered "y" or "yes" on standard input; refused otherwise, with the
// failure: kInvalid without a terminal ("needs --yes"), kFailed when not confirmed.
bool Confirmed(const Context &context, const std::string &what, const std::string &question,
               fileindex_tool::Failure &failure);

// Adds the PATH arguments of a subcommand, and the --path-bytes flag that reads them as
// percent-encoded bytes (path_encoding.h).
CLI::Option *AddPaths(CLI::App &command, Context &context, std::vector<std::string> &paths,
                      const std::string &description);
// The path arguments as the library takes them: decoded under --path-bytes, trailing "/" removed,
// and, asFolders, refused unless they have the form a folder is stored under (NormaliseFolderPath).
// False, with the failure (kInvalid), for an argument that is neither.
bool TakePaths(const Context &context, const std::string &what, std::vector<std::string> &paths,
               fileindex_tool::Failure &failure, bool asFolders = true);

// The values of folder list's --sort and --with, the media of a folder setting, and the values of
// folder set's media switches.
extern const std::vector<std::string> kSortKeys;
extern const std::vector<std::string> kAdditionalKeys;
extern const std::vector<std::string> kMedia;
extern const std::vector<std::string> kSwitchValues;

void AddFolderCommands(CLI::App &app, Context &context);
void AddIndexCommands(CLI::App &app, Context &context);
void AddStatusCommands(CLI::App &app, Context &context);
void AddShareCommands(CLI::App &app, Context &context);
// The hidden "__complete -- WORDS...", which prints the words that may follow, one a line.
void AddCompleteCommand(CLI::App &app, Context &context);

}  // namespace fileindexctl

#endif
