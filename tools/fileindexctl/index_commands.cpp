// fileindexctl check: what the index makes of a path.
#include <iostream>
#include <memory>
#include <string>
#include <vector>

#include "commands.h"
#include "fileindex/index_mgr.h"
#include "fileindex/utils.h"
#include "output.h"

namespace fileindexctl {

using namespace VEXO::FILEINDEX;

namespace {

// Whether the path is indexed or holds indexed folders, and which rules, if any, refuse it as a
// folder to index and as an entry the crawler meets: the library's own rules and their words.
Json::Value CheckPath(const std::string &path)
{
    Json::Value check;
    check["path"] = path;
    std::string fullPath;
    check["full_path"] = GetFullPath(fullPath, path) ? Json::Value(fullPath) : Json::Value();
    check["indexed"] = IndexMgr::IsPathIndexed(path);
    check["contains_indexed"] = IndexMgr::IsPathContainIndexed(path);
    const IndexRefusal refusal = GetPathIndexRefusal(path);
    check["may_be_indexed"] = refusal == IndexRefusal::kNone;
    check["refusal"] = IndexRefusalName(refusal);
    check["refusal_text"] = IndexRefusalText(refusal);
    const IndexRefusal skip = fullPath.empty() ? IndexRefusal::kPathUnresolved : GetSkipIndexRefusal(fullPath);
    check["crawler_skips"] = skip != IndexRefusal::kNone;
    check["skip_refusal"] = IndexRefusalName(skip);
    check["skip_refusal_text"] = IndexRefusalText(skip);
    return check;
}

void PrintCheck(const Json::Value &check)
{
    std::cout << check["path"].asString() << "\n";
    if (!check["full_path"].isNull()) {
        std::cout << "  full path:          " << check["full_path"].asString() << "\n";
    }
    std::cout << "  indexed:            " << YesNo(check["indexed"].asBool()) << "\n"
              << "  holds indexed:      " << YesNo(check["contains_indexed"].asBool()) << "\n"
              << "  may be indexed:     "
              << (check["may_be_indexed"].asBool() ? "yes" : "no, " + check["refusal_text"].asString()) << "\n"
              << "  crawler:            "
              << (check["crawler_skips"].asBool() ? "skips it, " + check["skip_refusal_text"].asString() : "keeps it")
              << "\n";
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

}  // namespace

void AddIndexCommands(CLI::App &app, Context &context)
{
    auto paths = std::make_shared<std::vector<std::string>>();
    AddCommand(app, context, "check",
               "is a path indexed, does it hold indexed folders, may it be indexed, and which rule refuses it",
               [&context, paths]() { return Check(context, *paths); })
        ->add_option("PATH", *paths, "share-relative paths, /<share>/<folder>")
        ->required();
}

}  // namespace fileindexctl
