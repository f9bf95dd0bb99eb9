// The status file and its manager: pause state, per-share marks, the administrators' notification,
// commands sent to the daemon while the status lock is held, and the indexing progress report
// judged from the shares' queue files.
#include <cstdint>
#include <ctime>
#include <functional>
#include <memory>

#include "fileindex/error.h"
#include "fileindex/status.h"
#include "fileindex/utils.h"
#include "share/storage_paths.h"
#include "tests/support/child.h"
#include "tests/support/frame_listener.h"
#include "tests/support/log_capture.h"
#include "tests/support/sandbox.h"
#include "tests/support/syscall_faults.h"

using namespace VEXO::FILEINDEX;

namespace fileindex_test {
namespace {

const std::string kStatusConf = FILEINDEX_STATUS_CONF_PATH;
const std::string kStatusLock = FILEINDEX_STATUS_LOCK_PATH;

// Nothing reached the daemon: a command sent now is the first the listener gets.
void ExpectNothingSent(FrameListener &daemon)
{
    ASSERT_TRUE(SendCammandToDaemon("probe", Json::Value(Json::objectValue)));
    EXPECT_EQ(FrameListener::TextOfFrame(daemon.Connections(1).at(0)), R"({"data":{},"type":"probe"})");
}

class StatusTest : public SandboxTest {
protected:
    void SetUp() override
    {
        SandboxTest::SetUp();
        DeclareShares("volume1/photo volume1/music volume1/ro+read_only");
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
    }

    static Json::Value Stored() { return ParseJson(ReadFile(kStatusConf)); }
};

// An updated mark is set when it reads as true; a share mark cleared before any was set leaves a
// null that marks no share.
TEST_F(StatusTest, MarksReadAsJsonBooleansAndAClearedAbsentOneIsANull)
{
    WriteFile(kStatusConf, R"({"one":1,"zero":0,"no":false,"no_space":{"photo":true}})");
    EXPECT_TRUE(StatusMgr::IsUpdated("one"));
    for (const char *name : {"no_space", "zero", "no", "absent"}) {
        EXPECT_FALSE(StatusMgr::IsUpdated(name)) << name;
    }
    ASSERT_TRUE(StatusMgr::SetUpdated("no"));
    EXPECT_EQ(Stored(), ParseJson(R"({"one":1,"zero":0,"no":true,"no_space":{"photo":true}})"));

    stdfs::remove(kStatusConf);
    ASSERT_TRUE(StatusMgr::ShareSetNoSpace("photo", false));
    ASSERT_TRUE(StatusMgr::ShareSetNeedReindex("photo", false));
    EXPECT_EQ(ReadFile(kStatusConf), R"({"need_reindex":null,"no_space":null})");
    EXPECT_FALSE(StatusMgr::ShareIsNoSpace("photo"));
    EXPECT_FALSE(StatusMgr::ShareIsNeedReindex("photo"));
    for (const auto &[share, flag] : {std::pair{"photo", true}, {"music", true}, {"photo", false}}) {
        ASSERT_TRUE(StatusMgr::ShareSetNeedReindex(share, flag));
    }
    EXPECT_EQ(Stored()["need_reindex"], ParseJson(R"({"music":true})"));
    EXPECT_TRUE(StatusMgr::ShareIsNeedReindex("music"));
}

TEST_F(StatusTest, AdministratorsAreToldOnceWhenAShareRunsOutOfSpaceAndAFailedNoticeIsLogged)
{
    ASSERT_TRUE(StatusMgr::ShareSetNoSpace("photo", true));
    ASSERT_TRUE(StatusMgr::ShareSetNoSpace("photo", true));
    EXPECT_TRUE(StatusMgr::ShareIsNoSpace("photo"));
    EXPECT_EQ(Stored()["no_space"], ParseJson(R"({"photo":true})"));

    const std::vector<Json::Value> runs = Journal("VLIBCExecv");
    ASSERT_EQ(runs.size(), 1u);
    EXPECT_EQ(runs[0]["args"], ParseJson(R"([")" FILEINDEX_NOTIFY_TOOL_PATH R"(", [")" FILEINDEX_NOTIFY_TOOL_PATH
                                         R"(", "-e", "false", "-c", "VEXO.KTP.AdminCenter.Application",
        "@administrators", "fileindex:fileindex_title", "fileindex:notify_no_space",
        "<a data-vexo-app=\"VEXO.KTP.AdminCenter.Application\" )"
        R"(data-vexo-fn=\"VEXO.KTP.AdminCenter.MediaIndex.Main\" data-vexo-tab=\"fileIndex\">",
        "</a>"], 1])"));
    EXPECT_TRUE(LogCapture::Lines().empty());

