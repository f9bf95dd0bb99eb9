// fileindexctl as a user runs it: a process, its standard output, standard error and exit status.
#include <fcntl.h>
#include <signal.h>
#include <sys/file.h>
#include <sys/ioctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <regex>
#include <string>
#include <vector>

#include "config/json_io.h"
#include "platform/service.h"
#include "tests/support/child.h"
#include "tests/support/frame_listener.h"
#include "tests/support/sandbox.h"
#include "tests/support/spawn.h"

namespace fileindex_test {
namespace {

const std::string kFolderConf = FILEINDEX_FOLDER_CONF_PATH;
constexpr int kRunLimitMilliseconds = 20000;

struct Outcome {
    int status;
    std::string out;
    std::string err;
};

// How a run sees the world besides its arguments: its standard input and output on a terminal (a
// pseudo-terminal of rows lines with TERM=term, where input is typed) or a file and nothing, and
// whether it is interrupted (SIGINT) after a while.
struct Setting {
    bool terminal = false;
    std::string term;
    unsigned short rows = 24;
    int interruptAfterMilliseconds = -1;
    std::string input;
};

class FileindexctlTest : public SandboxTest {
protected:
    void SetUp() override
    {
        SandboxTest::SetUp();
        DeclareShares("volume1/photo volume2/music");
    }

    // A stand-in daemon a test started through the service start does not outlive the test.
    void TearDown() override { VLIBServiceStop("fileindexd", 1); }

