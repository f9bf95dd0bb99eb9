// The status file and its manager: pause state, per-share marks, the administrators' notification,
// and commands sent to the daemon while the status lock is held.
#include <climits>
#include <cstdint>
#include <ctime>
#include <functional>
#include <memory>

#include "fileindex/error.h"
#include "fileindex/status.h"
#include "fileindex/utils.h"
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
        DeclareShares("volume1/photo volume2/music");
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
    }

    static Json::Value Stored() { return ParseJson(ReadFile(kStatusConf)); }
};

TEST_F(StatusTest, UpdatedMarksFollowTheJsonBooleanReading)
{
    WriteFile(kStatusConf, R"({"one":1,"zero":0,"no":false,"no_space":{"photo":true}})");
    EXPECT_TRUE(StatusMgr::IsUpdated("one"));
    EXPECT_FALSE(StatusMgr::IsUpdated("no_space"));
    EXPECT_FALSE(StatusMgr::IsUpdated("zero"));
    EXPECT_FALSE(StatusMgr::IsUpdated("no"));
    EXPECT_FALSE(StatusMgr::IsUpdated("absent"));
    ASSERT_TRUE(StatusMgr::SetUpdated("no"));
    EXPECT_TRUE(StatusMgr::IsUpdated("no"));
    EXPECT_EQ(Stored(), ParseJson(R"({"one":1,"zero":0,"no":true,"no_space":{"photo":true}})"));
}

TEST_F(StatusTest, ClearingAnAbsentMarkLeavesANullThatMarksNoShare)
{
    ASSERT_TRUE(StatusMgr::ShareSetNoSpace("photo", false));
    ASSERT_TRUE(StatusMgr::ShareSetNeedReindex("photo", false));
    EXPECT_EQ(ReadFile(kStatusConf), R"({"need_reindex":null,"no_space":null})");
    EXPECT_FALSE(StatusMgr::ShareIsNoSpace("photo"));
    EXPECT_FALSE(StatusMgr::ShareIsNeedReindex("photo"));

    ASSERT_TRUE(StatusMgr::ShareSetNeedReindex("photo", true));
    ASSERT_TRUE(StatusMgr::ShareSetNeedReindex("music", true));
    ASSERT_TRUE(StatusMgr::ShareSetNeedReindex("photo", false));
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

TEST_F(StatusTest, NoResumeTimeMeansRunning)
{
    long long resumeTime = 42;
    EXPECT_TRUE(StatusMgr::GetPauseInfo(resumeTime));  // no status file yet
    EXPECT_EQ(resumeTime, -1);

    WriteFile(kStatusConf, R"({"resume_time":1700000000})");
    EXPECT_TRUE(StatusMgr::GetPauseInfo(resumeTime));
    EXPECT_EQ(resumeTime, 1700000000);
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

TEST_F(StatusTest, WritersFailOnAHeldLockWhileReadersGoOn)
{
    WriteFile(kStatusConf, R"({"resume_time":0,"no_space":{"photo":true}})");
    FrameListener daemon;
    LockHolder other(kStatusLock, true);
    EXPECT_FALSE(StatusMgr::Resume());
    EXPECT_EQ(ErrorHandler::GetError(), FILEIDX_ERR_LOCK);
    ExpectNothingSent(daemon);

    long long resumeTime = 42;
    EXPECT_TRUE(StatusMgr::GetPauseInfo(resumeTime));
    EXPECT_EQ(resumeTime, 0);
    EXPECT_TRUE(StatusMgr::ShareIsNoSpace("photo"));
    EXPECT_FALSE(StatusMgr::ShareIsNeedReindex("photo"));
    EXPECT_EQ(ReadFile(kStatusConf), R"({"resume_time":0,"no_space":{"photo":true}})");
}

TEST_F(StatusTest, UnreadableStatusFileFailsReadersAndWriters)
{
    WriteFile(kStatusConf, "{\"resume_time\":");
    long long resumeTime = 42;
    EXPECT_FALSE(StatusMgr::GetPauseInfo(resumeTime));
    EXPECT_FALSE(StatusMgr::ShareIsNoSpace("photo"));
    EXPECT_FALSE(StatusMgr::SetUpdated("x"));
    EXPECT_EQ(ErrorHandler::GetError(), FILEIDX_ERR_LOAD_CONFIG);
    EXPECT_EQ(ReadFile(kStatusConf), "{\"resume_time\":");
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

}  // namespace
}  // namespace fileindex_test
