// fileindexctl as a user runs it: a process, its standard output, standard error and exit status.
#include <fcntl.h>
#include <signal.h>
#include <sys/file.h>
#include <spawn.h>
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

namespace fileindex_test {
namespace {

const std::string kFolderConf = FILEINDEX_FOLDER_CONF_PATH;
constexpr int kRunLimitMilliseconds = 20000;

struct Outcome {
    int status;
    std::string out;
    std::string err;
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

    // Runs fileindexctl with args, its output and error streams going to files of the sandbox. A run
    // that hangs is ended after a time limit, and then reads as killed.
    static Outcome Ctl(const std::vector<std::string> &args)
    {
        const std::string out = HostPath("/ctl.out"), err = HostPath("/ctl.err");
        std::vector<char *> argv{const_cast<char *>(FILEINDEXCTL)};
        for (const std::string &arg : args) {
            argv.push_back(const_cast<char *>(arg.c_str()));
        }
        argv.push_back(nullptr);
        posix_spawn_file_actions_t files;
        posix_spawn_file_actions_init(&files);
        posix_spawn_file_actions_addopen(&files, STDOUT_FILENO, out.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
        posix_spawn_file_actions_addopen(&files, STDERR_FILENO, err.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
        pid_t pid = -1;
        EXPECT_EQ(posix_spawn(&pid, FILEINDEXCTL, &files, nullptr, argv.data(), environ), 0);
        posix_spawn_file_actions_destroy(&files);
        int status = 0;
        for (int waited = 0; waitpid(pid, &status, WNOHANG) == 0; ++waited) {
            if (waited == kRunLimitMilliseconds / 10) {
                kill(pid, SIGKILL);
            }
            usleep(10000);
        }
        return {WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status), ReadFile(out), ReadFile(err)};
    }
};

// A failing call prints exactly one line on standard error that says what failed, what it means
// and what to try, names the library's error code when there is one, and exits with the status of
// its kind; standard output stays empty, or holds only the error object with --json.
TEST_F(FileindexctlTest, AFailedCallPrintsOneLineNamingItsErrorCode)
{
    WriteFile(kFolderConf, R"({"/photo/a":{"path":"/photo/a","name":"A"}})");
    struct Row {
        std::vector<std::string> args;
        int status;
        std::string line;  // regular expression for the one line on standard error
    } rows[] = {
        {{"folder", "get", "/photo/b"}, 4,
         "fileindexctl: folder get /photo/b: the folder is not in the folder list; .*folder list.* "
         "\\(FILEIDX_ERR_NO_SUCH_FOLDER\\)"},
        {{"pause", "--hours", "-1"}, 1, "fileindexctl: pause: .* \\(FILEIDX_ERR_BAD_PARAM\\)"},
        {{"resume"}, 1,
         "fileindexctl: resume: the change is saved, but fileindexd did not take the command: is the indexing "
         "service running\\? .*"},
        {{"share", "space", "nosuch"}, 4, "fileindexctl: share space nosuch: .* \\(FILEIDX_ERR_PATH\\)"},
        {{"share", "paths", "nosuch"}, 1, "fileindexctl: share paths nosuch: .*not in the share database.*"},
        {{"folder", "set", "/photo/b", "--audio", "on"}, 4, "fileindexctl: folder set /photo/b: .*"},
        {{"folder", "add", "/nosuch/a"}, 1, "fileindexctl: folder add: .* \\(FILEIDX_ERR_BAD_PARAM\\)"},
        {{"reindex", "/music"}, 1, "fileindexctl: reindex: .*holds no indexed.*"},
    };
    for (const Row &row : rows) {
        const Outcome outcome = Ctl(row.args);
        SCOPED_TRACE(row.line);
        EXPECT_EQ(outcome.status, row.status);
        EXPECT_EQ(outcome.out, "");
        EXPECT_TRUE(std::regex_match(outcome.err, std::regex(row.line + "\n"))) << outcome.err;
        EXPECT_EQ(outcome.err.find("error 0"), std::string::npos);
        // With --json the same failure is also the error object on standard output.
        std::vector<std::string> jsonArgs = row.args;
        jsonArgs.push_back("--json");
        const Json::Value error = ParseJson(Ctl(jsonArgs).out)["error"];
        const std::string named = error["name"].isNull() ? "" : " (" + error["name"].asString() + ")";
        EXPECT_TRUE(std::regex_match("fileindexctl: " + error["message"].asString() + named, std::regex(row.line)));
    }
    // A wrong command line is not the library's failure: status 2, and one line all the same.
    const Outcome usage = Ctl({"folder", "get"});
    EXPECT_EQ(usage.status, 2);
    EXPECT_TRUE(std::regex_match(usage.err, std::regex("fileindexctl: [^\n]*PATH[^\n]* \\(see --help\\)\n")))
        << usage.err;
}

// A busy lock is not a failure. The commands whose lock comes before any effect try again until the
// holder lets go; with --wait 0 they give up at once, exit 75 naming the holder, and leave folder.conf,
// status.conf and the platform as they were.
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

    const Outcome added = Ctl({"folder", "add", "/photo", "--photo", "--json"});
    EXPECT_EQ(added.status, 0) << added.err;
    EXPECT_EQ(ParseJson(added.out), ParseJson(R"([{"path": "/photo", "path_bytes": "/photo", "name": "photo",
                                                   "name_bytes": "photo", "document": false, "audio": false,
                                                   "video": false, "photo": true}])"));
    const Outcome watched = Ctl({"status", "--watch", "--interval", "0.05", "--json"});
    const Json::Value report = ParseJson(watched.out);
    EXPECT_EQ(report["status"], "finished");
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