    // Runs fileindexctl with args, its output and error streams going to files of the sandbox (or
    // the terminal's output to out). A run that hangs is ended after a time limit, and then reads as
    // killed.
    static Outcome Ctl(const std::vector<std::string> &args, const Setting &setting = Setting())
    {
        const std::string out = HostPath("/ctl.out"), err = HostPath("/ctl.err");
        int terminal = -1;
        if (setting.terminal) {
            terminal = posix_openpt(O_RDWR | O_NOCTTY | O_NONBLOCK);
            const struct winsize size = {setting.rows, 80, 0, 0};
            EXPECT_TRUE(terminal >= 0 && grantpt(terminal) == 0 && unlockpt(terminal) == 0 &&
                        ioctl(terminal, TIOCSWINSZ, &size) == 0);
        }
        const std::string typed = setting.terminal ? ptsname(terminal) : "/dev/null";
        const pid_t pid = SpawnProgram(
            FILEINDEXCTL, args,
            {Redirect::File(STDOUT_FILENO, setting.terminal ? typed : out,
                            setting.terminal ? O_RDWR | O_NOCTTY : O_WRONLY | O_CREAT | O_TRUNC),
             Redirect::File(STDERR_FILENO, err, O_WRONLY | O_CREAT | O_TRUNC),
             Redirect::File(STDIN_FILENO, typed, setting.terminal ? O_RDWR | O_NOCTTY : O_RDONLY)},
            {"TERM=" + setting.term});
        if (terminal >= 0) {
            EXPECT_EQ(write(terminal, setting.input.data(), setting.input.size()),
                      static_cast<ssize_t>(setting.input.size()));
        }
        std::string shown;
        const auto readTerminal = [terminal, &shown]() {
            char buffer[4096];
            for (ssize_t got; terminal >= 0 && (got = read(terminal, buffer, sizeof(buffer))) > 0;) {
                shown.append(buffer, static_cast<size_t>(got));
            }
        };
        int status = 0;
        for (int waited = 0; waitpid(pid, &status, WNOHANG) == 0; ++waited) {
            if (waited * 10 == setting.interruptAfterMilliseconds) {
                kill(pid, SIGINT);
            }
            if (waited == kRunLimitMilliseconds / 10) {
                kill(pid, SIGKILL);
            }
            readTerminal();
            usleep(10000);
        }
        readTerminal();
        if (terminal >= 0) {
            close(terminal);
        }
        return {WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status),
                setting.terminal ? shown : ReadFile(out), ReadFile(err)};
    }
};

// A failing call prints exactly one line on standard error that says what failed, what it means and
// what to try, names the library's error code when there is one and never "error 0", and exits with
// the status of its kind; standard output stays empty, or holds only the same error as the error
// object with --json. An unknown share, path or folder is one status (4) and one shape everywhere.
TEST_F(FileindexctlTest, AFailedCallPrintsOneLineNamingItsErrorCode)
{
    WriteFile(kFolderConf, R"({"/photo/a":{"path":"/photo/a","name":"A"}})");
    stdfs::create_directories(SharePath("photo") + "/a");
    const std::string noShare = "share nosuch does not exist; the share database has no share of that name";
    struct Row {
        std::vector<std::string> args;
        int status;
        std::string line;  // regular expression for the one line on standard error
    } rows[] = {
        {{"folder", "get", "/photo/b"}, 4,
         "folder get /photo/b: the folder is not in the folder list; .* \\(FILEIDX_ERR_NO_SUCH_FOLDER\\)"},
        {{"folder", "set", "/photo/b", "--audio", "on"}, 4,
         "folder set /photo/b: the folder is not in the folder list; .* \\(FILEIDX_ERR_NO_SUCH_FOLDER\\)"},
        {{"folder", "remove", "/photo/a", "/photo/b"}, 4,
         "folder remove: /photo/b is not in the folder list; .* \\(FILEIDX_ERR_NO_SUCH_FOLDER\\)"},
        {{"folder", "add", "/nosuch/a"}, 4, "folder add: " + noShare + " \\(FILEIDX_ERR_PATH\\)"},
        {{"folder", "add", "/photo/nonexistent"}, 4,
         "folder add: /photo/nonexistent does not exist; .* \\(FILEIDX_ERR_PATH\\)"},
        {{"status", "/nosuch"}, 4, "status: " + noShare + " \\(FILEIDX_ERR_PATH\\)"},
        {{"status", "/music"}, 4, "status: /music is not an indexed folder, nor inside or above one; .*"},
        {{"reindex", "/photo/nonexistent"}, 4, "reindex: /photo/nonexistent does not exist; .*"},
        {{"reindex", "/music"}, 4,
         "reindex: /music is not an indexed folder, nor inside or above one; .* \\(FILEIDX_ERR_NO_SUCH_FOLDER\\)"},
        {{"share", "remove", "nosuch"}, 4,
         "share remove nosuch: share nosuch does not exist and holds no folder settings; .* \\(FILEIDX_ERR_PATH\\)"},
        {{"share", "rename", "nosuch", "music"}, 4, "share rename nosuch music: share nosuch does not exist and .*"},
        {{"share", "rename", "photo", "nosuch"}, 4, "share rename photo nosuch: " + noShare + " .*"},
        {{"share", "revive", "nosuch"}, 4, "share revive nosuch: " + noShare + " .*"},
        {{"share", "pause", "nosuch"}, 4, "share pause nosuch: " + noShare + " .*"},
        {{"share", "resume", "nosuch"}, 4, "share resume nosuch: " + noShare + " .*"},
        {{"share", "clean", "nosuch"}, 4, "share clean nosuch: " + noShare + " .*"},
        {{"share", "space", "nosuch"}, 4, "share space nosuch: " + noShare + " .*"},
        {{"share", "paths", "nosuch"}, 4, "share paths nosuch: " + noShare + " .*"},
        {{"pause", "--hours", "-1"}, 2, "pause --hours: -1 hours is negative; .*"},
        {{"folder", "set", "/photo/a"}, 2, "folder set: nothing to change; give --name, or .*"},
        {{"pause", "--hours", "100000"}, 2,
         "pause --hours: a pause of 100000 hours would end after 2038-01-19 03:14:07 UTC, the last time "
         "status.conf can hold; the largest is [0-9]+ hours \\(until 2038-01-19 .*\\), or 0 to pause until resumed"},
        // Saved, but fileindexd could not be told: status 5, what stands and what to do.
        {{"resume"}, 5, "resume: fileindexd was not told: no socket at .*: the indexing service is not running; "
                        "status.conf is saved; start the indexing service, then run the same command again"},
        {{"folder", "add", "/photo/a"}, 5, "folder add: fileindexd was not told: no socket at .*; folder.conf is "
                                           "saved; start .*"},
        {{"share", "pause", "photo"}, 5, "share pause photo: fileindexd was not told: .*; nothing changed; start .*"},
    };
    for (const Row &row : rows) {
        const Outcome outcome = Ctl(row.args);
        SCOPED_TRACE(row.line);
        EXPECT_EQ(outcome.status, row.status);
        EXPECT_EQ(outcome.out, "");
        EXPECT_TRUE(std::regex_match(outcome.err, std::regex("fileindexctl: " + row.line + "\n"))) << outcome.err;
        EXPECT_EQ(outcome.err.find("error 0"), std::string::npos);
        std::vector<std::string> jsonArgs = row.args;
        jsonArgs.push_back("--json");
        const Json::Value error = ParseJson(Ctl(jsonArgs).out)["error"];
        const std::string named = error["name"].isNull() ? "" : " (" + error["name"].asString() + ")";
        EXPECT_TRUE(std::regex_match(error["message"].asString() + named, std::regex(row.line)));
    }
    // A wrong command line is not the library's failure: status 2, and one line all the same.
    const struct Usage {
        std::vector<std::string> args;
        std::string line;  // regular expression
    } usages[] = {
        {{"folder", "get"}, "[^\n]*PATH[^\n]*"},
        {{"status", "--watch", "--interval", "0"}, "--interval: '0' is not a number of seconds from 0.05 to 3600"},
        {{"folder", "list", "--limit", "-1"}, "--limit: '-1' is not a whole number from 0 to 1000000"},
        {{"foldr", "list"}, "unknown command 'foldr'; did you mean 'folder'\\?"},
        {{"--wait", "1", "share", "revie", "photo"}, "unknown command 'revie' of 'share'; did you mean 'revive'\\?"},
    };
    for (const Usage &usage : usages) {
        const Outcome outcome = Ctl(usage.args);
        EXPECT_EQ(outcome.status, 2);
        EXPECT_TRUE(std::regex_match(outcome.err, std::regex("fileindexctl: " + usage.line + " \\(see --help\\)\n")))
            << outcome.err;
        std::vector<std::string> jsonArgs = usage.args;
        jsonArgs.push_back("--json");
        EXPECT_TRUE(std::regex_match(ParseJson(Ctl(jsonArgs).out)["error"]["message"].asString(),
                                     std::regex(usage.line + " \\(see --help\\)")));
    }
    EXPECT_EQ(ParseJson(ReadFile(kFolderConf)).getMemberNames(), std::vector<std::string>{"/photo/a"});
}

// The end of a timed pause is stored in 32 bits: the longest pause the refusal names still ends
// after now, where one hour more would have wrapped to 1901.
TEST_F(FileindexctlTest, TheLongestPauseTheRefusalNamesEndsInTheFuture)
{
    FrameListener daemon;
    const std::string refused = Ctl({"pause", "--hours", "200000"}).err;
    std::smatch largest;
    ASSERT_TRUE(std::regex_search(refused, largest, std::regex("the largest is ([0-9]+) hours")));
    EXPECT_EQ(Ctl({"pause", "--hours", largest[1]}).status, 0);
    EXPECT_GT(ParseJson(ReadFile(FILEINDEX_STATUS_CONF_PATH))["resume_time"].asInt64(), time(nullptr));
}

// A folder is stored under its normalised path, and only when it exists and may be indexed, as
// check says, unless --force: no duplicates through a trailing "/", no folders that can never finish.
TEST_F(FileindexctlTest, FolderPathsAreCheckedBeforeTheyAreSaved)
{
    FrameListener daemon;
    for (const char *folder : {"/holiday", "/#recycle"}) {
        stdfs::create_directories(SharePath("photo") + folder);
    }
    const std::string refusal = ParseJson(Ctl({"check", "/photo/#recycle", "--json"}).out)[0]["refusal_text"].asString();
    const struct Row {
        std::vector<std::string> args;
        int status;
        std::string error;  // a part of standard error
    } rows[] = {
        {{"folder", "add", "/photo/holiday/", "--photo"}, 0, ""},
        {{"folder", "add", "/photo/./holiday"}, 2, "has a \".\" or \"..\" component"},
        {{"folder", "add", "/photo/../music"}, 2, "has a \".\" or \"..\" component"},
        {{"folder", "add", "/photo//holiday"}, 2, "has an empty component"},
        {{"folder", "add", "photo/holiday"}, 2, "is not a share-relative path"},
        {{"folder", "add", "/photo/" + std::string(100000, 'x')}, 2, "longer than the 4095 bytes"},
        {{"folder", "add", "/photo/#recycle"}, 3, "folder add: /photo/#recycle may not be indexed: " + refusal + ";"},
        {{"folder", "add", "/photo/#recycle", "--force"}, 0, ""},
        {{"folder", "add", "/photo/nonexistent", "--force"}, 0, ""},
        {{"folder", "add", "/nosuch/a", "--force"}, 4, "share nosuch does not exist"},
        {{"folder", "set", "/photo/holiday/", "--name", "Holiday"}, 0, ""},
        {{"folder", "set", "/photo/#recycle", "--name", "Bin"}, 3, "may not be indexed: " + refusal},
        {{"folder", "set", "/photo/#recycle", "--name", "Bin", "--force"}, 0, ""},
        {{"folder", "set", "/photo/./holiday", "--name", "X"}, 2, "has a \".\" or \"..\" component"},
    };
    for (const Row &row : rows) {
        const Outcome outcome = Ctl(row.args);
        SCOPED_TRACE(row.args[1] + " " + row.args[2].substr(0, 40));
        EXPECT_EQ(outcome.status, row.status) << outcome.err;
        EXPECT_NE(outcome.err.find(row.error), std::string::npos) << outcome.err;
    }
    const Json::Value conf = ParseJson(ReadFile(kFolderConf));
    EXPECT_EQ(conf.getMemberNames(), (std::vector<std::string>{"/photo/#recycle", "/photo/holiday", "/photo/nonexistent"}));
    EXPECT_EQ(conf["/photo/holiday"]["name"], "Holiday");
    EXPECT_EQ(conf["/photo/#recycle"]["name"], "Bin");
}

// status --watch while indexing is paused with work pending, as a person sees it: on a terminal it
// redraws on the alternate screen (nothing piles up in the scrollback), each drawing cut to the
// window with the summary first, and leaves the whole status behind; on TERM=dumb or a file it
// prints plain lines. Either way it says why it waits, and Ctrl-C ends it with 130.
TEST_F(FileindexctlTest, StatusWatchRedrawsInPlaceOnlyOnATerminal)
{
    Json::Value conf(Json::objectValue);
    for (int i = 10; i < 40; ++i) {
        const std::string path = "/photo/f" + std::to_string(i);
        stdfs::create_directories(SharePath("photo") + path.substr(6));
        conf[path]["name"] = path.substr(7);
    }
    WriteFile(kFolderConf, VEXO::FILEINDEX::toString(conf));
    stdfs::create_directories(SharePath("photo") + "/@eaDir");
    WriteFile(SharePath("photo") + "/@eaDir/VEXO@file_index_queue",
              "{\"event\":131072,\"path\":\"" + SharePath("photo") + "/f10/a.jpg\",\"data\":null}\n");
    WriteFile(FILEINDEX_STATUS_CONF_PATH, R"({"resume_time":0})");
    const std::string summary = "indexing: paused until resumed\n"
                                "fileindexd: not reachable: no socket at [^\\n]*\n"
                                "30 folders: 29 finished, 0 processing, 1 paused, 0 out of space\n"
                                "waiting: indexing is paused until resumed; 'fileindexctl resume' resumes it\n";
    const std::string table = "FOLDER +STATUS\n/photo/f10 +paused\n(/photo/f[1-3][0-9] +finished\n){29}";
    const struct Row {
        Setting setting;
        std::string shown;  // regular expression for what standard output received, without "\r"
    } rows[] = {
        {{true, "xterm", 8, 400, ""},
         "\x1b\\[\\?1049h\x1b\\[\\?7l\x1b\\[\\?25l(\x1b\\[H" + std::regex_replace(summary, std::regex("\n"), "\x1b\\[K\n") +
             "FOLDER +STATUS\x1b\\[K\n/photo/f10 +paused\x1b\\[K\n\\.\\.\\. 29 more lines; a taller window shows "
             "them\x1b\\[K\n\x1b\\[J)+"
             "\x1b\\[\\?25h\x1b\\[\\?7h\x1b\\[\\?1049l" + summary + table},
        {{true, "dumb", 8, 400, ""}, "[0-9:]{8} " + std::regex_replace(summary, std::regex("\n(.)"), "; $1") + summary + table},
        {{false, "xterm", 24, 400, ""}, "[0-9:]{8} " + std::regex_replace(summary, std::regex("\n(.)"), "; $1") + summary + table},
    };
    for (const Row &row : rows) {
        SCOPED_TRACE(row.setting.term + (row.setting.terminal ? " terminal" : " file"));
        const Outcome watched = Ctl({"status", "--watch", "--interval", "0.05"}, row.setting);
        EXPECT_EQ(watched.status, 130);
        const std::string shown = std::regex_replace(watched.out, std::regex("\r"), "");
        EXPECT_TRUE(std::regex_match(shown, std::regex(row.shown))) << shown;
    }
}

// The command line as a new user types it: --json anywhere, "changed" for a folder that was there,
// check's status for a path that may not be indexed, and share clean that asks before it wipes.
TEST_F(FileindexctlTest, TheCommandLineAsANewUserTypesIt)
{
    FrameListener daemon;
    stdfs::create_directories(SharePath("photo") + "/a");
    WriteFile(kFolderConf, R"({"/photo/a":{"path":"/photo/a","name":"A"}})");
    const std::string listed = Ctl({"folder", "list", "--json"}).out;
    EXPECT_EQ(ParseJson(listed)["total"], 1);
    EXPECT_EQ(Ctl({"--json", "folder", "list"}).out, listed);
    EXPECT_EQ(Ctl({"folder", "--json", "list"}).out, listed);
    EXPECT_EQ(Ctl({"folder", "add", "/photo/a", "--photo"}).out, "changed /photo/a (\"a\", photo)\n");

    const Outcome check = Ctl({"check", "/photo/a", "/photo/#recycle", "--json"});
    EXPECT_EQ(check.status, 3);
    EXPECT_EQ(ParseJson(check.out)[1]["refusal"], "recycle_bin");
    EXPECT_EQ(Ctl({"check", "/photo/a"}).status, 0);
    EXPECT_EQ(Ctl({"check", "/nosuch/a"}).status, 3);

    const std::string queue = SharePath("photo") + "/@eaDir/VEXO@file_index_queue";
    const struct Row {
        Setting setting;
        std::vector<std::string> extra;
        int status;
        bool wiped;
    } rows[] = {
        {{}, {}, 2, false},
        {{true, "xterm", 24, -1, "n\n"}, {}, 1, false},
        {{true, "xterm", 24, -1, "yes\n"}, {}, 0, true},
        {{}, {"--yes"}, 0, true},
    };
    for (const Row &row : rows) {
        SCOPED_TRACE(row.setting.input + (row.extra.empty() ? "" : row.extra[0]));
        stdfs::create_directories(SharePath("photo") + "/@eaDir");
        WriteFile(queue, "{}\n");
        std::vector<std::string> args{"share", "clean", "photo"};
        args.insert(args.end(), row.extra.begin(), row.extra.end());
        const Outcome clean = Ctl(args, row.setting);
        EXPECT_EQ(clean.status, row.status) << clean.err;
        EXPECT_EQ(stdfs::exists(queue), !row.wiped);
        EXPECT_EQ(clean.err.find("wipe the event queue and index database of share photo? [y/N] ") == 0,
                  row.setting.terminal);
    }
}

// Completion asks the tool: subcommands (not the hidden one), options, the values of --sort, --with
// and the media switches, share names and indexed folders from the appliance's own files, and the
// directories of a share for a folder to add; the bash function offers what the tool printed.
TEST_F(FileindexctlTest, CompletionOffersWhatTheToolAndTheApplianceKnow)
{
    WriteFile(kFolderConf, R"({"/photo/a":{"path":"/photo/a","name":"A"},"/music":{"path":"/music","name":"M"}})");
    WriteFile(FILEINDEX_STATUS_CONF_PATH, R"({"no_space":{"video":true}})");
    stdfs::create_directories(SharePath("photo") + "/a");
    stdfs::create_directories(SharePath("photo") + "/b");
    const struct Row {
        std::vector<std::string> words;
        std::string offered;
    } rows[] = {
        {{""}, "check\nfolder\npause\nreindex\nresume\nshare\nstatus\nupgrade\n"},
        {{"fo"}, "folder\n"},
        {{"--json", "folder", "list", "--l"}, "--limit\n"},
        {{"folder", "list", "--sort", ""}, "audio\ndocument\nname\npath\nphoto\nvideo\n"},
        {{"folder", "list", "--with", "status,"}, "status,is_valid\n"},
        {{"folder", "set", "/photo/a", "--audio", ""}, "off\non\n"},
        {{"folder", "remove", "/"}, "/music\n/photo/a\n"},
        {{"share", "revive", ""}, "music\nphoto\nvideo\n"},
        {{"folder", "add", "/"}, "/music/\n/photo/\n/video/\n"},
        {{"folder", "add", "--audio", "/photo/"}, "/photo/a/\n/photo/b/\n"},
    };
    for (const Row &row : rows) {
        std::vector<std::string> args{"__complete", "--"};
        args.insert(args.end(), row.words.begin(), row.words.end());
        EXPECT_EQ(Ctl(args).out, row.offered) << row.words.back();
    }
    const std::string bash = "source " FILEINDEX_COMPLETION_SCRIPT "; COMP_WORDS=(" FILEINDEXCTL
                             " share re); COMP_CWORD=2; _fileindexctl; printf '%s\\n' \"${COMPREPLY[@]}\"";
    FILE *shell = popen(("bash -c '" + std::regex_replace(bash, std::regex("'"), "'\\''") + "'").c_str(), "r");
    std::string offered(64, '\0');
    offered.resize(fread(&offered[0], 1, offered.size(), shell));
    pclose(shell);
    EXPECT_EQ(offered, "remove\nrename\nresume\nrevive\n");
}

// A busy lock is not a failure. The commands whose lock comes before any effect try again until the
// holder lets go; with --wait 0 they give up at once, exit 75 naming the holder, and leave folder.conf,
// status.conf and the platform as they were. A lock file that cannot be created is no busy lock:
// told to wait an hour, they fail at once, naming the file, why and what to do, and change nothing.
TEST_F(FileindexctlTest, ABusyLockIsWaitedForOrNamedAndLeavesNothingBehind)
{
    FrameListener daemon;
    const struct Row {
        std::vector<std::string> args;
        const char *lock;
    } rows[] = {
        {{"folder", "get", "/photo/a"}, FILEINDEX_FOLDER_LOCK_PATH},
        {{"folder", "add", "/photo/b", "--photo"}, FILEINDEX_FOLDER_LOCK_PATH},
        {{"folder", "set", "/photo/a", "--audio", "on"}, FILEINDEX_FOLDER_LOCK_PATH},
        {{"folder", "remove", "/photo/a"}, FILEINDEX_FOLDER_LOCK_PATH},
        {{"share", "remove", "photo"}, FILEINDEX_FOLDER_LOCK_PATH},
        {{"share", "rename", "photo", "music"}, FILEINDEX_FOLDER_LOCK_PATH},
        {{"share", "revive", "photo"}, FILEINDEX_STATUS_LOCK_PATH},
        {{"pause", "--hours", "1"}, FILEINDEX_STATUS_LOCK_PATH},
        {{"resume"}, FILEINDEX_STATUS_LOCK_PATH},
    };
    const std::string folderConf = R"({"/photo/a":{"path":"/photo/a","name":"A","photo":true}})";
    const std::string statusConf = R"({"resume_time":-1,"no_space":{"photo":true}})";
    for (const Row &row : rows) {
        SCOPED_TRACE(row.args.front() + " " + row.args.back());
        stdfs::create_directories(SharePath("photo") + "/a");
        stdfs::create_directories(SharePath("photo") + "/b");
        WriteFile(kFolderConf, folderConf);
        WriteFile(FILEINDEX_STATUS_CONF_PATH, statusConf);
        const size_t journal = Journal().size();
        {
            LockHolder holder(row.lock, true);
            std::vector<std::string> args = row.args;
            args.insert(args.end(), {"--wait", "0"});
            const Outcome busy = Ctl(args);
            EXPECT_EQ(busy.status, 75);
            EXPECT_TRUE(std::regex_search(busy.err, std::regex(" is held by pid [0-9]+ \\(fileindex_tests\\); ")))
                << busy.err;
            EXPECT_EQ(ReadFile(kFolderConf), folderConf);
            EXPECT_EQ(ReadFile(FILEINDEX_STATUS_CONF_PATH), statusConf);
            EXPECT_EQ(Journal().size(), journal);
        }
        Child briefHolder([&row](const Child::Ready &ready) {
            flock(open(row.lock, O_RDWR | O_CREAT | O_CLOEXEC, 0644), LOCK_EX);
            ready();
            usleep(300000);
        });
        const Outcome waited = Ctl(row.args);
        EXPECT_EQ(waited.status, 0) << waited.err;

        WriteFile(kFolderConf, folderConf);
        WriteFile(FILEINDEX_STATUS_CONF_PATH, statusConf);
        const size_t journalBefore = Journal().size();
        const stdfs::path lockDirectory = stdfs::path(row.lock).parent_path();
        stdfs::remove_all(lockDirectory);
        std::vector<std::string> args = row.args;
        args.insert(args.end(), {"--wait", "3600"});
        const Outcome unusable = Ctl(args);
        stdfs::create_directory(lockDirectory);
        EXPECT_EQ(unusable.status, 1);
        EXPECT_NE(unusable.err.find(std::string(" lock file ") + row.lock + " cannot be opened or created, so no "
                                    "process holds it: the directory " + lockDirectory.string() +
                                    " is missing (No such file or directory); create it, "),
                  std::string::npos)
            << unusable.err;
        EXPECT_EQ(ReadFile(kFolderConf), folderConf);
        EXPECT_EQ(ReadFile(FILEINDEX_STATUS_CONF_PATH), statusConf);
        EXPECT_EQ(Journal().size(), journalBefore);
    }
}

// Paths that are not UTF-8 or hold an escape sequence: the table shows them quoted so that no byte
// reaches the terminal raw, and the JSON documents are valid UTF-8 with the exact bytes beside each
// path and name.
TEST_F(FileindexctlTest, BothOutputFormsKeepThePathBytes)
{
    const std::string odd = "/photo/caf\xe9 \"x\"", clear = "/photo/\x1b[2J";
    Json::Value conf = ParseJson(R"({"/music": {"path": "/music", "name": "M\u00fcsic", "audio": true}})");
    for (const std::string &path : {odd, clear}) {
        stdfs::create_directories(SharePath("photo") + path.substr(6));
        conf[path]["name"] = path == odd ? "Caf\xe9" : "\x1b[2J";
        conf[path]["photo"] = true;
    }
    WriteFile(kFolderConf, VEXO::FILEINDEX::toString(conf));

    const Outcome table = Ctl({"folder", "list", "--with", "is_valid"});
    EXPECT_EQ(table.out, "PATH                   NAME        MEDIA  VALID\n"
                         "/music                 M\u00fcsic       audio  yes\n"
                         "$'/photo/\\e[2J'        $'\\e[2J'    photo  yes\n"
                         "$'/photo/caf\\xe9 \"x\"'  $'Caf\\xe9'  photo  yes\n"
                         "3 of 3 folders\n");
    const Outcome json = Ctl({"folder", "list", "--with", "is_valid", "--json"});
    EXPECT_EQ(ParseJson(json.out)["folders"][2],
              ParseJson(R"({"path": "/photo/caf\\xe9 \"x\"", "path_bytes": "/photo/caf%E9%20%22x%22",
                            "name": "Caf\\xe9", "name_bytes": "Caf%E9", "document": false, "audio": false,
                            "video": false, "photo": true, "additional": {"is_valid": true}})"));
    EXPECT_EQ(json.out.find_first_of("\xe9\x1b"), std::string::npos) << json.out;

    const Outcome check = Ctl({"check", odd, "/photo/#recycle", "/nosuch/a", "--json"});
    const Json::Value checks = ParseJson(check.out);
    EXPECT_EQ(checks[0]["path_bytes"], "/photo/caf%E9%20%22x%22");
    EXPECT_EQ(checks[0]["full_path_bytes"], "/" + SharePath("photo").substr(1) + "/caf%E9%20%22x%22");
    EXPECT_EQ(checks[0]["indexed"], true);
    EXPECT_EQ(checks[1]["refusal"], "recycle_bin");
    EXPECT_EQ(checks[1]["crawler_skips"], true);
    EXPECT_EQ(checks[2]["refusal"], "path_unresolved");
    EXPECT_TRUE(checks[2]["full_path_bytes"].isNull());

    // Every path comes back in through its "path_bytes": this pipeline removes each folder.
    const std::string ctl = FILEINDEXCTL;
    EXPECT_EQ(std::system((ctl + " folder list --json | jq -r '.folders[].path_bytes' | xargs " + ctl +
                           " folder remove --path-bytes >/dev/null").c_str()), 0);
    EXPECT_EQ(ReadFile(kFolderConf), "{}");
}

// The first folder starts the stand-in daemon through the service start; status --watch --json
// returns once it has worked through the queue; removing the last folder stops it again.
TEST_F(FileindexctlTest, FolderAddedIsIndexedWhileWatchedAndRemovedAgain)
{
    const std::string frames = HostPath("/frames.jsonl");
    Json::Value commands;
    // Each record takes long enough for the watch to find the queue still pending.
    for (const char *arg : {FILEINDEX_STANDIN_DAEMON, "--output", frames.c_str(), "--process-queues",
                            "--record-time", "300"}) {
        commands["fileindexd"]["command"].append(arg);
    }
    commands["fileindexd"]["ready"] = FILEINDEX_DAEMON_SOCKET_PATH;
    WriteFile(StatePath("service_commands.json"), VEXO::FILEINDEX::toString(commands));

    EXPECT_NE(Ctl({"status"}).out.find("\nfileindexd: not reachable: no socket at "), std::string::npos);
    const Outcome added = Ctl({"folder", "add", "/photo", "--photo", "--json"});
    EXPECT_EQ(added.status, 0) << added.err;
    EXPECT_EQ(ParseJson(added.out), ParseJson(R"([{"path": "/photo", "path_bytes": "/photo", "name": "photo",
                                                   "name_bytes": "photo", "document": false, "audio": false,
                                                   "video": false, "photo": true}])"));
    const Outcome watched = Ctl({"status", "--watch", "--interval", "0.05", "--json"});
    const Json::Value report = ParseJson(watched.out);
    EXPECT_EQ(report["status"], "finished");
    EXPECT_EQ(report["daemon"]["reachable"], true);
    EXPECT_EQ(report["folders"], ParseJson(R"([{"path": "/photo", "path_bytes": "/photo", "status": "finished"}])"));
    EXPECT_EQ(ReadFile(frames), "{\"data\":{\"folder_path\":\"/photo\"},\"type\":\"upsert_folder_setting\"}\n");
    EXPECT_NE(ReadFile(SharePath("photo") + "/@eaDir/VEXO@.fileindexdb/index.jsonl").find("131072"),
              std::string::npos);

    const Outcome removed = Ctl({"folder", "remove", "/photo"});
    EXPECT_EQ(removed.out, "removed /photo (\"photo\", photo)\n");
    EXPECT_EQ(ParseJson(ReadFile(StatePath("services.json")))["fileindexd"], ParseJson(R"({"running": false})"));
}

}  // namespace
}  // namespace fileindex_test
