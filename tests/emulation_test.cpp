// The emulated platform as other programs' tests drive it: its state files, fault rules and journal.
#include <unistd.h>

#include <chrono>
#include <functional>
#include <string>
#include <thread>
#include <vector>

#include "platform/error_state.h"
#include "platform/fs.h"
#include "platform/monitor_queue.h"
#include "platform/service.h"
#include "platform/share_db.h"
#include "share/storage_paths.h"
#include "tests/support/sandbox.h"

namespace fileindex_test {
namespace {

using VEXO::FILEINDEX::MetadataDirPath;
using VEXO::VNOTIFYD::MonitorQueue;
using VEXO::VNOTIFYD::MONITOR_QUEUE_TYPE_0;
using VEXO::VNOTIFYD::MONITOR_QUEUE_TYPE_1;

const std::string kVolume = FILEINDEX_ROOT_DIR "/volume1";

std::string Vol(const std::string &relative) { return kVolume + "/" + relative; }

// True while the process exists and has not exited; a zombie nobody reaped has exited.
bool ProcessRuns(pid_t pid)
{
    const std::string stat = ReadFile("/proc/" + std::to_string(pid) + "/stat");
    const size_t commEnd = stat.rfind(')');
    return commEnd != std::string::npos && commEnd + 2 < stat.size() && stat[commEnd + 2] != 'Z';
}

class EmulationTest : public SandboxTest {
protected:
    void SetUp() override
    {
        SandboxTest::SetUp();
        stdfs::create_directories(kVolume);
        WriteFile(StatePath("shares.json"), R"([{"name": "Photo", "path": ")" + Vol("photo") + R"("},
                                            {"name": "photo_raw", "path": ")" + Vol("photo/raw/") + R"("},
                                            {"name": "vault", "path": ")" + Vol("vault") + R"("}])");
    }

