// The lockable JSON document: locking between processes, loading, saves that never lose or tear the
// previous document, and the reading of JSON text. (Writing is checked byte for byte wherever the
// library writes: the documents, the frames, the queue records.)
#include <fcntl.h>
#include <signal.h>
#include <sys/file.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cmath>
#include <limits>
#include <set>

#include "config/file_io.h"
#include "config/json_grammar.h"
#include "config/json_io.h"
#include "daemon/queue_record.h"
#include "fileindex/config.h"
#include "fileindex/error.h"
#include "fileindex/status.h"
#include "fileindex/utils.h"
#include "share/storage_paths.h"
#include "tests/support/child.h"
#include "tests/support/log_capture.h"
#include "tests/support/sandbox.h"
#include "tests/support/spawn.h"
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

TEST_F(ConfigTest, LockIsGrantedOnlyBesideAnotherSharedHolderAndNeverWaits)
{
    const struct {
        bool holderExclusive;
        bool askExclusive;
        bool granted;
    } cases[] = {
        {true, true, false},
        {true, false, false},
        {false, true, false},
        {false, false, true},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(std::string(c.holderExclusive ? "exclusive" : "shared") + " holder, asking " +
                     (c.askExclusive ? "exclusive" : "shared"));
        LockHolder holder(kLockPath, c.holderExclusive);
        LogCapture::Clear();
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
        TestDoc doc;
        const size_t descriptors = OpenDescriptorCount();
        const auto start = std::chrono::steady_clock::now();
        EXPECT_EQ(doc.Lock(c.askExclusive), c.granted);
        EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(200)) << "must never block";
        // A refused retry closes the attempt before it; the last one's descriptor waits for Unlock.
        EXPECT_EQ(OpenDescriptorCount(), descriptors + 1);
        EXPECT_EQ(ErrorHandler::GetError(), c.granted ? FILEIDX_ERR_NONE : FILEIDX_ERR_LOCK);
        EXPECT_EQ(LogCapture::Messages(),
                  c.granted ? std::vector<std::string>{} : std::vector<std::string>{"Failed to lock folder"});
        doc.Unlock();
        EXPECT_EQ(OpenDescriptorCount(), descriptors);
    }
}

