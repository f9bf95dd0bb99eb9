// The lockable JSON document: locking between processes, loading, and saves that never lose or tear
// the previous document.
#include <fcntl.h>
#include <signal.h>
#include <spawn.h>
#include <sys/file.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <set>

#include "fileindex/config.h"
#include "fileindex/error.h"
#include "tests/support/child.h"
#include "tests/support/log_capture.h"
#include "tests/support/sandbox.h"
#include "tests/support/syscall_faults.h"

using namespace VEXO::FILEINDEX;

namespace fileindex_test {
namespace {

// A document of its own beside the folder list, and its lock beside the folder list's.
const stdfs::path kConfigDir = stdfs::path(FILEINDEX_FOLDER_CONF_PATH).parent_path();
const std::string kDocPath = kConfigDir / "test.conf";
const std::string kLockPath = stdfs::path(FILEINDEX_FOLDER_LOCK_PATH).parent_path() / "test.lock";

// A document with the base's own Load and Save, as the status file has.
class TestDoc : public Config {
public:
    bool Load() override { return LoadJson(); }
    bool Save() override { return SaveJson(); }
    std::string GetLockPath() const override { return kLockPath; }
    std::string GetPath() const override { return kDocPath; }

    Json::Value &Doc() { return m_jsConfig; }
    int LockFd() const { return m_fdLock; }
};

// Takes the lock without blocking from another process; true when it was free.
bool LockIsFreeForOthers(const std::string &path)
{
    Child probe([&path](const Child::Ready &) {
        const int fd = open(path.c_str(), O_RDWR);
        _exit(fd >= 0 && flock(fd, LOCK_EX | LOCK_NB) == 0 ? 0 : 1);
    });
    return probe.Wait() == 0;
}

std::vector<std::string> TempFilesBesideDoc()
{
    std::vector<std::string> names;
    for (const stdfs::directory_entry &entry : stdfs::directory_iterator(kConfigDir)) {
        const std::string name = entry.path().filename();
        if (name.rfind("test.conf.", 0) == 0) {
            names.push_back(name);
        }
    }
    return names;
}

class ConfigTest : public SandboxTest {};

TEST_F(ConfigTest, LockHeldByAnotherProcessFailsWithCode9AfterShortRetries)
{
    LockHolder holder(kLockPath, true);
    ErrorHandler::SetError(FILEIDX_ERR_NONE);
    TestDoc doc;
    const auto start = std::chrono::steady_clock::now();
    EXPECT_FALSE(doc.Lock(true));
    const auto waited = std::chrono::steady_clock::now() - start;
    EXPECT_LT(waited, std::chrono::milliseconds(200)) << "a lock request must never block";
    EXPECT_EQ(ErrorHandler::GetError(), FILEIDX_ERR_LOCK);
    EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>{"Failed to lock folder"});
    doc.Unlock();