    void TearDown() override { VLIBServiceStop("indexd", 0); }  // leave no launched program behind
};

TEST_F(EmulationTest, ForcedCallReturnsTheRuleAndDoesNothingElse)
{
    const std::string marker = Vol("marker");
    WriteFile(StatePath("service_commands.json"), R"({"indexd": ["/bin/sh", "-c", "touch )" + marker + R"("]})");
    const MonitorQueue queue(ParseJson(R"({"queue": "/q/one", "config": []})"));
    struct Case {
        const char *op;
        std::function<int()> call;
        Json::Value journaled;
        std::string untouched;
    };
    const Case cases[] = {
        {"VLIBServiceStart", [] { return VLIBServiceStart("indexd", 1); }, -1, StatePath("services.json")},
        {"VLIBCExec", [&] { return VLIBCExec("/bin/sh", "-c", ("touch " + marker).c_str(), nullptr); }, -1, marker},
        {"VEXOEAMKDir", [] { return VEXOEAMKDir(0, MetadataDirPath(kVolume).c_str()); }, -1, MetadataDirPath(kVolume)},
        {"VEXOSMBSetSpotlight", [] { return VEXOSMBSetSpotlight(1); }, -1, StatePath("smb.json")},
        {"MonitorQueue::Upsert", [&] { return int(MonitorQueue::Upsert(queue, "fileindex", MONITOR_QUEUE_TYPE_1)); },
         false, StatePath("monitor_queues.json")},
    };
    for (const Case &c : cases) {
        SCOPED_TRACE(c.op);
        const int result = c.journaled.isBool() ? 0 : -1;
        WriteFile(StatePath("faults.json"), std::string(R"({")") + c.op + R"(": {"result": )" + std::to_string(result) +
                                            R"(, "error": 4660, "file": "faults", "line": 77}})");
        const size_t before = Journal().size();
        EXPECT_EQ(result, c.call());
        EXPECT_EQ(0x1234, VLIBCErrGet());
        EXPECT_STREQ("faults", VLIBCErrorGetFile());
        EXPECT_EQ(77, VLIBCErrorGetLine());
        EXPECT_FALSE(stdfs::exists(c.untouched));
        const std::vector<Json::Value> journal = Journal();
        ASSERT_EQ(before + 1, journal.size());
        EXPECT_EQ(c.op, journal.back()["op"].asString());
        EXPECT_EQ(c.journaled, journal.back()["result"]);
        EXPECT_EQ(Json::Value(true), journal.back()["forced"]);
        EXPECT_EQ(getpid(), journal.back()["pid"].asInt());
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
    EXPECT_FALSE(stdfs::exists(marker));  // the service's command never ran either
    EXPECT_EQ(ParseJson(R"(["indexd", 1])"), Journal().front()["args"]);
}

TEST_F(EmulationTest, MatchAndAfterDecideWhichCallsAreForced)
{
    const std::string iso = Vol("iso"), x = Vol("x\xe9-\xff\xfe"), y = Vol("y");
    stdfs::create_directories(iso);
    const int real = VEXOGetFSType(kVolume.c_str(), 0);
    ASSERT_GE(real, 0);
    WriteFile(StatePath("faults.json"), R"({"VEXOGetFSType": [{"match": ")" + iso + R"(", "result": 10},
                                                          {"match": ")" + iso + R"(", "result": 99}],
                                        "VEXOEAMKDir": {"match": ")" + x + R"(", "after": 2, "result": -1}})");
    EXPECT_EQ(10, VEXOGetFSType(iso.c_str(), 0));
    EXPECT_EQ(real, VEXOGetFSType(kVolume.c_str(), 0));

    // Only calls the rule matches count towards "after"; once reached, the rule stays in force.
    std::string outcomes;  // each call's result, "forced" when its journal line says so
    for (const std::string &path : {y, x, y, y, x, x, x}) {
        outcomes += std::to_string(VEXOEAMKDir(0, path.c_str()));
        outcomes += Journal().back()["forced"].asBool() ? " forced " : " ";
    }
    EXPECT_EQ("0 0 0 0 0 -1 forced -1 forced ", outcomes);
    EXPECT_EQ(x, Journal().back()["args"][1].asString()) << "the journal keeps the bytes of a path";

    // A changed file starts the count afresh; an emptied one forces nothing.
    WriteFile(StatePath("faults.json"), R"({"VEXOEAMKDir": {"match": ")" + x + R"(", "after": 1, "result": -1}})");
    EXPECT_EQ(0, VEXOEAMKDir(0, x.c_str()));
    EXPECT_EQ(-1, VEXOEAMKDir(0, x.c_str()));
    WriteFile(StatePath("faults.json"), "{}");
    EXPECT_EQ(real, VEXOGetFSType(iso.c_str(), 0));
    EXPECT_EQ(0, VEXOEAMKDir(0, x.c_str()));
}

TEST_F(EmulationTest, SharesAreFoundByNameAndByPathAndFollowEditsOfTheDatabase)
{
    // A share holds a path by whole components; the longest one holding it wins.
    const char *const cases[][3] = {  // path, holding share (none: null), its path
        {"photo", "Photo", "photo"},
        {"photo/rawfile/a", "Photo", "photo"},
        {"photo/raw", "photo_raw", "photo/raw"},
        {"photo/raw/x.dng", "photo_raw", "photo/raw"},
        {"photos/a.jpg", nullptr, ""},
        {"vaultx", nullptr, ""},
    };
    for (const auto &c : cases) {
        char name[64] = "stale";
        char sharePath[4096] = "stale";
        const int result = VEXOShareNamePathGet(Vol(c[0]).c_str(), name, sizeof(name), sharePath, sizeof(sharePath));
        EXPECT_EQ(c[1] != nullptr ? c[1] + (" " + Vol(c[2])) : "error " + std::to_string(0x1400),
                  result == 0 ? name + (" " + std::string(sharePath)) : "error " + std::to_string(VLIBCErrGet()))
            << c[0];
    }

    PVEXOSHARE share = nullptr;
    for (const char *query : {"Photo", "PHOTO", "photo"}) {
        ASSERT_EQ(0, VEXOShareGet(query, &share)) << query;
        EXPECT_EQ("Photo " + Vol("photo"), share->szName + (" " + std::string(share->szPath)));
        VEXOShareFree(share);
    }
    EXPECT_LT(VEXOShareGet("photos", &share), 0);
    EXPECT_EQ(0x1400, VLIBCErrGet());
    EXPECT_EQ(nullptr, share);

    // Rewritten in place at once with another text of the same length.
    WriteFile(StatePath("shares.json"), R"([{"name": "vaulT", "path": "/a/b"}])");
    ASSERT_EQ(0, VEXOShareGet("vault", &share));
    EXPECT_EQ("vaulT /a/b", share->szName + (" " + std::string(share->szPath)));
    VEXOShareFree(share);

    // As on a file system with coarse time stamps: the rewrite keeps size, inode and time.
    const stdfs::file_time_type written = stdfs::last_write_time(StatePath("shares.json"));
    WriteFile(StatePath("shares.json"), R"([{"name": "vaulX", "path": "/a/b"}])");
    stdfs::last_write_time(StatePath("shares.json"), written);
    EXPECT_LT(VEXOShareGet("vault", &share), 0);
    EXPECT_EQ(0x1400, VLIBCErrGet());
}

// A service's program is launched once, in a session of its own, and is gone when the stop returns.
// A start that waits for a ready path returns once the program is ready, and a program that ends
// without getting ready does not hold the start for the whole wait.
TEST_F(EmulationTest, ServiceProgramIsLaunchedOnceAndStopEndsIt)
{
    const std::string pidFile = Vol("indexd.pid"), ready = Vol("indexd.sock");
    WriteFile(StatePath("service_commands.json"),
              R"({"indexd": {"command": ["/bin/sh", "-c", "echo $$ >> )" + pidFile + "; sleep 0.3; touch " + ready +
                  R"(; exec sleep 60"], "ready": ")" + ready + R"("},
                  "quitter": {"command": ["/bin/true"], "ready": ")" + ready + R"(.never"}})");
    const auto services = [] { return ParseJson(ReadFile(StatePath("services.json"))); };

    ASSERT_EQ(0, VLIBServiceStart("indexd", 0));
    EXPECT_TRUE(stdfs::exists(ready));
    const pid_t pid = atoi(ReadFile(pidFile).c_str());
    ASSERT_GT(pid, 0);
    EXPECT_TRUE(ProcessRuns(pid));
    EXPECT_EQ(pid, getsid(pid));
    EXPECT_EQ(Json::Value(true), services()["indexd"]["running"]);
    EXPECT_EQ(pid, services()["indexd"]["pid"].asInt());

    ASSERT_EQ(0, VLIBServiceStart("indexd", 0));
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
    EXPECT_EQ(std::to_string(pid) + "\n", ReadFile(pidFile)) << "starting a running service launches nothing more";

    ASSERT_EQ(0, VLIBServiceStop("indexd", 0));
    EXPECT_FALSE(ProcessRuns(pid));
    EXPECT_EQ(ParseJson(R"({"indexd": {"running": false}})"), services());
    EXPECT_EQ(3u, Journal().size());

    const auto started = std::chrono::steady_clock::now();
    EXPECT_EQ(0, VLIBServiceStart("quitter", 0));
    EXPECT_LT(std::chrono::steady_clock::now() - started, std::chrono::seconds(2));
}

