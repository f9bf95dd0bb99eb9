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

struct ListOptions {
    unsigned long offset = 0;
    unsigned long limit = 1000;
    std::string sortBy = "path";
    bool descending = false;
    std::vector<std::string> additional;
};

int List(const Context &context, const ListOptions &options)
{
    Json::Value additional(Json::arrayValue);
    for (const std::string &key : options.additional) {
        additional.append(key);
    }
    ClearLastError();
    Json::Value page;
    if (!IndexMgr::List(page, options.offset, options.limit, options.sortBy, options.descending ? "DESC" : "",
                        additional)) {
        return Fail("folder list");
    }
    if (context.json) {
        PrintJson(page);
        return kSuccess;
    }
    std::vector<std::string> header{"PATH", "NAME", "MEDIA"};
    for (const std::string &key : options.additional) {
        header.push_back(key == "status" ? "STATUS" : "VALID");
    }
    Table table(header);
    for (const Json::Value &record : page["folder"]) {
        std::vector<std::string> row{record["path"].asString(), record["name"].asString(), MediaText(record)};
        for (const std::string &key : options.additional) {
            const Json::Value &value = record["additional"][key];
            row.push_back(value.isBool() ? YesNo(value.asBool()) : value.asString());
        }
        table.Add(row);
    }
    table.Print();
    std::cout << page["folder"].size() << " of " << page["total"].asUInt64() << " folders";
    if (options.offset != 0) {
        std::cout << ", from offset " << options.offset;
    }
    std::cout << "\n";
    return kSuccess;
}

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

    auto list = std::make_shared<ListOptions>();
    CLI::App *listCommand = AddCommand(*folder, context, "list", "list the indexed folders, a page at a time",
                                       [&context, list]() { return List(context, *list); });
    listCommand->add_option("--offset", list->offset, "skip this many folders of the sorted list")
        ->capture_default_str();
    listCommand->add_option("--limit", list->limit, "list at most this many folders")->capture_default_str();
    listCommand->add_option("--sort", list->sortBy, "sort by name, path, or a media flag (folders without it first)")
        ->check(CLI::IsMember({"name", "path", "document", "audio", "video", "photo"}))
        ->capture_default_str();
    listCommand->add_flag("--desc", list->descending,
                          "descending order; an offset then only shortens the page, as the library pages");
    listCommand->add_option("--with", list->additional, "additional columns: status, is_valid (comma-separated)")
        ->delimiter(',')
        ->check(CLI::IsMember({"status", "is_valid"}));

    auto path = std::make_shared<std::string>();
    AddCommand(*folder, context, "get", "show one folder's setting (read under the folder lock)",
               [&context, path]() { return Get(context, *path); })
        ->add_option("PATH", *path, "share-relative path of an indexed folder, /<share>/<folder>")
        ->required();
}

}  // namespace fileindexctl
