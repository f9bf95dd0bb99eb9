// fileindexctl share ...: what follows a shared folder's life, and what the index keeps in it.
#include <sys/stat.h>

#include <functional>
#include <iostream>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "commands.h"
#include "failure.h"
#include "fileindex/fileidx.h"
#include "fileindex/index_mgr.h"
#include "fileindex/status.h"
#include "fileindex/utils.h"
#include "folder_output.h"
#include "output.h"
#include "path_checks.h"
#include "path_encoding.h"
#include "records.h"

namespace fileindexctl {

using namespace VEXO::FILEINDEX;
using fileindex_tool::ClearLastError;
using fileindex_tool::Failure;
using fileindex_tool::kFolderListLock;
using fileindex_tool::LibraryFailure;
using fileindex_tool::SetBytesMember;
using fileindex_tool::TerminalText;

namespace {

const char kUnknownShareHint[] = "the share is not in the share database; the system log has the platform's code";
const char kReadHint[] = "the library recorded no reason; the system log has its line";

// What: "share <subcommand> <share>".
std::string What(const std::string &subcommand, const std::string &share)
{
    return "share " + subcommand + " " + TerminalText(share);
}

Json::Value ShareDocument(const std::string &share)
{
    Json::Value document;
    SetBytesMember(document, "share_name", share);
    return document;
}

int Space(const Context &context, const std::string &share)
{
    Failure failure;
    std::string fullPath;
    if (!fileindex_tool::CheckShareExists(What("space", share), share, failure) ||
        !GetFullPath(fullPath, "/" + share)) {
        return Report(context, failure);
    }
    Json::Value document = fileindex_tool::ShareMarks(share);
    document["space_enough"] = IsShareSpaceEnough(share);
    if (context.json) {
        PrintJson(document);
        return kSuccess;
    }
    std::cout << "share:          " << TerminalText(share) << " at " << TerminalText(fullPath) << "\n"
              << "free space:     " << (document["space_enough"].asBool() ? "enough" : "less than 10 MiB") << "\n"
              << "out of space:   " << (document["no_space"].asBool() ? "marked (revive it once space is free)" : "no")
              << "\n"
              << "needs reindex:  " << YesNo(document["need_reindex"].asBool()) << "\n";
    return kSuccess;
}

std::string Presence(const std::string &path)
{
    struct stat status;
    return lstat(path.c_str(), &status) == 0 ? "" : " (no file)";
}

int Paths(const Context &context, const std::string &share)
{
    Failure failure;
    if (!fileindex_tool::CheckShareExists(What("paths", share), share, failure)) {
        return Report(context, failure);
    }
    char queue[4096];
    char database[4096];
    if (FILEIDXQueuePathGet(share.c_str(), queue, sizeof(queue)) < 0 ||
        FILEIDXDBPathGet(share.c_str(), database, sizeof(database)) < 0) {
        return Report(context, LibraryFailure(What("paths", share), kUnknownShareHint));
    }
    Json::Value document = ShareDocument(share);
    SetBytesMember(document, "queue", queue);
    SetBytesMember(document, "database", database);
    if (context.json) {
        PrintJson(document);
        return kSuccess;
    }
    std::cout << "event queue:    " << TerminalText(queue) << Presence(queue) << "\n"
              << "index database: " << TerminalText(database) << "\n";
    return kSuccess;
}

// Prints {"share_name": share}, or the line for people.
int Done(const Context &context, const std::string &share, const std::string &line)
{
    if (context.json) {
        PrintJson(ShareDocument(share));
    } else {
        std::cout << "share " << TerminalText(share) << ": " << line << "\n";
    }
    return kSuccess;
}

int Remove(const Context &context, const std::string &share)
{
    ClearLastError();
    std::vector<Folder> before;
    if (!ListFolders(before, share)) {
        return Report(context, LibraryFailure(What("remove", share), kReadHint));
    }
    Failure failure;
    if (!fileindex_tool::CheckShareKnown(What("remove", share), share, before, failure)) {
        return Report(context, failure);
    }
    if (!RunWaiting(context, &kFolderListLock, What("remove", share), kReadHint,
                    [&share]() { return IndexMgr::ShareRemove(share); }, failure)) {
        return Report(context, failure);
    }
    if (context.json) {
        PrintJson(fileindex_tool::FolderRecords(before));
    } else {
        PrintFolderLines("removed", before);
        std::cout << "share " << TerminalText(share) << ": folder settings removed: " << before.size() << "\n";
    }
    return kSuccess;
}

int Rename(const Context &context, const std::string &from, const std::string &to)
{
    const std::string what = What("rename", from) + " " + TerminalText(to);
    Failure failure;
    std::vector<Folder> before;
    ClearLastError();
    if (!ListFolders(before, from)) {
        return Report(context, LibraryFailure(what, kReadHint));
    }
    if (!fileindex_tool::CheckShareKnown(what, from, before, failure) ||
        !fileindex_tool::CheckShareExists(what, to, failure)) {
        return Report(context, failure);
    }
    if (!RunWaiting(context, &kFolderListLock, what, kReadHint,
                    [&from, &to]() { return IndexMgr::ShareRename(from, to); }, failure)) {
        return Report(context, failure);
    }
    ClearLastError();
    std::vector<Folder> after;
    if (!ListFolders(after, to)) {
        return Report(context, LibraryFailure(what, kReadHint));
    }
    if (context.json) {
        PrintJson(fileindex_tool::FolderRecords(after));
    } else {
        PrintFolderLines("now", after);
        std::cout << "share " << TerminalText(from) << " is now " << TerminalText(to)
                  << ": folder settings moved: " << after.size() << "\n";
    }
    return kSuccess;
}

// A share subcommand that is one library call: what it calls, the lock it takes before anything
// else (retried under --wait; null for none), what a failure without a code may mean, what stands
// when fileindexd was not told (null for a call that does not talk to it), the question to confirm
// first (null for none), and the line printed on success.
struct ShareAction {
    const char *name;
    const char *description;
    bool (*call)(const std::string &share);
    const fileindex_tool::LockFile *lock;
    const char *failureHint;
    const char *daemonState;
    const char *question;  // asked before the call, about the share (null: none)
    const char *doneLine;
};

const ShareAction kShareActions[] = {
    {"pause", "stop indexing the share: fileindexd deletes its worker, change monitoring removed",
     IndexMgr::SharePause, nullptr, "the share's change monitoring could not be removed; the system log says why",
     "nothing changed", nullptr, "fileindexd told to delete its worker, change monitoring removed"},
    {"resume", "index the share again: change monitoring registered, fileindexd revives its worker",
     IndexMgr::ShareResume, nullptr,
     "the share's change monitoring could not be registered, or fileindexd did not take the command; the system "
     "log says which",
     "", nullptr, "change monitoring registered, fileindexd told to revive its worker"},
    {"clean", "wipe the share's event queue and index database", IndexMgr::CleanShareIndexData, nullptr,
     kUnknownShareHint, nullptr, "wipe the event queue and index database of share", "event queue and index database removed"},
    {"revive", "clear the share's out-of-space mark and tell fileindexd to revive the share's worker",
     StatusMgr::ShareRevive, &fileindex_tool::kStatusLock, kReadHint, "the out-of-space mark is cleared", nullptr,
     "out-of-space mark cleared, fileindexd told to revive its worker"},
};

int RunShareAction(const Context &context, const ShareAction &action, const std::string &share)
{
    Failure failure;
    const auto call = [&action, &share]() { return action.call(share); };
    if (!fileindex_tool::CheckShareExists(What(action.name, share), share, failure) ||
        (action.question != nullptr &&
         !Confirmed(context, What(action.name, share), std::string(action.question) + " " + TerminalText(share),
                    failure)) ||
        !RunWaiting(context, action.lock, What(action.name, share), action.failureHint, call, failure,
                    action.daemonState)) {
        return Report(context, failure);
    }
    return Done(context, share, action.doneLine);
}

// Adds "share <name> SHARE" running run(context, share).
CLI::App *AddShareCommand(CLI::App &share, Context &context, const std::string &name, const std::string &description,
                          std::function<int(const Context &, const std::string &)> run)
{
    auto shareName = std::make_shared<std::string>();
    CLI::App *command = AddCommand(share, context, name, description,
                                   [&context, run, shareName]() { return run(context, *shareName); });
    command->add_option("SHARE", *shareName, "share name")->required();
    return command;
}

}  // namespace

void AddShareCommands(CLI::App &app, Context &context)
{
    CLI::App *share = app.add_subcommand("share", "shared folders: remove, rename, pause, resume, clean, revive, "
                                                  "space, paths");
    share->require_subcommand(1);
    AddJsonFlag(*share, context);
    AddWaitOption(*AddShareCommand(*share, context, "remove",
                                   "the share is gone: drop its folder settings (the last ones stop fileindexd)",
                                   Remove),
                  context);
    auto names = std::make_shared<std::pair<std::string, std::string>>();
    CLI::App *rename = AddCommand(*share, context, "rename",
                                  "the share was renamed (in the share database first): move its folder settings",
                                  [&context, names]() { return Rename(context, names->first, names->second); });
    rename->add_option("OLD", names->first, "the share's old name")->required();
    rename->add_option("NEW", names->second, "the share's new name")->required();
    AddWaitOption(*rename, context);
    for (const ShareAction &action : kShareActions) {
        CLI::App *command = AddShareCommand(*share, context, action.name, action.description,
                                            [&action](const Context &runContext, const std::string &shareName) {
                                                return RunShareAction(runContext, action, shareName);
                                            });
        if (action.lock != nullptr) {
            AddWaitOption(*command, context);
        }
        if (action.question != nullptr) {
            command->add_flag("--yes", context.yes, "do not ask: needed when standard input is not a terminal");
        }
    }
    AddShareCommand(*share, context, "space",
                    "whether the share's volume has the 10 MiB indexing needs, and the share's marks", Space);
    AddShareCommand(*share, context, "paths",
                    "the share's event queue file and index database directory (making the directories)", Paths);
}

}  // namespace fileindexctl
