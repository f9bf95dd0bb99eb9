// fileindexctl __complete: the words that may come next on a command line, for the shell's completion.
#include <dirent.h>
#include <sys/stat.h>

#include <algorithm>
#include <iostream>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "commands.h"
#include "fileindex/utils.h"
#include "folder_output.h"
#include "output.h"
#include "records.h"

namespace fileindexctl {

using VEXO::FILEINDEX::Folder;

namespace {

// What a subcommand's positional words are.
enum class Positional { kNone, kFolder, kDirectory, kShare };

const std::map<std::string, Positional> kPositionals = {
    {"folder get", Positional::kFolder},   {"folder set", Positional::kFolder}, {"folder remove", Positional::kFolder},
    {"status", Positional::kFolder},       {"reindex", Positional::kFolder},    {"folder add", Positional::kDirectory},
    {"check", Positional::kDirectory},     {"share remove", Positional::kShare}, {"share rename", Positional::kShare},
    {"share pause", Positional::kShare},   {"share resume", Positional::kShare}, {"share clean", Positional::kShare},
    {"share revive", Positional::kShare},  {"share space", Positional::kShare},  {"share paths", Positional::kShare},
};

std::vector<Folder> IndexedFolders()
{
    std::vector<Folder> folders;
    ListFolders(folders);
    return folders;
}

// The option a word names on command or one of the commands above it.
const CLI::Option *FindOption(const CLI::App *command, const std::string &word)
{
    for (; command != nullptr; command = command->get_parent()) {
        const CLI::Option *option = command->get_option_no_throw(word.substr(0, word.find('=')));
        if (option != nullptr) {
            return option;
        }
    }
    return nullptr;
}

// The values an option takes, for the word typed so far: --sort's keys, --with's keys after those
// already listed before the last comma, on and off for the media switches of folder set.
std::vector<std::string> OptionValues(const CLI::Option &option, const std::string &typed)
{
    const std::string name = option.get_name();
    if (name == "--sort") {
        return kSortKeys;
    }
    if (name == "--with") {
        const size_t comma = typed.rfind(',');
        const std::string listed = comma == std::string::npos ? "" : typed.substr(0, comma + 1);
        std::vector<std::string> values;
        for (const std::string &key : kAdditionalKeys) {
            if (("," + listed).find("," + key + ",") == std::string::npos) {
                values.push_back(listed + key);
            }
        }
        return values;
    }
    if (std::find(kMedia.begin(), kMedia.end(), name.substr(2)) != kMedia.end()) {
        return kSwitchValues;
    }
    return {};
}

// Share-relative directories for the word typed so far: the known shares while the first
// component is typed, then the directories inside the typed directory, each with a trailing "/".
std::vector<std::string> Directories(const std::string &typed)
{
    const size_t slash = typed.rfind('/');
    std::vector<std::string> directories;
    if (slash == 0 || slash == std::string::npos) {
        for (const std::string &share : fileindex_tool::KnownShares(IndexedFolders())) {
            directories.push_back("/" + share + "/");
        }
        return directories;
    }
    const std::string parent = typed.substr(0, slash);
    std::string fullPath;
    if (!VEXO::FILEINDEX::GetFullPath(fullPath, parent)) {
        return directories;
    }
    const std::unique_ptr<DIR, int (*)(DIR *)> directory(opendir(fullPath.c_str()), closedir);
    for (const dirent *entry; directory && (entry = readdir(directory.get())) != nullptr;) {
        const std::string name = entry->d_name;
        struct stat status;
        if (name != "." && name != ".." && lstat((fullPath + "/" + name).c_str(), &status) == 0 &&
            S_ISDIR(status.st_mode)) {
            directories.push_back(parent + "/" + name + "/");
        }
    }
    return directories;
}

std::vector<std::string> PositionalValues(const std::string &command, const std::string &typed)
{
    const auto kind = kPositionals.find(command);
    std::vector<std::string> values;
    switch (kind == kPositionals.end() ? Positional::kNone : kind->second) {
    case Positional::kFolder:
        for (const Folder &folder : IndexedFolders()) {
            values.push_back(folder.m_path);
        }
        return values;
    case Positional::kDirectory: return Directories(typed);
    case Positional::kShare: return fileindex_tool::KnownShares(IndexedFolders());
    case Positional::kNone: break;
    }
    return values;
}

// Prints, one a line, the words that may follow words (the last one being the word typed so far,
// possibly empty) and begin with it.
int Complete(const CLI::App &app, const std::vector<std::string> &words)
{
    const std::string typed = words.empty() ? "" : words.back();
    const CLI::App *command = &app;
    std::string commandName;  // "folder add"
    const CLI::Option *pending = nullptr;  // the option whose value is typed
    for (size_t i = 0; i + 1 < words.size(); ++i) {
        const std::string &word = words[i];
        if (pending != nullptr) {
            pending = nullptr;
        } else if (word.rfind("-", 0) == 0) {
            const CLI::Option *option = FindOption(command, word);
            pending = option != nullptr && option->get_expected_min() > 0 && word.find('=') == std::string::npos
                          ? option
                          : nullptr;
        } else {
            for (const CLI::App *subcommand : command->get_subcommands({})) {
                if (subcommand->get_name() == word) {
                    command = subcommand;
                    commandName += (commandName.empty() ? "" : " ") + word;
                }
            }
        }
    }
    std::vector<std::string> candidates;
    if (pending != nullptr) {
        candidates = OptionValues(*pending, typed);
    } else if (typed.rfind("-", 0) == 0) {
        for (const CLI::Option *option : command->get_options()) {
            for (const std::string &name : option->get_lnames()) {
                candidates.push_back("--" + name);
            }
        }
    } else if (!command->get_subcommands({}).empty()) {
        for (const CLI::App *subcommand : command->get_subcommands({})) {
            if (!subcommand->get_group().empty()) {
                candidates.push_back(subcommand->get_name());
            }
        }
    } else {
        candidates = PositionalValues(commandName, typed);
    }
    std::sort(candidates.begin(), candidates.end());
    for (const std::string &candidate : candidates) {
        if (candidate.compare(0, typed.size(), typed) == 0) {
            std::cout << candidate << "\n";
        }
    }
    return kSuccess;
}

}  // namespace

void AddCompleteCommand(CLI::App &app, Context &context)
{
    auto words = std::make_shared<std::vector<std::string>>();
    CLI::App *complete = app.add_subcommand("__complete", "the words that may come next, for the shell")->group("");
    complete->add_option("WORDS", *words, "the command line after the program's name, the last word as typed so far");
    complete->callback([&app, &context, words]() { context.action = [&app, words]() { return Complete(app, *words); }; });
}

}  // namespace fileindexctl
