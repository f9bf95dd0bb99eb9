// fileindexctl as a user runs it: a process, its standard output, standard error and exit status.
#include <fcntl.h>
#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <regex>
#include <string>
#include <vector>

#include "config/json_io.h"
#include "platform/service.h"
#include "tests/support/child.h"
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

// A failing call exits 1 with nothing on standard output and exactly one line on standard error that
// names the library's error code, what it means and what to try.
TEST_F(FileindexctlTest, AFailedCallPrintsOneLineNamingItsErrorCode)
{
    WriteFile(kFolderConf, R"({"/photo/a":{"path":"/photo/a","name":"A"}})");
    struct Row {
        std::vector<std::string> args;
        bool holdFolderLock;
        std::string line;  // regular expression for the one line on standard error
    } rows[] = {
        {{"folder", "get", "/photo/b"}, false,
         "fileindexctl: folder get /photo/b failed: error 4 FILEIDX_ERR_NO_SUCH_FOLDER: the folder is not in the "
         "folder list; .*folder list.*"},
        {{"folder", "get", "/photo/a"}, true,
         "fileindexctl: folder get /photo/a failed: error 9 FILEIDX_ERR_LOCK: another process holds the folder "
         "list or status lock; retry in a moment"},
        {{"pause", "--hours", "-1"}, false, "fileindexctl: pause failed: error 1 FILEIDX_ERR_BAD_PARAM: .*"},
        {{"resume", "--json"}, false,
         "fileindexctl: resume failed: error 0 FILEIDX_ERR_NONE: the library recorded no reason; the change is "
         "saved, but fileindexd did not take the command: is the indexing service running\\? .*"},
        {{"share", "space", "nosuch"}, false, "fileindexctl: share space nosuch failed: error 2 FILEIDX_ERR_PATH: .*"},
        {{"share", "paths", "nosuch"}, false,
         "fileindexctl: share paths nosuch failed: error 0 FILEIDX_ERR_NONE: .*not in the share database.*"},
        {{"folder", "set", "/photo/b", "--audio", "on"}, false, "fileindexctl: folder set /photo/b failed: error 4 .*"},
        {{"folder", "add", "/nosuch/a"}, false, "fileindexctl: folder add failed: error 1 FILEIDX_ERR_BAD_PARAM: .*"},
        {{"reindex", "/music"}, false, "fileindexctl: reindex failed: error 0 FILEIDX_ERR_NONE: .*holds no indexed.*"},
    };
    for (const Row &row : rows) {
        std::unique_ptr<LockHolder> holder;
        if (row.holdFolderLock) {
            holder = std::make_unique<LockHolder>(FILEINDEX_FOLDER_LOCK_PATH, true);
        }
        const Outcome outcome = Ctl(row.args);
        SCOPED_TRACE(row.line);
        EXPECT_EQ(outcome.status, 1);
        EXPECT_EQ(outcome.out, "");
        EXPECT_TRUE(std::regex_match(outcome.err, std::regex(row.line + "\n"))) << outcome.err;
    }
    // A wrong command line is not the library's failure: status 2, and one line all the same.
    const Outcome usage = Ctl({"folder", "get"});
    EXPECT_EQ(usage.status, 2);
    EXPECT_TRUE(std::regex_match(usage.err, std::regex("fileindexctl: [^\n]*PATH[^\n]* \\(see --help\\)\n")))
        << usage.err;
}

// Both output forms carry a path that is not UTF-8, with a quote in it, byte for byte: the table as
// people read it, and the JSON documents as the library's own records.
TEST_F(FileindexctlTest, BothOutputFormsKeepThePathBytes)
{
    const std::string odd = "/photo/caf\xe9 \"x\"";
    stdfs::create_directories(SharePath("photo") + "/caf\xe9 \"x\"");
    Json::Value record = ParseJson(R"({"document": false, "audio": false, "video": false, "photo": true})");
    record["path"] = odd;
    record["name"] = "Caf\xe9";
    Json::Value conf = ParseJson(R"({"/music": {"path": "/music", "name": "M\u00fcsic", "audio": true}})");
    conf[odd] = record;
    WriteFile(kFolderConf, VEXO::FILEINDEX::toString(conf));

    const Outcome table = Ctl({"folder", "list", "--with", "is_valid"});
    EXPECT_EQ(table.out, "PATH             NAME   MEDIA  VALID\n"
                         "/music           M\u00fcsic  audio  yes\n"
                         "/photo/caf\xe9 \"x\"  Caf\xe9   photo  yes\n"
                         "2 of 2 folders\n");
    const Outcome json = Ctl({"folder", "list", "--with", "is_valid", "--json"});
    record["additional"]["is_valid"] = true;
    EXPECT_EQ(ParseJson(json.out)["folder"][1], record);
    EXPECT_NE(json.out.find("\"/photo/caf\xe9 \\\"x\\\"\""), std::string::npos) << json.out;  // raw, not \u00e9

    const Outcome check = Ctl({"check", odd, "/photo/#recycle", "/nosuch/a", "--json"});
    const Json::Value checks = ParseJson(check.out);
    EXPECT_EQ(check.status, 0);
    EXPECT_EQ(checks[0]["path"], odd);
    EXPECT_EQ(checks[0]["indexed"], true);
    EXPECT_EQ(checks[1]["refusal"], "recycle_bin");
    EXPECT_EQ(checks[1]["crawler_skips"], true);
    EXPECT_EQ(checks[2]["refusal"], "path_unresolved");
    EXPECT_TRUE(checks[2]["crawler_skips"].isNull());
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
    EXPECT_EQ(ParseJson(added.out), ParseJson(R"([{"path": "/photo", "name": "photo", "document": false,
                                                   "audio": false, "video": false, "photo": true}])"));
    const Outcome watched = Ctl({"status", "--watch", "--interval", "0.05", "--json"});
    EXPECT_EQ(ParseJson(watched.out), ParseJson(R"({"status": "finished", "resume_time": -1,
                                                     "folder": {"/photo": "finished"}})"));
    EXPECT_EQ(ReadFile(frames), "{\"data\":{\"folder_path\":\"/photo\"},\"type\":\"upsert_folder_setting\"}\n");
    EXPECT_NE(ReadFile(SharePath("photo") + "/@eaDir/VEXO@.fileindexdb/index.jsonl").find("131072"),
              std::string::npos);

    const Outcome removed = Ctl({"folder", "remove", "/photo"});
    EXPECT_EQ(removed.out, "removed /photo (\"photo\", photo)\n");
    EXPECT_EQ(ParseJson(ReadFile(StatePath("services.json")))["fileindexd"], ParseJson(R"({"running": false})"));
}

}  // namespace
}  // namespace fileindex_test
