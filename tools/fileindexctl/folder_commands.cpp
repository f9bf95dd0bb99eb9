// fileindexctl folder list|get|add|set|remove: the folder list.
#include <iostream>
#include <memory>
#include <string>
#include <vector>

#include "commands.h"
#include "fileindex/index_mgr.h"
#include "output.h"
#include "records.h"

namespace fileindexctl {

using VEXO::FILEINDEX::IndexMgr;

namespace {

int Get(const Context &context, const std::string &path)
{
    ClearLastError();
    Json::Value record;
    if (!IndexMgr::Get(record, path)) {
        return Fail("folder get " + path);
    }
    if (context.json) {
        PrintJson(record);
    } else {
        PrintRecord(record);
    }
    return kSuccess;
}

}  // namespace

void AddFolderCommands(CLI::App &app, Context &context)
{
    CLI::App *folder = app.add_subcommand("folder", "the indexed folders: list, get, add, set, remove");
    folder->require_subcommand(1);

    auto path = std::make_shared<std::string>();
    AddCommand(*folder, context, "get", "show one folder's setting (read under the folder lock)",
               [&context, path]() { return Get(context, *path); })
        ->add_option("PATH", *path, "share-relative path of an indexed folder, /<share>/<folder>")
        ->required();
}

}  // namespace fileindexctl
