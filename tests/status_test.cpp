// The status file and its manager: pause state, per-share marks, the administrators' notification,
// commands sent to the daemon while the status lock is held, and the indexing progress report
// judged from the shares' queue files.
#include <cstdint>
#include <ctime>
#include <functional>
#include <map>
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

// status.conf as other programs leave it: a client's updated mark written as a text, a share mark
// that is not an object, a pause time that is not a number. An operation that cannot read the member
// it touches fails alone ("json exception", error 6, the file as it was, nothing sent); every other
// operation answers and writes as on a well-formed file, and updated marks read as the JSON library
// reads booleans (1 is true). An unreadable pause time is the pause query's own failure, which sets
// no error code. A top level that is not an object is refused by every operation as unreadable,
// instead of an exception thrown out of the library into a caller that cannot expect it. A writer
// that meets another process's lock fails and sends nothing; readers take no lock.
TEST_F(StatusTest, AMemberOfTheWrongTypeFailsOnlyTheOperationsThatTouchIt)
{
    long long resumeTime = 42;
    // Each operation, given the word after its name in a row.
    const std::map<std::string, std::function<bool(const std::string &)>> operations = {
        {"IsUpdated", &StatusMgr::IsUpdated},
        {"SetUpdated", &StatusMgr::SetUpdated},
        {"ShareIsNoSpace", &StatusMgr::ShareIsNoSpace},
        {"ShareIsNeedReindex", &StatusMgr::ShareIsNeedReindex},
        {"ShareRevive", &StatusMgr::ShareRevive},
        {"ShareSetNoSpace", [](const std::string &flag) { return StatusMgr::ShareSetNoSpace("photo", flag == "on"); }},
        {"ShareSetNeedReindex",
         [](const std::string &flag) { return StatusMgr::ShareSetNeedReindex("photo", flag == "on"); }},
        {"Pause", [](const std::string &) { return StatusMgr::Pause(0); }},
        {"Resume", [](const std::string &) { return StatusMgr::Resume(); }},
        {"GetPauseInfo", [&](const std::string &) { return StatusMgr::GetPauseInfo(resumeTime); }},
    };
    const std::string marks = R"({"one":1,"zero":0,"str":"x"})";
    const std::string noSpaceList = R"({"no_space":[],"need_reindex":{"music":true},"resume_time":0})";
    const std::string reindexNumber = R"({"need_reindex":5})";
    const std::vector<std::string> quiet, exception = {"json exception"};
    const auto none = FILEIDX_ERR_NONE, unreadable = FILEIDX_ERR_LOAD_CONFIG;
    struct Row {
        std::string document;  // "": no status file
        std::string operation;
        std::string answer;  // GetPauseInfo's followed by the caller's value afterwards
        std::vector<std::string> log;
        _tag_fileindex_err_ error;
        const char *after;  // null: the file as it was
        bool lockedByAnother = false;
    };
    std::vector<Row> cases = {
        {marks, "IsUpdated one", "true", quiet, none, nullptr},
        {marks, "IsUpdated zero", "false", quiet, none, nullptr},
        {marks, "IsUpdated str", "false", exception, unreadable, nullptr},
        {marks, "SetUpdated str", "true", quiet, none, R"({"one":1,"zero":0,"str":true})"},
        {marks, "Pause", "true", quiet, none, R"({"one":1,"zero":0,"str":"x","resume_time":0})"},
        {marks, "ShareSetNoSpace on", "true", quiet, none,
         R"({"one":1,"zero":0,"str":"x","no_space":{"photo":true}})"},
        {marks, "ShareRevive photo", "true", quiet, none, R"({"one":1,"zero":0,"str":"x","no_space":null})"},
        {noSpaceList, "ShareSetNoSpace on", "false", exception, unreadable, nullptr},
        {noSpaceList, "ShareRevive photo", "false", exception, unreadable, nullptr},
        {noSpaceList, "ShareIsNoSpace photo", "false", quiet, none, nullptr},
        {noSpaceList, "IsUpdated no_space", "false", exception, unreadable, nullptr},
        {noSpaceList, "ShareSetNeedReindex on", "true", quiet, none,
         R"({"no_space":[],"need_reindex":{"music":true,"photo":true},"resume_time":0})"},
        {noSpaceList, "Resume", "true", quiet, none,
         R"({"no_space":[],"need_reindex":{"music":true},"resume_time":-1})"},
        {noSpaceList, "GetPauseInfo", "true 0", quiet, none, nullptr},
        {marks, "Resume", "false", {"Failed to lock folder"}, FILEIDX_ERR_LOCK, nullptr, true},
        {noSpaceList, "GetPauseInfo", "true 0", quiet, none, nullptr, true},
        {noSpaceList, "ShareIsNeedReindex music", "true", quiet, none, nullptr, true},
        {reindexNumber, "ShareSetNeedReindex off", "false", exception, unreadable, nullptr},
        {reindexNumber, "IsUpdated need_reindex", "true", quiet, none, nullptr},
        // Clearing a mark that was never set leaves a null, which marks no share.
        {"", "ShareSetNeedReindex off", "true", quiet, none, R"({"need_reindex":null})"},
        {"", "GetPauseInfo", "true -1", quiet, none, nullptr},
        // What the library itself writes, and integral numbers however spelt.
        {R"({"resume_time":1.7e9,"no_space":null,"need_reindex":{"a":true},"n":null})", "GetPauseInfo",
         "true 1700000000", quiet, none, nullptr},
        {R"({"resume_time":"abc"})", "GetPauseInfo", "false 42", exception, none, nullptr},
        {R"({"resume_time":{}})", "ShareSetNoSpace off", "true", quiet, none, R"({"resume_time":{},"no_space":null})"},
    };
    for (const char *document : {"{\"resume_time\":", "0", "[]", "null", "\"x\""}) {
        for (const auto &operation : operations) {
            const std::string answer = operation.first == "GetPauseInfo" ? "false 42" : "false";
            cases.push_back({document, operation.first + " photo", answer, {"Failed to load json from " + kStatusConf},
                             unreadable, nullptr});
        }
    }
    for (const Row &c : cases) {
        SCOPED_TRACE(c.document + " " + c.operation);
        stdfs::remove(kStatusConf);
        if (!c.document.empty()) {
            WriteFile(kStatusConf, c.document);
        }
        FrameListener daemon;
        const auto other = c.lockedByAnother ? std::make_unique<LockHolder>(kStatusLock, true) : nullptr;
        LogCapture::Clear();
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
        resumeTime = 42;
        const size_t space = c.operation.find(' ');
        const std::string name = c.operation.substr(0, space);
        const bool result = operations.at(name)(space == std::string::npos ? "" : c.operation.substr(space + 1));
        EXPECT_EQ((result ? "true" : "false") + (name == "GetPauseInfo" ? " " + std::to_string(resumeTime) : ""),
                  c.answer);
        EXPECT_EQ(LogCapture::Messages(), c.log);
        EXPECT_EQ(ErrorHandler::GetError(), c.error);
        if (c.after == nullptr) {
            EXPECT_EQ(ReadFile(kStatusConf), c.document);
        } else {
            EXPECT_EQ(Stored(), ParseJson(c.after));
        }
        EXPECT_EQ(IsLockHeld(kStatusLock), c.lockedByAnother);
        if (!result) {
            ExpectNothingSent(daemon);
        }
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

// An out-of-space share is answered before its queue is read: the torn line in it is not logged.
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
        {R"({"resume_time":0,"no_space":[],"one":"x"})", "paused", "paused"},  // marks of the wrong type
    };
    WriteQueue("photo", "half a line\n" + Record(1, "/volume1/photo/folder/a"));
    for (const auto &c : cases) {
        WriteFile(FILEINDEX_STATUS_CONF_PATH, c.status);
        LogCapture::Clear();
        EXPECT_EQ(StatusMgr::GetFolderStatus("/photo/folder"), c.folderWord) << c.status;
        EXPECT_EQ(LogCapture::Lines().empty(), std::string(c.folderWord) == "err_no_space") << c.status;
        std::string overall = "untouched";
        EXPECT_EQ(StatusMgr::GetStatus(overall), c.overallWord != nullptr) << c.status;
        EXPECT_EQ(overall, c.overallWord != nullptr ? c.overallWord : "untouched") << c.status;
    }
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
