// fileindexctl share ...: what follows a shared folder's life, and what the index keeps in it.
#include <sys/stat.h>

#include <iostream>
#include <memory>
#include <string>

#include "commands.h"
#include "fileindex/fileidx.h"
#include "fileindex/status.h"
#include "fileindex/utils.h"
#include "output.h"

namespace fileindexctl {

using namespace VEXO::FILEINDEX;

namespace {

const char kUnknownShareHint[] = "the share is not in the share database; the system log has the platform's code";
const char kDaemonHint[] = "fileindexd did not take the command: is the indexing service running? Retry once it is";

Json::Value ShareDocument(const std::string &share)
{
    Json::Value document;
    document["share_name"] = share;
    return document;
}

int Space(const Context &context, const std::string &share)
{
    ClearLastError();
    std::string fullPath;
    if (!GetFullPath(fullPath, "/" + share)) {
        return Fail("share space " + share);
    }
    Json::Value document = ShareDocument(share);
    document["space_enough"] = IsShareSpaceEnough(share);
    document["no_space"] = StatusMgr::ShareIsNoSpace(share);
    document["need_reindex"] = StatusMgr::ShareIsNeedReindex(share);
    if (context.json) {
        PrintJson(document);
        return kSuccess;
    }
    std::cout << "share:          " << share << " at " << fullPath << "\n"
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
    ClearLastError();
    char queue[4096];
    char database[4096];
    if (FILEIDXQueuePathGet(share.c_str(), queue, sizeof(queue)) < 0 ||
        FILEIDXDBPathGet(share.c_str(), database, sizeof(database)) < 0) {
        return Fail("share paths " + share, kUnknownShareHint);
    }
    Json::Value document = ShareDocument(share);
    document["queue"] = queue;
    document["database"] = database;
    if (context.json) {
        PrintJson(document);
        return kSuccess;
    }
    std::cout << "event queue:    " << queue << Presence(queue) << "\n"
              << "index database: " << database << "\n";
    return kSuccess;
}

int Revive(const Context &context, const std::string &share)
{
    ClearLastError();
    if (!StatusMgr::ShareRevive(share)) {
        return Fail("share revive " + share, kDaemonHint);
    }
    if (context.json) {
        PrintJson(ShareDocument(share));
    } else {
        std::cout << "share " << share << ": out-of-space mark cleared, fileindexd told to revive its worker\n";
    }
    return kSuccess;
}

// Adds "share <name> SHARE" running run(context, share).
void AddShareCommand(CLI::App &share, Context &context, const std::string &name, const std::string &description,
                     int (*run)(const Context &, const std::string &))
{
    auto shareName = std::make_shared<std::string>();
    AddCommand(share, context, name, description, [&context, run, shareName]() { return run(context, *shareName); })
        ->add_option("SHARE", *shareName, "share name")
        ->required();
}

}  // namespace

void AddShareCommands(CLI::App &app, Context &context)
{
    CLI::App *share = app.add_subcommand("share", "shared folders: remove, rename, pause, resume, clean, revive, "
                                                  "space, paths");
    share->require_subcommand(1);
    AddShareCommand(*share, context, "revive",
                    "clear the share's out-of-space mark and tell fileindexd to revive the share's worker", Revive);
    AddShareCommand(*share, context, "space",
                    "whether the share's volume has the 10 MiB indexing needs, and the share's marks", Space);
    AddShareCommand(*share, context, "paths",
                    "the share's event queue file and index database directory (making the directories)", Paths);
}

}  // namespace fileindexctl