    // A notice that cannot be posted is logged, and the share is marked all the same.
    SetFaults(ParseJson(R"({"VLIBCExecv": {"result": -1}})"));
    ASSERT_TRUE(StatusMgr::ShareSetNoSpace("music", true));
    EXPECT_TRUE(StatusMgr::ShareIsNoSpace("music"));
    EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>{"NotifyNoSpace failed"});
}

// No pause time means running (-1). One that cannot be read is the pause query's own failure: it
// logs "json exception", sets no error code and leaves the caller's value; the other calls go on.
TEST_F(StatusTest, PauseTimeReadsAsStoredAndAnUnreadableOneFailsOnlyTheQuery)
{
    const struct {
        const char *document;  // nullptr: no status file
        bool read;
        long long resumeTime;
    } cases[] = {
        {nullptr, true, -1},
        {R"({"resume_time":1700000000})", true, 1700000000},
        // What the library itself writes, and integral numbers however spelt.
        {R"({"resume_time":1.7e9,"no_space":null,"need_reindex":{"a":true},"n":null})", true, 1700000000},
        {R"({"resume_time":1.5})", true, 1},
        {R"({"resume_time":"abc"})", false, 42},
        {R"({"resume_time":{}})", false, 42},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.document == nullptr ? "(no file)" : c.document);
        stdfs::remove(kStatusConf);
        if (c.document != nullptr) {
            WriteFile(kStatusConf, c.document);
        }
        LogCapture::Clear();
        long long resumeTime = 42;
        EXPECT_EQ(StatusMgr::GetPauseInfo(resumeTime), c.read);
        EXPECT_EQ(resumeTime, c.resumeTime);
        EXPECT_EQ(LogCapture::Messages(), c.read ? std::vector<std::string>{} : std::vector<std::string>{"json exception"});
        EXPECT_EQ(ErrorHandler::GetError(), FILEIDX_ERR_NONE);
        EXPECT_TRUE(StatusMgr::ShareSetNoSpace("photo", false));
    }
}

TEST_F(StatusTest, PauseStoresAndSendsOneResumeTimeAndRefusesNegativeHours)
{
    const struct {
        int hours;
        bool accepted;
        bool wraps;  // now + hours * 3600 runs past what 32 signed bits hold
    } cases[] = {{2, true, false}, {0, true, false}, {600000, true, true}, {-1, false, false}};
    const auto resumeTime = [](int hours, time_t now) -> long long {
        return hours == 0 ? 0 : static_cast<int32_t>(static_cast<uint32_t>(now) + static_cast<uint32_t>(hours) * 3600u);
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.hours);
        WriteFile(kStatusConf, R"({"resume_time":-1})");
        LogCapture::Clear();
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
        FrameListener daemon;
        // A refused pause must not even ask for the lock, which another process holds meanwhile.
        const auto other = c.accepted ? nullptr : std::make_unique<LockHolder>(kStatusLock, true);
        const time_t before = time(nullptr);
        EXPECT_EQ(StatusMgr::Pause(c.hours), c.accepted);
        const time_t after = time(nullptr);
        if (!c.accepted) {
            EXPECT_EQ(ErrorHandler::GetError(), FILEIDX_ERR_BAD_PARAM);
            EXPECT_TRUE(LogCapture::Lines().empty());
            EXPECT_EQ(ReadFile(kStatusConf), R"({"resume_time":-1})");
            ExpectNothingSent(daemon);
            continue;
        }
        const Json::Value frame = ParseJson(FrameListener::TextOfFrame(daemon.Connections(1).at(0)));
        EXPECT_EQ(frame["type"], "pause");
        const long long sent = frame["data"]["resume_time"].asInt64();
        EXPECT_GE(sent, resumeTime(c.hours, before));
        EXPECT_LE(sent, resumeTime(c.hours, after));
        EXPECT_EQ(sent < 0, c.wraps);
        EXPECT_EQ(Stored()["resume_time"].asInt64(), sent);
    }
}