TEST_F(EmulationTest, ExecSucceedsOnlyOnExitStatusZero)
{
    const char *const quoting[] = {"sh", "-c", R"(test "$0" = a && test "$1" = "b c")", "a", "b c", nullptr};
    const char *const exit3[] = {"sh", "-c", "exit 3", nullptr};
    const std::pair<std::function<int()>, int> cases[] = {  // the call, the error it leaves (0: success)
        {[] { return VLIBCExec("/bin/sh", "-c", R"(test "$0" = a && test "$1" = "b c")", "a", "b c", nullptr); }, 0},
        {[&] { return VLIBCExecv("/bin/sh", quoting, 0); }, 0},
        {[&] { return VLIBCExecv("/bin/sh", exit3, 0); }, 0x3301},
        {[] { return VLIBCExec("/bin/sh", "-c", "kill -9 $$", nullptr); }, 0x3301},
        {[] { return VLIBCExec("/nonexistent/program", nullptr); }, 0x3300},
    };
    for (size_t i = 0; i < std::size(cases); ++i) {
        VLIBCErrSetEx(0, "", 0);
        EXPECT_EQ(cases[i].second == 0 ? 0 : -1, cases[i].first()) << "case " << i;
        EXPECT_EQ(cases[i].second, VLIBCErrGet()) << "case " << i;
    }
}