TEST_F(ConfigTest, UnlockReleasesTheLockAndTheDestructorDoesNot)
{
    for (const bool unlock : {true, false}) {
        SCOPED_TRACE(unlock ? "Unlock" : "destructor");
        auto doc = std::make_unique<TestDoc>();
        ASSERT_TRUE(doc->Lock(true));
        EXPECT_TRUE(IsLockHeld(kLockPath));
        const int fd = doc->LockFd();
        if (unlock) {
            doc->Unlock();
            // A second Unlock must not close whatever descriptor has since reused the number.
            const int reused = open("/dev/null", O_RDONLY | O_CLOEXEC);
            ASSERT_EQ(reused, fd);
            doc->Unlock();
            EXPECT_NE(fcntl(reused, F_GETFD), -1) << "closed by a second Unlock";
            close(reused);
        }
        doc.reset();
        EXPECT_EQ(IsLockHeld(kLockPath), !unlock);
        if (!unlock) {
            close(fd);  // what the end of the process would do
        }
    }
    struct stat st;
    ASSERT_EQ(stat(kLockPath.c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 0777, 0644u);
    EXPECT_EQ(st.st_size, 0) << "the lock file never holds data";
}

TEST_F(ConfigTest, AProgramStartedWhileTheLockIsHeldDoesNotInheritIt)
{
    TestDoc doc;
    ASSERT_TRUE(doc.Lock(true));
    EXPECT_TRUE(fcntl(doc.LockFd(), F_GETFD) & FD_CLOEXEC);
    const pid_t pid = SpawnProgram("/bin/sleep", {"5"}, {});
    ASSERT_GT(pid, 0);
    doc.Unlock();
    const bool held = IsLockHeld(kLockPath);
    kill(pid, SIGKILL);
    waitpid(pid, nullptr, 0);
    EXPECT_FALSE(held) << "the program kept the lock through an inherited descriptor";
}

TEST_F(ConfigTest, MissingDocumentIsTheFirstRunAndAnUnreadableOneFailsWithCode6)
{
    const std::string failed = "Failed to load json from " + kDocPath;
    const struct {
        const char *content;  // nullptr: no file; "->": a symbolic link to a valid document
        bool loads;
    } cases[] = {{nullptr, true},  {"->", true}, {"", false}, {"{\"k\":", false}, {"{\"k\":1} trailing", false},
                 {"// comment\n{}", false}};
    for (const auto &c : cases) {
        SCOPED_TRACE(c.content == nullptr ? "(missing)" : c.content);
        stdfs::remove(kDocPath);
        if (c.content != nullptr && std::string(c.content) == "->") {
            WriteFile(kDocPath + ".real", "{\"k\":1}");
            stdfs::create_symlink(kDocPath + ".real", kDocPath);
        } else if (c.content != nullptr) {
            WriteFile(kDocPath, c.content);
        }
        LogCapture::Clear();
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
        TestDoc doc;
        EXPECT_EQ(doc.Load(), c.loads);
        EXPECT_EQ(ErrorHandler::GetError(), c.loads ? FILEIDX_ERR_NONE : FILEIDX_ERR_LOAD_CONFIG);
        EXPECT_EQ(LogCapture::Messages(), c.loads ? std::vector<std::string>{} : std::vector<std::string>{failed});
        if (c.loads) {
            EXPECT_EQ(doc.Doc(), Json::Value(Json::objectValue));
        }
    }

    // The code of the last failure stays after later successes. The first save creates the document,
    // mode 0644 (each failing step of a save has its row in the fault loops of hardening_test.cpp).
    stdfs::remove(kDocPath);
    TestDoc fine;
    EXPECT_TRUE(fine.Load() && fine.Save());
    EXPECT_EQ(ErrorHandler::GetError(), FILEIDX_ERR_LOAD_CONFIG);
    EXPECT_EQ(ReadFile(kDocPath), "{}");
    struct stat st;
    ASSERT_EQ(stat(kDocPath.c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 0777, 0644u);
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
    // Not vacuous: plenty of adds got through, however loaded the machine.
    EXPECT_GE(expected.size(), static_cast<size_t>(kAdds / 4));
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

// What the library writes, its readers read back. An infinite number once went out as 1e+9999,
// which no reader takes: the event was lost for good, and a document saved with one never loaded
// again. NaN came back as null, and a negative event was skipped by every queue reader. Each value
// now either reads back as it was written or is refused as a write that fails is: nothing written,
// the event's share marked for a reindex, the previous document kept.
TEST_F(ConfigTest, WhatTheLibraryWritesReadsBackOrIsNotWritten)
{
    DeclareShares("volume1/photo");
    const std::string folder = SharePath("photo") + "/holiday";
    const std::string queue = StoragePath(SharePath("photo"), kQueueFileName);
    const auto nested = [](int levels) {
        Json::Value value(Json::arrayValue);
        for (int level = 1; level < levels; ++level) {
            Json::Value outer(Json::arrayValue);
            outer.append(std::move(value));
            value = std::move(outer);
        }
        return value;
    };
    const double infinity = std::numeric_limits<double>::infinity();
    const long long change = kEventFolderSettingChanged;
    const struct {
        const char *what;
        long long event;
        Json::Value data;
        bool eventReads;  // the queue readers take the event
        bool dataReads;   // JSON text carries the data, in a record as in a document
    } rows[] = {
        {"infinity", change, infinity, true, false},
        {"-infinity", change, -infinity, true, false},
        {"NaN", change, std::nan(""), true, false},
        {"the largest double", change, std::numeric_limits<double>::max(), true, true},
        {"event -1", -1, Json::Value(), false, true},
        {"event 2^32 - 1", 0xFFFFFFFFLL, Json::Value(), true, true},
        {"event 2^32", 0x100000000LL, Json::Value(), false, true},
        {"a 1 MiB string", change, std::string(1 << 20, 's'), true, true},
        {"nested to the readers' limit", change, nested(kMaxJsonDepth - 1), true, true},  // one level is the record's
        {"nested one level past it", change, nested(kMaxJsonDepth), true, false},
    };
    for (const auto &row : rows) {
        SCOPED_TRACE(row.what);
        const bool recordReads = row.eventReads && row.dataReads;
        std::string line;
        ASSERT_EQ(MakeQueueRecordLine(row.event, folder, row.data, line), recordReads);
        QueueRecord read;
        if (recordReads) {
            ASSERT_TRUE(ParseQueueRecord(line.substr(0, line.size() - 1), read));
            EXPECT_EQ(read.event, static_cast<unsigned>(row.event));
            EXPECT_EQ(ParseJson(line)["data"], row.data);
        }
        std::vector<std::string> logged;
        LogCapture::Clear();
        if (row.event >= std::numeric_limits<int>::min() && row.event <= std::numeric_limits<int>::max()) {
            stdfs::remove(queue);
            stdfs::remove(FILEINDEX_STATUS_CONF_PATH);
            EXPECT_EQ(AddCustomEvent(static_cast<int>(row.event), folder, row.data), recordReads);
            EXPECT_EQ(ReadFile(queue), recordReads ? line : "");
            EXPECT_EQ(StatusMgr::ShareIsNeedReindex("photo"), !recordReads);
            if (!recordReads) {
                logged.push_back("Refused a record its readers would skip, event=" + std::to_string(row.event) +
                                 ", path=" + folder);
            }
        }

        TestDoc doc;
        doc.Doc() = ParseJson(R"({"previous":true})");
        ASSERT_TRUE(doc.Save());
        doc.Doc()["data"] = row.data;
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
        EXPECT_EQ(doc.Save(), row.dataReads);
        EXPECT_EQ(ErrorHandler::GetError(), row.dataReads ? FILEIDX_ERR_NONE : FILEIDX_ERR_SAVE_CONFIG);
        TestDoc loaded;
        ASSERT_TRUE(loaded.Load());
        EXPECT_EQ(loaded.Doc(), row.dataReads ? doc.Doc() : ParseJson(R"({"previous":true})"));
        if (!row.dataReads) {
            logged.push_back("Failed to save json to " + kDocPath);
        }
        EXPECT_EQ(LogCapture::Messages(), logged);
    }
}

// A sweep that misread a temporary name would delete a live saver's file, or another document's, or
// leave orphans to pile up; every name a save makes must read back as its own saver's.
TEST(TempFileName, ReadsBackTheSaverOfEveryNameASaveMakesAndNoOtherName)
{
    for (const std::string name : {"folder.conf", "a", "x.tmp.7.abcdef", "sp ace\xff"}) {
        for (const pid_t saver : {1, 4194304, std::numeric_limits<pid_t>::max()}) {
            std::string made = TempFileTemplate(name, saver);
            ASSERT_EQ(made.compare(made.size() - 6, 6, "XXXXXX"), 0) << made;
            made.replace(made.size() - 6, 6, "aZ09xy");  // as mkostemp fills it in
            pid_t read = 0;
            EXPECT_TRUE(ParseTempFileName(made, name, read) && read == saver) << made;
        }
    }
    for (const char *entry : {"folder.conf", "folder.conf.tmp", "folder.conf.tmp.12.", "folder.conf.tmp.12.abcde",
                              "folder.conf.tmp.12.abcdefg", "folder.conf.tmp.12.abc-ef", "folder.conf.tmp.12x.abcdef",
                              "folder.conf.tmp..abcdef", "folder.conf.tmp.-12.abcdef", "folder.conf.tmp.+12.abcdef",
                              "folder.conf.tmp. 12.abcdef", "folder.conf.tmp.0.abcdef", "folder.conf.tmp.012.abcdef",
                              "folder.conf.tmp.2147483648.abcdef", "folder.conf.tmp.99999999999999999999.abcdef",
                              "status.conf.tmp.12.abcdef", "xfolder.conf.tmp.12.abcdef", "folder.conf.TMP.12.abcdef"}) {
        pid_t read = 0;
        EXPECT_FALSE(ParseTempFileName(entry, "folder.conf", read)) << entry;
    }
}

TEST(JsonText, ReadsExactlyOneStrictJsonValue)
{
    const struct {
        std::string text;
        bool valid;
    } cases[] = {
        {"{\"a\":1}", true}, {" \n{\"a\":[1,2.5e-3,-0,true,false,null]}\r\n\t", true}, {"5", true}, {"[]", true},
        {"\"top-level string\"", true}, {"\"\\u00e9\\n\\/\"", true},
        {std::string(100, '[') + std::string(100, ']'), true},  // deep, within the limit
        // Not one value, or not strict: comments, trailing commas, single quotes, bare names.
        {"", false}, {"   ", false}, {"{\"a\":1} x", false}, {"{\"a\":1}{}", false}, {"{\"a\":1,}", false},
        {"[1,]", false}, {"// comment\n{}", false}, {"{} /* comment */", false}, {"{'a':1}", false}, {"{1:2}", false},
        {"{\"a\" 1}", false}, {"NaN", false}, {"tru", false},
        // Numbers the JSON library would take on its own.
        {"01", false}, {"1.", false}, {"-", false}, {".5", false}, {"1e", false}, {"+1", false},
        // Strings: raw control characters, unknown or short escapes, no end.
        {"\"raw\x01" "control\"", false}, {"\"bad \\x escape\"", false}, {"\"\\u12\"", false},
        // Surrogate escapes only in pairs: an unpaired one would be decoded into a wrong character.
        {"\"\\ud83d\\ude00\"", true}, {"\"\\ud800\\u0041\"", false}, {"\"\\ud800\"", false}, {"\"\\udc00\"", false},
        {"\"\\ud800\\ud800\"", false},
        {"\"unterminated", false},
        {std::string(100000, '[') + std::string(100000, ']'), false},  // too deep: refused, not recursed into
    };
    for (const auto &c : cases) {
        Json::Value value;
        EXPECT_EQ(fromString(value, c.text), c.valid) << "text: " << c.text.substr(0, 40);
    }
}

}  // namespace
}  // namespace fileindex_test