// When the daemon hears of a change, the status file already holds it and no other writer can
// have changed it since: every write of the command happens after the save, under the lock.
// Without a daemon the change is stored all the same.
TEST_F(StatusTest, CommandIsSentAfterTheSaveWhileTheStatusLockIsHeld)
{
    const struct {
        const char *before;
        std::function<bool()> change;
        const char *command;
        const char *after;
    } cases[] = {
        {R"({"no_space":{"photo":true}})", [] { return StatusMgr::ShareRevive("photo"); },
         R"({"data":{"share_name":"photo"},"type":"revive_share_worker"})", R"({"no_space":{}})"},
        {R"({"resume_time":0})", [] { return StatusMgr::Resume(); }, R"({"data":{},"type":"resume"})",
         R"({"resume_time":-1})"},
        {R"({"resume_time":-1})", [] { return StatusMgr::Pause(0); },
         R"({"data":{"resume_time":0},"type":"pause"})", R"({"resume_time":0})"},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.command);
        WriteFile(kStatusConf, c.before);
        FrameListener daemon;
        std::vector<std::pair<bool, std::string>> seenWhileSending;
        {
            SocketWriteRecorder writes(
                [&] { seenWhileSending.emplace_back(IsLockHeld(kStatusLock), ReadFile(kStatusConf)); });
            ASSERT_TRUE(c.change());
        }
        EXPECT_EQ(FrameListener::TextOfFrame(daemon.Connections(1).at(0)), c.command);
        EXPECT_EQ(seenWhileSending, (std::vector<std::pair<bool, std::string>>(2, {true, c.after})))
            << "two writes per command, both after the save and under the lock";
        EXPECT_FALSE(IsLockHeld(kStatusLock)) << "released after sending";
    }

    WriteFile(kStatusConf, R"({"resume_time":-1})");
    EXPECT_FALSE(StatusMgr::Pause(0));
    EXPECT_EQ(Stored()["resume_time"].asInt64(), 0);
    EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>{"SendCammandToDaemon failed"});
    EXPECT_FALSE(IsLockHeld(kStatusLock));
}

// A writer that meets another's lock fails and tells the daemon nothing; readers take no lock.
TEST_F(StatusTest, WritersFailOnAHeldLockWhileReadersGoOn)
{
    const std::string document = R"({"resume_time":0,"no_space":{"photo":true}})";
    WriteFile(kStatusConf, document);
    FrameListener daemon;
    LockHolder other(kStatusLock, true);
    EXPECT_FALSE(StatusMgr::Resume());
    EXPECT_EQ(ErrorHandler::GetError(), FILEIDX_ERR_LOCK);
    ExpectNothingSent(daemon);
    EXPECT_EQ(ReadFile(kStatusConf), document);
    long long resumeTime = 42;
    EXPECT_TRUE(StatusMgr::GetPauseInfo(resumeTime) && StatusMgr::ShareIsNoSpace("photo"));
    EXPECT_EQ(resumeTime, 0);
}

TEST_F(StatusTest, SpaceIsShortOnlyForAnUnknownShareOrADefiniteShortage)
{
    // The quota test's answer 0 with its error: 0x2900 space short, 0x2400 quota short, others unsure.
    for (const auto &[error, enough] : {std::pair{0, true}, {0x2900, false}, {0x2400, false}, {0x1234, true}}) {
        Json::Value faults(Json::objectValue);
        if (error != 0) {
            faults["VEXOQuotaIsEnough"] = ParseJson(R"({"result": 0, "error": )" + std::to_string(error) + "}");
        }
        SetFaults(faults);
        EXPECT_EQ(IsShareSpaceEnough("photo"), enough) << error;
    }
    EXPECT_TRUE(LogCapture::Lines().empty());
    EXPECT_FALSE(IsShareSpaceEnough("nosuch"));
    EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>{"VEXOShareGet failed, share=nosuch"});
}

class ProgressTest : public StatusTest {
protected:
    void SetUp() override
    {
        StatusTest::SetUp();
        for (const char *folder : {"/photo/folder", "/photo/folder2", "/music/m", "/ro/r"}) {
            stdfs::create_directories(HostPath("/volume1" + std::string(folder)));
        }
        WriteFile(FILEINDEX_FOLDER_CONF_PATH, R"({"/photo/folder":{},"/photo/folder2":{},"/music/m":{},"/ro/r":{}})");
    }

    // Writes the share's queue file, or its ".tmp" companion.
    static void WriteQueue(const std::string &share, const std::string &lines, bool companion = false)
    {
        stdfs::create_directories(MetadataDirPath(SharePath(share)));
        const std::string queue = StoragePath(SharePath(share), kQueueFileName);
        WriteFile(companion ? QueueCompanionPath(queue) : queue, lines);
    }

    static std::string Record(unsigned event, const std::string &path, const std::string &pathOld = "")
    {
        return R"({"event":)" + std::to_string(event) + R"(,"path":")" + HostPath(path) + "\"" +
               (pathOld.empty() ? "" : R"(,"path_old":")" + HostPath(pathOld) + "\"") + "}\n";
    }
};

