// The status file and its manager: pause state, per-share marks, the administrators' notification,
// and commands sent to the daemon while the status lock is held.
#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <climits>
#include <cstdint>
#include <ctime>

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

bool StatusLockIsHeld()
{
    const int fd = open(kStatusLock.c_str(), O_RDWR | O_CLOEXEC);
    const bool held = fd >= 0 && flock(fd, LOCK_EX | LOCK_NB) != 0;
    if (fd >= 0) {
        close(fd);
    }
    return held;
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

TEST_F(StatusTest, EmptyDocumentMeansRunningWithNoMarks)
{
    Status status;
    ASSERT_TRUE(status.Load());
    long long resumeTime = 42;
    EXPECT_TRUE(status.GetPauseInfo(resumeTime));
    EXPECT_EQ(resumeTime, -1);
    EXPECT_FALSE(status.ShareIsNoSpace("photo"));
    EXPECT_FALSE(status.ShareIsNeedReindex("photo"));
    EXPECT_FALSE(status.IsUpdated("photo"));
}

TEST_F(StatusTest, UpdatedMarksFollowTheJsonBooleanReading)
{
    WriteFile(kStatusConf, R"({"one":1,"zero":0,"no":false})");
    EXPECT_TRUE(StatusMgr::IsUpdated("one"));
    EXPECT_FALSE(StatusMgr::IsUpdated("zero"));
    EXPECT_FALSE(StatusMgr::IsUpdated("no"));
    EXPECT_FALSE(StatusMgr::IsUpdated("absent"));
    ASSERT_TRUE(StatusMgr::SetUpdated("no"));
    EXPECT_TRUE(StatusMgr::IsUpdated("no"));
    EXPECT_EQ(Stored(), ParseJson(R"({"one":1,"zero":0,"no":true})"));
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

TEST_F(StatusTest, AdministratorsAreToldOnceWhenAShareRunsOutOfSpace)
{
    ASSERT_TRUE(StatusMgr::ShareSetNoSpace("photo", true));
    ASSERT_TRUE(StatusMgr::ShareSetNoSpace("photo", true));
    EXPECT_TRUE(StatusMgr::ShareIsNoSpace("photo"));
    EXPECT_EQ(Stored()["no_space"], ParseJson(R"({"photo":true})"));

    const std::vector<Json::Value> runs = JournalOf("VLIBCExecv");
    ASSERT_EQ(runs.size(), 1u);
    EXPECT_EQ(runs[0]["args"], ParseJson(R"([")" FILEINDEX_NOTIFY_TOOL_PATH R"(", [")" FILEINDEX_NOTIFY_TOOL_PATH
                                         R"(", "-e", "false", "-c", "VEXO.KTP.AdminCenter.Application",
        "@administrators", "fileindex:fileindex_title", "fileindex:notify_no_space",
        "<a data-vexo-app=\"VEXO.KTP.AdminCenter.Application\" data-vexo-fn=\"VEXO.KTP.AdminCenter.MediaIndex.Main\" data-vexo-tab=\"fileIndex\">",
        "</a>"], 1])"));
    EXPECT_TRUE(LogCapture::Lines().empty());
}

TEST_F(StatusTest, FailedNotificationIsLoggedAndTheMarkIsSetAnyway)
{
    SetFaults(ParseJson(R"({"VLIBCExecv": {"result": -1}})"));
    ASSERT_TRUE(StatusMgr::ShareSetNoSpace("music", true));
    EXPECT_TRUE(StatusMgr::ShareIsNoSpace("music"));
    EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>{"NotifyNoSpace failed"});
}

TEST_F(StatusTest, MalformedResumeTimeIsReportedNotThrown)
{
    WriteFile(kStatusConf, R"({"resume_time":"abc"})");
    long long resumeTime = 42;
    EXPECT_FALSE(StatusMgr::GetPauseInfo(resumeTime));
    EXPECT_EQ(resumeTime, 42);
    EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>{"json exception"});

    WriteFile(kStatusConf, R"({"resume_time":1700000000})");
    EXPECT_TRUE(StatusMgr::GetPauseInfo(resumeTime));
    EXPECT_EQ(resumeTime, 1700000000);
}

TEST_F(StatusTest, PauseStoresAndSendsTheSameResumeTime)
{
    FrameListener daemon;
    const long long before = time(nullptr);
    ASSERT_TRUE(StatusMgr::Pause(2));
    const long long after = time(nullptr);
    ASSERT_TRUE(StatusMgr::Pause(0));

    const std::vector<std::string> frames = daemon.Connections(2);
    ASSERT_EQ(frames.size(), 2u);
    const Json::Value timed = ParseJson(FrameListener::TextOfFrame(frames[0]));
    EXPECT_EQ(timed["type"], "pause");
    const long long sent = timed["data"]["resume_time"].asInt64();
    EXPECT_GE(sent, before + 7200);
    EXPECT_LE(sent, after + 7200);
    EXPECT_EQ(FrameListener::TextOfFrame(frames[1]), R"({"data":{"resume_time":0},"type":"pause"})");
    EXPECT_EQ(Stored()["resume_time"].asInt64(), 0);
}