    TestDoc shared;
    EXPECT_FALSE(shared.Lock(false)) << "a shared lock must not pass an exclusive holder";
    shared.Unlock();
}

TEST_F(ConfigTest, SharedLocksAdmitEachOtherButNotAWriter)
{
    LockHolder reader(kLockPath, false);
    TestDoc doc;
    ASSERT_TRUE(doc.Lock(false));
    EXPECT_FALSE(LockIsFreeForOthers(kLockPath));
    doc.Unlock();

    TestDoc writer;
    EXPECT_FALSE(writer.Lock(true));
    writer.Unlock();
}

TEST_F(ConfigTest, UnlockFreesTheLockForOtherProcesses)
{
    TestDoc doc;
    ASSERT_TRUE(doc.Lock(true));
    struct stat st;
    ASSERT_EQ(stat(kLockPath.c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 0777, 0644u);
    EXPECT_EQ(st.st_size, 0) << "the lock file never holds data";
    EXPECT_FALSE(LockIsFreeForOthers(kLockPath));
    doc.Unlock();
    EXPECT_TRUE(LockIsFreeForOthers(kLockPath));
    doc.Unlock();  // a second release repeats the calls on a closed descriptor, harmlessly
    TestDoc never;
    never.Unlock();
}

TEST_F(ConfigTest, DestroyingALockedObjectKeepsTheLock)
{
    auto *doc = new TestDoc;
    ASSERT_TRUE(doc->Lock(true));
    const int fd = doc->LockFd();
    delete doc;
    EXPECT_FALSE(LockIsFreeForOthers(kLockPath));
    close(fd);
    EXPECT_TRUE(LockIsFreeForOthers(kLockPath));
}

TEST_F(ConfigTest, AProgramStartedWhileTheLockIsHeldDoesNotInheritIt)
{
    TestDoc doc;
    ASSERT_TRUE(doc.Lock(true));
    EXPECT_TRUE(fcntl(doc.LockFd(), F_GETFD) & FD_CLOEXEC);
    pid_t pid;
    const char *argv[] = {"/bin/sleep", "5", nullptr};
    ASSERT_EQ(posix_spawn(&pid, argv[0], nullptr, nullptr, const_cast<char **>(argv), environ), 0);
    doc.Unlock();
    const bool free = LockIsFreeForOthers(kLockPath);
    kill(pid, SIGKILL);
    waitpid(pid, nullptr, 0);
    EXPECT_TRUE(free) << "the program kept the lock through an inherited descriptor";
}

TEST_F(ConfigTest, MissingDocumentIsTheFirstRunStateAndTheFirstSaveCreatesIt)
{
    TestDoc doc;
    ErrorHandler::SetError(FILEIDX_ERR_NONE);
    ASSERT_TRUE(doc.Load());
    EXPECT_EQ(doc.Doc(), Json::Value(Json::objectValue));
    EXPECT_EQ(ErrorHandler::GetError(), FILEIDX_ERR_NONE);

    doc.Doc()["k"] = "v";
    ASSERT_TRUE(doc.Save());
    EXPECT_EQ(ReadFile(kDocPath), "{\"k\":\"v\"}");
    struct stat st;
    ASSERT_EQ(stat(kDocPath.c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 0777, 0644u);
    EXPECT_TRUE(LogCapture::Lines().empty());
}

TEST_F(ConfigTest, SymbolicLinkInPlaceOfTheDocumentCountsAsMissing)
{
    WriteFile(kDocPath + ".real", "{\"k\":1}");
    ASSERT_EQ(symlink((kDocPath + ".real").c_str(), kDocPath.c_str()), 0);
    TestDoc doc;
    ASSERT_TRUE(doc.Load());
    EXPECT_EQ(doc.Doc(), Json::Value(Json::objectValue));
}

TEST_F(ConfigTest, UnparsableDocumentFailsWithCode6AndOneLine)
{
    for (const std::string content : {"", "{\"k\":", "{\"k\":1} trailing", "// comment\n{}"}) {
        SCOPED_TRACE(content);
        WriteFile(kDocPath, content);
        LogCapture::Clear();
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
        TestDoc doc;
        EXPECT_FALSE(doc.Load());
        EXPECT_EQ(ErrorHandler::GetError(), FILEIDX_ERR_LOAD_CONFIG);
        EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>{"Failed to load json from " + kDocPath});
    }
}

TEST_F(ConfigTest, ErrorCodeStaysAfterLaterSuccess)
{
    WriteFile(kDocPath, "{");
    TestDoc broken;
    EXPECT_FALSE(broken.Load());
    std::remove(kDocPath.c_str());
    TestDoc fine;
    EXPECT_TRUE(fine.Load());
    EXPECT_TRUE(fine.Save());
    EXPECT_EQ(ErrorHandler::GetError(), FILEIDX_ERR_LOAD_CONFIG);
}

TEST_F(ConfigTest, FailedSaveLeavesThePreviousDocumentAndNoTemporaryFile)
{
    TestDoc doc;
    doc.Doc()["version"] = 1;
    ASSERT_TRUE(doc.Save());
    const std::string before = ReadFile(kDocPath);
    doc.Doc()["version"] = 2;

    for (const Syscall call : {Syscall::kFsync, Syscall::kRename}) {
        SCOPED_TRACE(static_cast<int>(call));
        LogCapture::Clear();
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
        {
            SyscallFault fault(call, EIO);
            EXPECT_FALSE(doc.Save());
            EXPECT_GT(fault.Hits(), 0);
        }
        EXPECT_EQ(ErrorHandler::GetError(), FILEIDX_ERR_SAVE_CONFIG);
        EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>{"Failed to save json to " + kDocPath});
        EXPECT_EQ(ReadFile(kDocPath), before);
        EXPECT_TRUE(TempFilesBesideDoc().empty());
    }
}

TEST_F(ConfigTest, ShortWriteOnAFullDiskLeavesThePreviousDocument)
{
    TestDoc doc;
    doc.Doc()["version"] = 1;
    ASSERT_TRUE(doc.Save());
    const std::string before = ReadFile(kDocPath);

    // A file-size limit gives real short writes and EFBIG, as a full volume would.
    Child saver([](const Child::Ready &) {
        signal(SIGXFSZ, SIG_IGN);
        const rlimit limit = {4096, 4096};
        setrlimit(RLIMIT_FSIZE, &limit);
        TestDoc big;
        big.Doc()["blob"] = std::string(100000, 'x');
        _exit(big.Save() ? 0 : 1);
    });
    EXPECT_EQ(saver.Wait(), 1);
    EXPECT_EQ(ReadFile(kDocPath), before);
    EXPECT_TRUE(TempFilesBesideDoc().empty());
}

TEST_F(ConfigTest, FailedChmodAfterAWriteStillCountsAsSaved)
{
    TestDoc doc;
    doc.Doc()["k"] = true;
    ErrorHandler::SetError(FILEIDX_ERR_NONE);
    {
        SyscallFault fault(Syscall::kChmod, EPERM);
        EXPECT_TRUE(doc.Save());
    }
    EXPECT_EQ(ReadFile(kDocPath), "{\"k\":true}");
    EXPECT_EQ(ErrorHandler::GetError(), FILEIDX_ERR_NONE);
    EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>{"chmod failed, path=" + kDocPath});
}

