// fileindexctl check|reindex|upgrade: what the index makes of a path, and whole-index operations.
#include <iostream>
#include <memory>
#include <string>
#include <vector>

#include "commands.h"
#include "fileindex/index_mgr.h"
#include "fileindex/utils.h"
#include "output.h"
#include "records.h"

namespace fileindexctl {

using namespace VEXO::FILEINDEX;

namespace {

// Whether the path is indexed or holds indexed folders, and which rules, if any, refuse it as a
// folder to index and as an entry the crawler meets (the crawler's answer is null for a path that
// does not resolve): the library's own rules and their words.
Json::Value CheckPath(const std::string &path)
{
    Json::Value check;
    check["path"] = path;
    std::string fullPath;
    const bool resolved = GetFullPath(fullPath, path);
    check["full_path"] = resolved ? Json::Value(fullPath) : Json::Value();
    check["indexed"] = IndexMgr::IsPathIndexed(path);
    check["contains_indexed"] = IndexMgr::IsPathContainIndexed(path);
    const IndexRefusal refusal = GetPathIndexRefusal(path);
    check["may_be_indexed"] = refusal == IndexRefusal::kNone;
    check["refusal"] = IndexRefusalName(refusal);
    check["refusal_text"] = IndexRefusalText(refusal);
    check["crawler_skips"] = Json::Value();
    check["skip_refusal"] = Json::Value();
    check["skip_refusal_text"] = Json::Value();
    if (resolved) {
        const IndexRefusal skip = GetSkipIndexRefusal(fullPath);
        check["crawler_skips"] = skip != IndexRefusal::kNone;
        check["skip_refusal"] = IndexRefusalName(skip);
        check["skip_refusal_text"] = IndexRefusalText(skip);
    }
    return check;
}

void PrintCheck(const Json::Value &check)
{
    std::cout << check["path"].asString() << "\n";
    if (!check["full_path"].isNull()) {
        std::cout << "  full path:       " << check["full_path"].asString() << "\n";
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

int Check(const Context &context, const std::vector<std::string> &paths)
{
    Json::Value checks(Json::arrayValue);
    for (const std::string &path : paths) {
        checks.append(CheckPath(path));
    }
    if (context.json) {
        PrintJson(checks);
        return kSuccess;
    }
    for (const Json::Value &check : checks) {
        PrintCheck(check);
    }
    return kSuccess;
}

int Reindex(const Context &context, const std::vector<std::string> &paths)
{
    const Json::Value request = PathArray(paths);
    ClearLastError();
    if (!IndexMgr::Reindex(request)) {
        return Fail("reindex", "a path's share holds no indexed folder (which logs nothing), or an event could not "
                               "be queued (the system log names it)");
    }
    if (context.json) {
        PrintJson(request);
    } else {
        for (const std::string &path : paths) {
            std::cout << "reindex queued for " << path << "\n";
        }
    }
    return kSuccess;
}

int Upgrade(const Context &context)
{
    ClearLastError();
    if (!Updater_hvx60_beta2()) {
        return Fail("upgrade", "a step (the service, Spotlight, change monitoring or the reindex) failed; the "
                               "system log names it");
    }
    std::vector<Folder> folders;
    if (!ListFolders(folders)) {
        return Fail("upgrade");
    }
    const Json::Value records = RecordsOf(folders);
    if (context.json) {
        PrintJson(records);
    } else if (folders.empty()) {
        std::cout << "nothing is indexed: fileindexd stopped\n";
    } else {
        PrintRecordLines("monitored and queued for reindex:", records);
    }
    return kSuccess;
}

}  // namespace

void AddIndexCommands(CLI::App &app, Context &context)
{
    auto paths = std::make_shared<std::vector<std::string>>();
    AddCommand(app, context, "check",
               "is a path indexed, does it hold indexed folders, may it be indexed, and which rule refuses it",
               [&context, paths]() { return Check(context, *paths); })
        ->add_option("PATH", *paths, "share-relative paths, /<share>/<folder>")
        ->required();

    auto reindexPaths = std::make_shared<std::vector<std::string>>();
    AddCommand(app, context, "reindex",
               "index folders again from scratch (reviving shares that ran out of space)",
               [&context, reindexPaths]() { return Reindex(context, *reindexPaths); })
        ->add_option("PATH", *reindexPaths, "share-relative paths in shares that hold indexed folders")
        ->required();

    AddCommand(app, context, "upgrade",
               "bring the service, Spotlight, change monitoring and the index in line with the folder list, as "
               "after a system upgrade",
               [&context]() { return Upgrade(context); });
}

}  // namespace fileindexctl