TEST_F(StatusTest, LongPauseWrapsIn32BitsAndIsStoredAsSent)
{
    FrameListener daemon;
    const int hours = 600000;  // 2,160,000,000 seconds: past what a 32-bit time holds
    const uint32_t now = static_cast<uint32_t>(time(nullptr));
    ASSERT_TRUE(StatusMgr::Pause(hours));
    const long long sent = ParseJson(FrameListener::TextOfFrame(daemon.Connections(1).at(0)))["data"]["resume_time"].asInt64();
    EXPECT_EQ(Stored()["resume_time"].asInt64(), sent);
    EXPECT_LT(sent, 0);
    const long long expected = static_cast<int32_t>(now + static_cast<uint32_t>(hours) * 3600u);
    EXPECT_NEAR(static_cast<double>(sent), static_cast<double>(expected), 2.0);
}

TEST_F(StatusTest, NegativePauseIsRefusedBeforeAnythingIsTouched)
{
    WriteFile(kStatusConf, R"({"resume_time":-1})");
    FrameListener daemon;
    LockHolder other(kStatusLock, true);
    EXPECT_FALSE(StatusMgr::Pause(-1));
    EXPECT_EQ(ErrorHandler::GetError(), FILEIDX_ERR_BAD_PARAM);
    EXPECT_TRUE(LogCapture::Lines().empty()) << "no lock was asked for";
    EXPECT_EQ(ReadFile(kStatusConf), R"({"resume_time":-1})");
    EXPECT_TRUE(daemon.Connections(0).empty());
}

TEST_F(StatusTest, ResumeWithoutADaemonStillStoresTheChange)
{
    WriteFile(kStatusConf, R"({"resume_time":0})");
    EXPECT_FALSE(StatusMgr::Resume());
    EXPECT_EQ(Stored()["resume_time"].asInt64(), -1);
    EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>{"SendCammandToDaemon failed"});
    EXPECT_FALSE(StatusLockIsHeld());
}

TEST_F(StatusTest, CommandIsSentWhileTheStatusLockIsHeld)
{
    FrameListener daemon;
    std::vector<bool> heldWhileSending;
    {
        SocketWriteRecorder writes([&] { heldWhileSending.push_back(StatusLockIsHeld()); });
        ASSERT_TRUE(StatusMgr::ShareRevive("photo"));
        ASSERT_TRUE(StatusMgr::Resume());
    }
    const std::vector<std::string> frames = daemon.Connections(2);
    ASSERT_EQ(frames.size(), 2u);
    EXPECT_EQ(FrameListener::TextOfFrame(frames[0]), R"({"data":{"share_name":"photo"},"type":"revive_share_worker"})");
    EXPECT_EQ(FrameListener::TextOfFrame(frames[1]), R"({"data":{},"type":"resume"})");
    EXPECT_EQ(heldWhileSending, std::vector<bool>(4, true)) << "two writes per command, all under the lock";
    EXPECT_FALSE(StatusLockIsHeld()) << "released after sending";
}

TEST_F(StatusTest, ReviveClearsTheNoSpaceMark)
{
    ASSERT_TRUE(StatusMgr::ShareSetNoSpace("photo", true));
    FrameListener daemon;
    ASSERT_TRUE(StatusMgr::ShareRevive("photo"));
    EXPECT_FALSE(StatusMgr::ShareIsNoSpace("photo"));
    EXPECT_EQ(Stored()["no_space"], Json::Value(Json::objectValue));
}

TEST_F(StatusTest, WritersFailOnAHeldLockWhileReadersGoOn)
{
    WriteFile(kStatusConf, R"({"resume_time":0,"no_space":{"photo":true}})");
    FrameListener daemon;
    LockHolder other(kStatusLock, true);
    EXPECT_FALSE(StatusMgr::Resume());
    EXPECT_EQ(ErrorHandler::GetError(), FILEIDX_ERR_LOCK);
    EXPECT_TRUE(daemon.Connections(0).empty());

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
    EXPECT_FALSE(StatusLockIsHeld());
}

TEST_F(StatusTest, SpaceIsShortOnlyForAnUnknownShareOrADefiniteShortage)
{
    const struct {
        const char *faults;
        bool enough;
    } cases[] = {
        {"{}", true},
        {R"({"VEXOQuotaIsEnough": {"result": 0, "error": 10496}})", false},
        {R"({"VEXOQuotaIsEnough": {"result": 0, "error": 9216}})", false},
        {R"({"VEXOQuotaIsEnough": {"result": 0, "error": 4660}})", true},
    };
    for (const auto &c : cases) {
        SetFaults(ParseJson(c.faults));
        EXPECT_EQ(IsShareSpaceEnough("photo"), c.enough) << c.faults;
    }
    EXPECT_TRUE(LogCapture::Lines().empty());
    EXPECT_FALSE(IsShareSpaceEnough("nosuch"));
    EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>{"VEXOShareGet failed, share=nosuch"});
}

}  // namespace
}  // namespace fileindex_test