// A reader that takes no lock must see either the previous document or the next, never a mix.
TEST_F(ConfigTest, ReaderWithoutLockNeverSeesATornDocument)
{
    const auto save = [](int round) {
        TestDoc doc;
        const std::string fill(50000 + (round % 5) * 25000, static_cast<char>('a' + round % 26));
        doc.Doc()["fill"] = fill;
        doc.Doc()["length"] = static_cast<Json::UInt>(fill.size());
        doc.Doc()["round"] = round;
        doc.Save();
    };
    Child writer([&save](const Child::Ready &ready) {
        save(0);
        ready();
        for (int round = 1;; ++round) {
            save(round);
        }
    });
    std::set<int> rounds;
    for (int i = 0; i < 3000; ++i) {
        TestDoc doc;
        ASSERT_TRUE(doc.Load()) << "load " << i << " saw a torn file";
        ASSERT_EQ(doc.Doc()["fill"].asString().size(), doc.Doc()["length"].asUInt());
        rounds.insert(doc.Doc()["round"].asInt());
    }
    EXPECT_GT(rounds.size(), 10u) << "the reader should have raced many saves";
}

// Every update whose call returned true is in the final document; every refused one is not.
TEST_F(ConfigTest, ConcurrentWritersLoseNoUpdate)
{
    constexpr int kWriters = 4;
    constexpr int kAdds = 100;
    const std::string resultsDir = FILEINDEX_ROOT_DIR "/";
    std::vector<std::unique_ptr<Child>> writers;
    for (int w = 0; w < kWriters; ++w) {
        writers.push_back(std::make_unique<Child>([w, &resultsDir](const Child::Ready &ready) {
            ready();
            std::string accepted;
            for (int i = 0; i < kAdds; ++i) {
                const std::string key = std::to_string(w) + "-" + std::to_string(i);
                TestDoc doc;
                const bool ok = doc.Lock(true) && doc.Load() && (doc.Doc()[key] = true, doc.Save());
                doc.Unlock();
                if (ok) {
                    accepted += key + "\n";
                }
            }
            WriteFile(resultsDir + "accepted-" + std::to_string(w), accepted);
        }));
    }
    std::set<std::string> expected;
    for (int w = 0; w < kWriters; ++w) {
        EXPECT_EQ(writers[w]->Wait(), 0);
        std::istringstream lines(ReadFile(resultsDir + "accepted-" + std::to_string(w)));
        for (std::string key; std::getline(lines, key);) {
            expected.insert(key);
        }
    }
    TestDoc final;
    ASSERT_TRUE(final.Load());
    std::set<std::string> stored;
    for (const std::string &key : final.Doc().getMemberNames()) {
        stored.insert(key);
    }
    EXPECT_EQ(stored, expected);
    EXPECT_GT(expected.size(), static_cast<size_t>(kAdds));
}

// A saver killed at any moment leaves a complete document, a free lock, and no pile of temporaries.
TEST_F(ConfigTest, SaverKilledMidSaveLeavesACompleteDocument)
{
    for (int round = 0; round < 40; ++round) {
        Child saver([](const Child::Ready &ready) {
            ready();
            for (int i = 0;; ++i) {
                TestDoc doc;
                doc.Lock(true);
                doc.Doc()["fill"] = std::string(200000, static_cast<char>('a' + i % 26));
                doc.Save();
                doc.Unlock();
            }
        });
        usleep(static_cast<useconds_t>(rand() % 20000));
        saver.Kill(SIGKILL);
        saver.Wait();
        TestDoc doc;
        ASSERT_TRUE(doc.Lock(true)) << "round " << round << ": the killed saver's lock is still held";
        doc.Unlock();
        ASSERT_TRUE(doc.Load()) << "round " << round;
        if (doc.Doc().isMember("fill")) {
            EXPECT_EQ(doc.Doc()["fill"].asString().size(), 200000u);
        }
    }
    TestDoc doc;
    ASSERT_TRUE(doc.Save());
    EXPECT_TRUE(TempFilesBesideDoc().empty()) << "temporaries of killed savers are swept";
}

}  // namespace
}  // namespace fileindex_test
