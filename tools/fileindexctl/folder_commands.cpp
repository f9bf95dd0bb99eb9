// fileindexctl folder list|get|add|set|remove: the folder list.
#include <algorithm>
#include <array>
#include <iostream>
#include <memory>
#include <string>
#include <vector>

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

using fileindex_tool::ClearLastError;
using fileindex_tool::Failure;
using fileindex_tool::kFolderListLock;
using fileindex_tool::LibraryFailure;
using fileindex_tool::TerminalText;
using VEXO::FILEINDEX::Folder;
using VEXO::FILEINDEX::IndexMgr;

namespace {

const char kFollowUpHint[] = "a step that sets no error code failed (an empty path, or after folder.conf was saved: "
                             "change monitoring, the service start, a daemon command, an event); the system log "
                             "names it";
const char kReadHint[] = "the library recorded no reason; the system log has its line";
const char kSaved[] = "folder.conf is saved";

constexpr size_t kMediaCount = 4;

// What folder add and folder set put into the library's request.
struct SettingOptions {
    std::vector<std::string> paths;
    std::string name;
    std::array<bool, kMediaCount> media = {};           // the value given for each medium
    std::array<CLI::Option *, kMediaCount> given = {};  // whether it was given at all
    CLI::Option *nameGiven = nullptr;
    bool force = false;  // --force: store paths that do not exist or may not be indexed
};

// The last component of a normalised share-relative path: what a new folder is called unless named.
std::string LastComponent(const std::string &path)
{
    return path.substr(path.find_last_of('/') + 1);
}

// Each path's share exists; without --force the path exists too and may be indexed, by the rules
// and with the words of fileindexctl check.
bool CheckSettingPaths(const std::string &what, const SettingOptions &options, Failure &failure)
{
    for (const std::string &path : options.paths) {
        std::string share;
        VEXO::FILEINDEX::GetShareNameByPath(share, path);
        const bool accepted = options.force ? fileindex_tool::CheckShareExists(what, share, failure)
                                            : fileindex_tool::CheckPathExists(what, path, failure) &&
                                                  fileindex_tool::CheckMayBeIndexed(what, path, failure);
        if (!accepted) {
            return false;
        }
    }
    return true;
}

// One request element per path: "path", and the name and media the command line gave; folder add
// also names every new folder and leaves no medium unset.
Json::Value SettingRequest(const SettingOptions &options, bool adding)
{
    Json::Value request(Json::arrayValue);
    for (const std::string &path : options.paths) {
        Json::Value element;
        element["path"] = path;
        if (options.nameGiven->count() != 0 || adding) {
            element["name"] = options.nameGiven->count() != 0 ? options.name : LastComponent(path);
        }
        for (size_t i = 0; i < kMedia.size(); ++i) {
            if (options.given[i]->count() != 0 || adding) {
                element[kMedia[i]] = options.media[i];
            }
        }
        request.append(element);
    }
    return request;
}

// Prints the stored records of paths after a change: "changed" for those already in before, the
// folder list read before the change, "added" for the others.
int ShowStored(const Context &context, const std::string &what, const std::vector<std::string> &paths,
               const std::vector<Folder> &before)
{
    std::vector<Folder> folders;
    ClearLastError();
    if (!ListFolders(folders)) {
        return Report(context, LibraryFailure(what, kReadHint));
    }
    const std::vector<Folder> stored = FoldersAt(folders, paths);
    if (context.json) {
        PrintJson(fileindex_tool::FolderRecords(stored));
        return kSuccess;
    }
    for (const Folder &folder : stored) {
        PrintFolderLines(FoldersAt(before, {folder.m_path}).empty() ? "added" : "changed", {folder});
    }
    return kSuccess;
}

int Add(const Context &context, SettingOptions &options)
{
    Failure failure;
    if (!TakePaths(context, "folder add", options.paths, failure) ||
        !CheckSettingPaths("folder add", options, failure)) {
        return Report(context, failure);
    }
    std::vector<Folder> before;
    ClearLastError();
    if (!ListFolders(before)) {
        return Report(context, LibraryFailure("folder add", kReadHint));
    }
    const Json::Value request = SettingRequest(options, true);
    if (!RunWaiting(context, &kFolderListLock, "folder add", kFollowUpHint, [&request]() { return IndexMgr::Add(request); },
                    failure, kSaved)) {
        return Report(context, failure);
    }
    return ShowStored(context, "folder add", options.paths, before);
}

// Changes what the command line gives of a folder already in the list; an unknown path fails with
// the library's FILEIDX_ERR_NO_SUCH_FOLDER instead of being added. The path is checked as folder add
// checks it.
int Set(const Context &context, SettingOptions &options)
{
    Failure failure;
    if (!TakePaths(context, "folder set", options.paths, failure)) {
        return Report(context, failure);
    }
    const bool anyGiven = options.nameGiven->count() != 0 ||
                          std::any_of(options.given.begin(), options.given.end(),
                                      [](const CLI::Option *option) { return option->count() != 0; });
    if (!anyGiven) {
        return Report(context, fileindex_tool::ToolFailure(
                                   fileindex_tool::FailureKind::kInvalid, Failure::kNoCode,
                                   "folder set: nothing to change; give --name, or --document, --audio, --video or "
                                   "--photo with on or off"));
    }
    Json::Value record;
    const std::string what = "folder set " + TerminalText(options.paths.front());
    const Json::Value request = SettingRequest(options, false);
    if (!RunWaiting(context, &kFolderListLock, what, kReadHint,
                    [&record, &options]() { return IndexMgr::Get(record, options.paths.front()); }, failure) ||
        !CheckSettingPaths(what, options, failure) ||
        !RunWaiting(context, &kFolderListLock, what, kFollowUpHint, [&request]() { return IndexMgr::Set(request); },
                    failure, kSaved)) {
        return Report(context, failure);
    }
    Folder existing;
    existing.m_path = options.paths.front();
    return ShowStored(context, "folder set", options.paths, {existing});
}

int Remove(const Context &context, std::vector<std::string> &paths)
{
    Failure failure;
    if (!TakePaths(context, "folder remove", paths, failure)) {
        return Report(context, failure);
    }
    ClearLastError();
    std::vector<Folder> before;
    if (!ListFolders(before)) {
        return Report(context, LibraryFailure("folder remove", kReadHint));
    }
    for (const std::string &path : paths) {
        if (FoldersAt(before, {path}).empty()) {
            return Report(context, fileindex_tool::NotInFolderList("folder remove", path));
        }
    }
    const Json::Value request = PathArray(paths);
    if (!RunWaiting(context, &kFolderListLock, "folder remove", kFollowUpHint,
                    [&request]() { return IndexMgr::Delete(request); }, failure, kSaved)) {
        return Report(context, failure);
    }
    const std::vector<Folder> removed = FoldersAt(before, paths);
    if (context.json) {
        PrintJson(fileindex_tool::FolderRecords(removed));
    } else {
        PrintFolderLines("removed", removed);
    }
    return kSuccess;
}

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
        return Report(context, LibraryFailure("folder list", kReadHint));
    }
    if (context.json) {
        PrintJson(fileindex_tool::FolderPage(std::move(page)));
        return kSuccess;
    }
    std::vector<std::string> header{"PATH", "NAME", "MEDIA"};
    for (const std::string &key : options.additional) {
        header.push_back(key == "status" ? "STATUS" : "VALID");
    }
    Table table(header);
    for (const Json::Value &record : page["folder"]) {
        std::vector<std::string> row{TerminalText(record["path"].asString()), TerminalText(record["name"].asString()),
                                     MediaText(record)};
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

int Get(const Context &context, std::vector<std::string> &paths)
{
    Failure failure;
    if (!TakePaths(context, "folder get", paths, failure)) {
        return Report(context, failure);
    }
    const std::string &path = paths.front();
    Json::Value record;
    if (!RunWaiting(context, &kFolderListLock, "folder get " + TerminalText(path), kReadHint,
                    [&record, &path]() { return IndexMgr::Get(record, path); }, failure)) {
        return Report(context, failure);
    }
    if (context.json) {
        PrintJson(fileindex_tool::FolderRecord(record));
    } else {
        PrintFolder(record);
    }
    return kSuccess;
}

// folder add and folder set: the paths, --name, and one option per medium, a flag when adding and
// an on/off value when setting.
void AddSettingCommand(CLI::App &folder, Context &context, bool adding)
{
    auto options = std::make_shared<SettingOptions>();
    CLI::App *command =
        adding ? AddCommand(folder, context, "add",
                            "index folders for the media given (the others off); starts fileindexd if needed",
                            [&context, options]() { return Add(context, *options); })
               : AddCommand(folder, context, "set", "change the name or media of an indexed folder",
                            [&context, options]() { return Set(context, *options); });
    AddWaitOption(*command, context);
    if (adding) {
        AddPaths(*command, context, options->paths, "share-relative paths, /<share>/<folder>")->required();
        options->nameGiven = command->add_option("--name", options->name, "display name (default: the folder's name)");
    } else {
        AddPaths(*command, context, options->paths, "share-relative path of an indexed folder")
            ->required()
            ->expected(1);
        options->nameGiven = command->add_option("--name", options->name, "display name");
    }
    command->add_flag("--force", options->force,
                      "store the path even when it does not exist or may not be indexed (its share must exist)");
    for (size_t i = 0; i < kMedia.size(); ++i) {
        const std::string flag = "--" + kMedia[i];
        options->given[i] = adding ? command->add_flag(flag, options->media[i], "index " + kMedia[i])
                                   : command->add_option(flag, options->media[i],
                                                         "index " + kMedia[i] + ": on or off")
                                         ->type_name("on|off");
    }
}

}  // namespace