TEST_F(EmulationTest, MonitorQueuesKeepOneRegistrationPerOwnerAndQueue)
{
    for (const char *malformed : {
             R"([])", R"({"queue": "", "config": []})",
             R"({"queue": "/q", "config": [{"path": "/p", "mask": 1.5, "ignore": []}]})",
             R"({"queue": "/q", "config": [{"mask": 1, "ignore": []}]})",
             R"({"queue": "/q", "config": [{"path": "/p", "mask": 1, "ignore": ["x", 2]}]})",
         }) {
        EXPECT_THROW(MonitorQueue(ParseJson(malformed)), std::invalid_argument) << malformed;
    }

    const std::string first = R"({"queue": "/q/one", "config": [{"path": "/a", "mask": 1, "ignore": []}]})";
    const std::string changed = R"({"queue": "/q/one", "config": [{"path": "/b", "mask": 2, "ignore": ["@eaDir"]}]})";
    const std::string second = R"({"queue": "/q/two", "config": []})";
    ASSERT_TRUE(MonitorQueue::Upsert(MonitorQueue(ParseJson(first)), "fileindex", MONITOR_QUEUE_TYPE_1));
    ASSERT_TRUE(MonitorQueue::Upsert(MonitorQueue(ParseJson(changed)), "fileindex", MONITOR_QUEUE_TYPE_0));
    ASSERT_TRUE(MonitorQueue::Upsert(MonitorQueue(ParseJson(second)), "fileindex", MONITOR_QUEUE_TYPE_1));
    ASSERT_TRUE(MonitorQueue::Upsert(MonitorQueue(ParseJson(first)), "backup", MONITOR_QUEUE_TYPE_1));
    Json::Value expected = ParseJson(R"({"fileindex": {"/q/one": {"type": 0, "description": )" + changed +
                                     R"(}, "/q/two": {"type": 1, "description": )" + second +
                                     R"(}}, "backup": {"/q/one": {"type": 1, "description": )" + first + "}}}");
    EXPECT_EQ(expected, ParseJson(ReadFile(StatePath("monitor_queues.json"))));

    ASSERT_TRUE(MonitorQueue::Delete("/q/one", "fileindex", MONITOR_QUEUE_TYPE_1));
    ASSERT_TRUE(MonitorQueue::Delete("/q/one", "fileindex", MONITOR_QUEUE_TYPE_1));
    ASSERT_TRUE(MonitorQueue::Delete("/q/one", "nobody", MONITOR_QUEUE_TYPE_0));
    expected["fileindex"].removeMember("/q/one");
    EXPECT_EQ(expected, ParseJson(ReadFile(StatePath("monitor_queues.json"))));
    ASSERT_TRUE(MonitorQueue::Delete("/q/two", "fileindex", MONITOR_QUEUE_TYPE_1));
    expected.removeMember("fileindex");  // an owner goes with its last registration
    EXPECT_EQ(expected, ParseJson(ReadFile(StatePath("monitor_queues.json"))));
}

}  // namespace
}  // namespace fileindex_test
