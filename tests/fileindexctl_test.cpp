// fileindexctl as a user runs it: a process, its standard output, standard error and exit status.
#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <regex>
#include <string>
#include <vector>

#include "tests/support/child.h"
#include "tests/support/frame_listener.h"
#include "tests/support/sandbox.h"

namespace fileindex_test {
namespace {

const std::string kFolderConf = FILEINDEX_FOLDER_CONF_PATH;
const std::string kStatusConf = FILEINDEX_STATUS_CONF_PATH;

struct Outcome {
    int status;
    std::string out;
    std::string err;
};

std::string Describe(const std::vector<std::string> &args)
{
    std::string text = "fileindexctl";
    for (const std::string &arg : args) {
        text += " " + arg;
    }
    return text;
}

class FileindexctlTest : public SandboxTest {
protected:
    void SetUp() override
    {
        SandboxTest::SetUp();
        DeclareShares("volume1/photo volume2/music");
    }

    // Runs fileindexctl with args, its output and error streams going to files of the sandbox.
    static Outcome Ctl(const std::vector<std::string> &args)
    {
        const std::string out = HostPath("/ctl.out");
        const std::string err = HostPath("/ctl.err");
        const pid_t pid = fork();
        if (pid == 0) {
            std::vector<char *> argv{const_cast<char *>(FILEINDEXCTL)};
            for (const std::string &arg : args) {
                argv.push_back(const_cast<char *>(arg.c_str()));
            }
            argv.push_back(nullptr);
            const int outFd = open(out.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
            const int errFd = open(err.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
            if (outFd < 0 || errFd < 0 || dup2(outFd, STDOUT_FILENO) < 0 || dup2(errFd, STDERR_FILENO) < 0) {
                _exit(127);
            }
            execv(FILEINDEXCTL, argv.data());
            _exit(127);
        }
        int status = 0;
        waitpid(pid, &status, 0);
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
    };
    for (const Row &row : rows) {
        std::unique_ptr<LockHolder> holder;
        if (row.holdFolderLock) {
            holder = std::make_unique<LockHolder>(FILEINDEX_FOLDER_LOCK_PATH, true);
        }
        const Outcome outcome = Ctl(row.args);
        SCOPED_TRACE(Describe(row.args));
        EXPECT_EQ(outcome.status, 1);
        EXPECT_EQ(outcome.out, "");
        EXPECT_TRUE(std::regex_match(outcome.err, std::regex(row.line + "\n"))) << outcome.err;
    }
}

}  // namespace
}  // namespace fileindex_test