void AddFolderCommands(CLI::App &app, Context &context)
{
    CLI::App *folder = app.add_subcommand("folder", "the indexed folders: list, get, add, set, remove");
    folder->require_subcommand(1);
    AddJsonFlag(*folder, context);

    auto list = std::make_shared<ListOptions>();
    CLI::App *listCommand = AddCommand(*folder, context, "list", "list the indexed folders, a page at a time",
                                       [&context, list]() { return List(context, *list); });
    listCommand->add_option("--offset", list->offset, "skip this many folders of the sorted list")
        ->check(NumberFrom(0, 1000000, "a whole number", true))
        ->capture_default_str();
    listCommand->add_option("--limit", list->limit, "list at most this many folders")
        ->check(NumberFrom(0, 1000000, "a whole number", true))
        ->capture_default_str();
    listCommand->add_option("--sort", list->sortBy, "sort by name, path, or a media flag (folders without it first)")
        ->check(CLI::IsMember(kSortKeys))
        ->capture_default_str();
    listCommand->add_flag("--desc", list->descending,
                          "descending order; an offset then only shortens the page, as the library pages");
    listCommand->add_option("--with", list->additional, "additional columns: status, is_valid (comma-separated)")
        ->delimiter(',')
        ->check(CLI::IsMember(kAdditionalKeys));

    auto path = std::make_shared<std::vector<std::string>>();
    CLI::App *get = AddCommand(*folder, context, "get", "show one folder's setting (read under the folder lock)",
                               [&context, path]() { return Get(context, *path); });
    AddWaitOption(*get, context);
    AddPaths(*get, context, *path, "share-relative path of an indexed folder, /<share>/<folder>")
        ->required()
        ->expected(1);

    AddSettingCommand(*folder, context, true);
    AddSettingCommand(*folder, context, false);

    auto paths = std::make_shared<std::vector<std::string>>();
    CLI::App *remove =
        AddCommand(*folder, context, "remove",
                   "stop indexing folders; the last one stops fileindexd, a share's last one wipes its index",
                   [&context, paths]() { return Remove(context, *paths); });
    AddWaitOption(*remove, context);
    AddPaths(*remove, context, *paths, "share-relative paths of indexed folders")->required();
}

}  // namespace fileindexctl
