// fileindexctl check|reindex|upgrade: what the index makes of a path, and whole-index operations.
#include <iostream>
#include <memory>
#include <string>
#include <vector>

#include "check_report.h"
#include "commands.h"
#include "failure.h"
#include "fileindex/index_mgr.h"
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
using fileindex_tool::LibraryFailure;
using fileindex_tool::TerminalText;

namespace {

// The check report of path, for people.
void PrintCheck(const std::string &path, const Json::Value &check)
{
    std::cout << TerminalText(path) << "\n";
    std::string fullPath;
    if (check["full_path_bytes"].isString() && fileindex_tool::PercentDecode(check["full_path_bytes"].asString(), fullPath)) {
        std::cout << "  full path:       " << TerminalText(fullPath) << "\n";
    }
    std::cout << "  indexed:         "
              << (check["indexed"].asBool()            ? "yes"
                  : check["contains_indexed"].asBool() ? "no, but it holds indexed folders"
                                                       : "no")
              << "\n";
    std::cout << "  may be indexed:  "
              << (check["may_be_indexed"].asBool() ? "yes" : "no, " + check["refusal_text"].asString()) << "\n";
    if (!check["crawler_skips"].isNull()) {
        std::cout << "  crawler:         "
                  << (check["crawler_skips"].asBool() ? "skips it, " + check["skip_refusal_text"].asString()
                                                      : "keeps it")
                  << "\n";
    }
}

int Check(const Context &context, std::vector<std::string> &paths)
{
    Failure failure;
    if (!TakePaths(context, "check", paths, failure, false)) {
        return Report(context, failure);
    }
    Json::Value checks(Json::arrayValue);
    bool allMayBeIndexed = true;
    for (const std::string &path : paths) {
        checks.append(fileindex_tool::CheckReport(path));
        allMayBeIndexed = allMayBeIndexed && checks[checks.size() - 1]["may_be_indexed"].asBool();
    }
    if (context.json) {
        PrintJson(checks);
    } else {
        for (Json::ArrayIndex i = 0; i < checks.size(); ++i) {
            PrintCheck(paths[i], checks[i]);
        }
    }
    return allMayBeIndexed ? kSuccess : kRefused;
}

int Reindex(const Context &context, std::vector<std::string> &paths)
{
    Failure failure;
    if (!TakePaths(context, "reindex", paths, failure)) {
        return Report(context, failure);
    }
    for (const std::string &path : paths) {
        if (!fileindex_tool::CheckPathExists("reindex", path, failure) ||
            !fileindex_tool::CheckIndexedOrAbove("reindex", path, failure)) {
            return Report(context, failure);
        }
    }
    const Json::Value request = PathArray(paths);
    ClearLastError();
    if (!IndexMgr::Reindex(request)) {
        return Report(context, LibraryFailure("reindex", "an event could not be queued; the system log names the "
                                                         "path"));
    }
    if (context.json) {
        Json::Value queued(Json::arrayValue);
        for (const std::string &path : paths) {
            Json::Value entry;
            fileindex_tool::SetBytesMember(entry, "path", path);
            queued.append(entry);
        }
        PrintJson(queued);
    } else {
        for (const std::string &path : paths) {
            std::cout << "reindex queued for " << TerminalText(path) << "\n";
        }
    }
    return kSuccess;
}

int Upgrade(const Context &context)
{
    ClearLastError();
    if (!Updater_hvx60_beta2()) {
        return Report(context, LibraryFailure("upgrade", "a step (the service, Spotlight, change monitoring or the "
                                                         "reindex) failed; the system log names it"));
    }
    std::vector<Folder> folders;
    if (!ListFolders(folders)) {
        return Report(context, LibraryFailure("upgrade", "the library recorded no reason; the system log has its "
                                                         "line"));
    }
    if (context.json) {
        PrintJson(fileindex_tool::FolderRecords(folders));
    } else if (folders.empty()) {
        std::cout << "nothing is indexed: fileindexd stopped\n";
    } else {
        PrintFolderLines("monitored and queued for reindex:", folders);
    }
    return kSuccess;
}

}  // namespace

void AddIndexCommands(CLI::App &app, Context &context)
{
    auto paths = std::make_shared<std::vector<std::string>>();
    CLI::App *check =
        AddCommand(app, context, "check",
                   "is a path indexed, does it hold indexed folders, may it be indexed, and which rule refuses it; "
                   "exits 3 when a path may not be indexed (or does not resolve)",
                   [&context, paths]() { return Check(context, *paths); });
    AddPaths(*check, context, *paths, "share-relative paths, /<share>/<folder>")->required();

    auto reindexPaths = std::make_shared<std::vector<std::string>>();
    CLI::App *reindex = AddCommand(app, context, "reindex",
                                   "index folders again from scratch (reviving shares that ran out of space)",
                                   [&context, reindexPaths]() { return Reindex(context, *reindexPaths); });
    AddPaths(*reindex, context, *reindexPaths, "share-relative paths in shares that hold indexed folders")
        ->required();

    AddCommand(app, context, "upgrade",
               "bring the service, Spotlight, change monitoring and the index in line with the folder list, as "
               "after a system upgrade",
               [&context]() { return Upgrade(context); });
}

}  // namespace fileindexctl