TEST_F(ProgressTest, FolderIsPendingOnlyForEventsOnItOrInsideIt)
{
    const struct {
        std::string queue;      // the queue file, "" when absent
        std::string companion;  // the ".tmp" file, "" when absent
        const char *folder;
        const char *word;
        std::vector<std::string> messages;
    } cases[] = {
        {"", "", "/photo/folder", "finished", {}},
        {"", Record(1, "/volume1/photo/folder/a.jpg"), "/photo/folder", "processing", {}},
        {Record(1, "/volume1/photo/folder"), "", "/photo/folder", "processing", {}},
        {Record(1, "/volume1/photo/folder2/a.jpg"), "", "/photo/folder", "finished", {}},
        {Record(1, "/volume1/photo/folder2/a.jpg"), "", "/photo/folder2", "processing", {}},
        {Record(256, "/volume1/music/a.jpg", "/volume1/photo/folder/a.jpg"), "", "/photo/folder", "processing", {}},
        {Record(2, "/volume1/music/a.jpg", "/volume1/photo/folder/a.jpg"), "", "/photo/folder", "finished", {}},
        {"[1]\n{\"path\":\"x\"}\n" R"({"event":-1,"path":")" + HostPath("/volume1/photo/folder") + "\"}\n{\"event\":1,",
         "", "/photo/folder", "finished",
         {"Malformed command: [1]", R"(Malformed command: {"path":"x"})",
          R"(Malformed command: {"event":-1,"path":")" + HostPath("/volume1/photo/folder") + "\"}",
          R"(Malformed command: {"event":1,)"}},
        {"", "", "/ro/r", "paused", {}},  // may not be indexed
    };
    for (const auto &c : cases) {
        SetUp();
        if (!c.queue.empty()) {
            WriteQueue("photo", c.queue);
        }
        if (!c.companion.empty()) {
            WriteQueue("photo", c.companion, true);
        }
        EXPECT_EQ(StatusMgr::GetFolderStatus(c.folder), c.word) << c.folder << " " << c.queue << c.companion;
        EXPECT_EQ(LogCapture::Messages(), c.messages) << c.queue;
    }
}

TEST_F(ProgressTest, PendingWorkReadsAsThePauseStateAllows)
{
    const long long now = time(nullptr);
    const struct {
        std::string status;
        const char *folderWord;
        const char *overallWord;  // null: GetStatus fails
    } cases[] = {
        {R"({"resume_time":-1})", "processing", "processing"},
        {R"({"resume_time":0})", "paused", "paused"},
        {R"({"resume_time":)" + std::to_string(now + 3600) + "}", "paused", "paused"},
        {R"({"resume_time":)" + std::to_string(now - 1) + "}", "processing", "processing"},
        {R"({"resume_time":"abc"})", "processing", nullptr},
        {R"({"no_space":{"photo":true}})", "err_no_space", "processing"},
    };
    WriteQueue("photo", Record(1, "/volume1/photo/folder/a"));
    for (const auto &c : cases) {
        WriteFile(FILEINDEX_STATUS_CONF_PATH, c.status);
        EXPECT_EQ(StatusMgr::GetFolderStatus("/photo/folder"), c.folderWord) << c.status;
        std::string overall = "untouched";
        EXPECT_EQ(StatusMgr::GetStatus(overall), c.overallWord != nullptr) << c.status;
        EXPECT_EQ(overall, c.overallWord != nullptr ? c.overallWord : "untouched") << c.status;
    }
}

TEST_F(ProgressTest, NoSpaceIsAnsweredBeforeTheQueueIsRead)
{
    WriteFile(FILEINDEX_STATUS_CONF_PATH, R"({"no_space":{"photo":true}})");
    WriteQueue("photo", "half a line");
    EXPECT_EQ(StatusMgr::GetFolderStatus("/photo/folder"), "err_no_space");
    EXPECT_TRUE(LogCapture::Lines().empty());
}

TEST_F(ProgressTest, OverallStatusCountsQueueFilesOfIndexableFoldersOnly)
{
    const struct {
        const char *share;  // whose queue file exists, null for none
        bool companion;
        const char *word;
    } cases[] = {
        {nullptr, false, "finished"},
        {"photo", true, "processing"},  // an empty ".tmp" file alone is pending work
        {"ro", false, "finished"},  // its only folder may not be indexed
    };
    for (const auto &c : cases) {
        SetUp();
        if (c.share != nullptr) {
            WriteQueue(c.share, "", c.companion);
        }
        std::string overall;
        EXPECT_TRUE(StatusMgr::GetStatus(overall));
        EXPECT_EQ(overall, c.word) << (c.share != nullptr ? c.share : "no queue");
    }
}

}  // namespace
}  // namespace fileindex_test
