// The emulated platform as other programs' tests drive it: its state files, fault rules and journal.
#include <signal.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <chrono>
#include <climits>
#include <filesystem>
#include <fstream>
#include <functional>
#include <set>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>
#include <json/reader.h>
#include <json/value.h>

#include "appliance_paths.h"
#include "platform/error_state.h"
#include "platform/fs.h"
#include "platform/monitor_queue.h"
#include "platform/service.h"
#include "platform/share_db.h"
#include "platform/unicode.h"

namespace {

namespace stdfs = std::filesystem;
using VEXO::VNOTIFYD::MonitorQueue;

static_assert(sizeof(FILEINDEX_ROOT_DIR) > 1, "the emulation's tests need a sandbox FILEINDEX_ROOT");

const std::string kStateDir = FILEINDEX_EMULATION_STATE_DIR;
const std::string kVolume = FILEINDEX_ROOT_DIR "/volume1";

std::string ReadFile(const std::string &path)
{
    std::ifstream in(path, std::ios::binary);
    std::ostringstream text;
    text << in.rdbuf();
    return text.str();
}

// Written in place (truncate and write), as a test script would, not through a rename.
void WriteFile(const std::string &path, const std::string &text)
{
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out << text;
}

Json::Value ParseJson(const std::string &text)
{
    Json::Value value;
    Json::CharReaderBuilder builder;
    std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    EXPECT_TRUE(reader->parse(text.data(), text.data() + text.size(), &value, nullptr)) << text;
    return value;
}

bool WaitFor(const std::function<bool()> &condition, int milliseconds = 5000)
{
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::milliseconds(milliseconds);
    while (!condition()) {
        if (std::chrono::steady_clock::now() > deadline) {
            return false;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
    return true;
}

// True while the process exists and has not exited; a zombie nobody reaped has exited.
bool ProcessRuns(pid_t pid)
{
    const std::string stat = ReadFile("/proc/" + std::to_string(pid) + "/stat");
    const size_t commEnd = stat.rfind(')');
    return commEnd != std::string::npos && commEnd + 2 < stat.size() && stat[commEnd + 2] != 'Z';
}

class EmulationTest : public ::testing::Test {
protected:
    void SetUp() override
    {
        stdfs::remove_all(kStateDir);
        stdfs::remove_all(kVolume);
        stdfs::create_directories(kStateDir);
        stdfs::create_directories(kVolume);
    }

    void TearDown() override
    {
        // Leave no launched program behind, whatever the test did.
        if (!stdfs::exists(State("services.json"))) {
            return;
        }
        const Json::Value services = ParseJson(ReadFile(State("services.json")));
        for (const std::string &name : services.getMemberNames()) {
            VLIBServiceStop(name.c_str(), 0);
        }
    }

    static std::string State(const std::string &name) { return kStateDir + "/" + name; }
    static std::string Vol(const std::string &relative) { return kVolume + "/" + relative; }
    static void WriteState(const std::string &name, const std::string &json) { WriteFile(State(name), json); }

    static std::vector<Json::Value> Journal()
    {
        std::vector<Json::Value> entries;
        std::istringstream lines(ReadFile(State("journal.jsonl")));
        for (std::string line; std::getline(lines, line);) {
            entries.push_back(ParseJson(line));
        }
        return entries;
    }

    static void ClearError() { VLIBCErrSetEx(0, "", 0); }
};

// ---- Fault rules ----

TEST_F(EmulationTest, ForcedServiceStartReportsTheRuleAndDoesNothingElse)
{
    const std::string marker = Vol("started");
    WriteState("service_commands.json", R"({"indexd": ["/bin/sh", "-c", "touch )" + marker + R"("]})");
    WriteState("faults.json", R"({"VLIBServiceStart": {"result": -1, "error": 4660, "file": "svc.c", "line": 77}})");

    EXPECT_EQ(-1, VLIBServiceStart("indexd", 1));
    EXPECT_EQ(0x1234, VLIBCErrGet());
    EXPECT_STREQ("svc.c", VLIBCErrorGetFile());
    EXPECT_EQ(77, VLIBCErrorGetLine());

    std::this_thread::sleep_for(std::chrono::milliseconds(100));
    EXPECT_FALSE(stdfs::exists(marker));
    EXPECT_FALSE(stdfs::exists(State("services.json")));
    const std::vector<Json::Value> journal = Journal();
    ASSERT_EQ(1u, journal.size());
    EXPECT_EQ(ParseJson(R"({"op": "VLIBServiceStart", "args": ["indexd", 1], "result": -1, "forced": true,
                            "pid": )" + std::to_string(getpid()) + "}"),
              journal[0]);
}

TEST_F(EmulationTest, MatchLimitsARuleToItsArgumentAndTheFirstMatchingRuleWins)
{
    const std::string iso = Vol("iso");
    const std::string fuse = Vol("fuse");
    stdfs::create_directories(iso);
    stdfs::create_directories(fuse);
    const int real = VEXOGetFSType(kVolume.c_str(), 0);
    ASSERT_GE(real, 0);

    WriteState("faults.json", R"({"VEXOGetFSType": [{"match": ")" + iso + R"(", "result": 10},
                                                     {"match": ")" + iso + R"(", "result": 99},
                                                     {"match": ")" + fuse + R"(", "result": 12}]})");
    EXPECT_EQ(10, VEXOGetFSType(iso.c_str(), 0));
    EXPECT_EQ(12, VEXOGetFSType(fuse.c_str(), 0));
    EXPECT_EQ(real, VEXOGetFSType(kVolume.c_str(), 0));

    // The rules are read again when the file changes.
    WriteState("faults.json", "{}");
    EXPECT_EQ(real, VEXOGetFSType(iso.c_str(), 0));
}

TEST_F(EmulationTest, ForcedQuotaShortageLeavesItsCodeWithDefaultPosition)
{
    WriteState("faults.json", R"({"VEXOQuotaIsEnough": {"result": 0, "error": 10496}})");
    EXPECT_EQ(0, VEXOQuotaIsEnough(0, kVolume.c_str(), 1));
    EXPECT_EQ(0x2900, VLIBCErrGet());
    EXPECT_STREQ("emulation", VLIBCErrorGetFile());
    EXPECT_EQ(0, VLIBCErrorGetLine());
}

TEST_F(EmulationTest, ForcedMonitorQueueOperations)
{
    const Json::Value description = ParseJson(R"({"queue": "/q/one", "config": []})");
    WriteState("faults.json", R"({"MonitorQueue::MonitorQueue": {"match": "/q/two"},
                                  "MonitorQueue::Upsert": {"result": 0, "error": 7}})");

    EXPECT_THROW(MonitorQueue(ParseJson(R"({"queue": "/q/two", "config": []})")), std::invalid_argument);
    const MonitorQueue queue(description);
    EXPECT_FALSE(MonitorQueue::Upsert(queue, "fileindex", VEXO::VNOTIFYD::MONITOR_QUEUE_TYPE_1));
    EXPECT_EQ(7, VLIBCErrGet());
    EXPECT_FALSE(stdfs::exists(State("monitor_queues.json")));
    const std::vector<Json::Value> journal = Journal();
    ASSERT_EQ(1u, journal.size());
    EXPECT_EQ(Json::Value(false), journal[0]["result"]);
    EXPECT_EQ(Json::Value(true), journal[0]["forced"]);
}

TEST_F(EmulationTest, ForcedShareLookUpNeverHandsOutARecord)
{
    WriteState("shares.json", R"([{"name": "photo", "path": ")" + Vol("photo") + R"("}])");
    WriteState("faults.json", R"({"VEXOShareGet": {"match": "photo", "result": 0}})");
    PVEXOSHARE share = reinterpret_cast<PVEXOSHARE>(1);
    EXPECT_LT(VEXOShareGet("photo", &share), 0);
    EXPECT_EQ(nullptr, share);
}

// ---- Journal ----

TEST_F(EmulationTest, JournalKeepsBytesThatAreNotUtf8)
{
    const std::string path = Vol("caf\xe9-\xff\xfe");
    ASSERT_EQ(0, VEXOEAMKDir(3, path.c_str()));
    EXPECT_TRUE(stdfs::is_directory(path));

    const std::string line = ReadFile(State("journal.jsonl"));
    EXPECT_NE(std::string::npos, line.find("\"args\":[3,\"" + path + "\"]")) << line;
    EXPECT_EQ(path, ParseJson(line)["args"][1].asString());
}

TEST_F(EmulationTest, JournalFollowsTheOrderOfCallsWithTheirResults)
{
    EXPECT_EQ(0, VEXOEAMKDir(0, Vol("@eaDir").c_str()));
    EXPECT_EQ(-1, VEXOEAMKDir(0, Vol("missing/@eaDir").c_str()));
    EXPECT_EQ(0, VEXOSMBSetSpotlight(1));
    VLIBCErrSetEx(5, "x.c", 9);
    EXPECT_EQ(0, VLIBCExec("/bin/true", nullptr));
    const char *const argv[] = {"sh", "-c", "exit 2", nullptr};
    EXPECT_EQ(-1, VLIBCExecv("/bin/sh", argv, 4));

    const std::vector<Json::Value> journal = Journal();
    ASSERT_EQ(6u, journal.size());
    const char *const expected[] = {
        R"({"op": "VEXOEAMKDir", "args": [0, ")" "%VOL%/@eaDir" R"("], "result": 0})",
        R"({"op": "VEXOEAMKDir", "args": [0, ")" "%VOL%/missing/@eaDir" R"("], "result": -1})",
        R"({"op": "VEXOSMBSetSpotlight", "args": [1], "result": 0})",
        R"({"op": "VLIBCErrSetEx", "args": [5, "x.c", 9], "result": null})",
        R"({"op": "VLIBCExec", "args": ["/bin/true"], "result": 0})",
        R"({"op": "VLIBCExecv", "args": ["/bin/sh", ["sh", "-c", "exit 2"], 4], "result": -1})",
    };
    for (size_t i = 0; i < journal.size(); ++i) {
        std::string text = expected[i];
        const size_t vol = text.find("%VOL%");
        if (vol != std::string::npos) {
            text.replace(vol, 5, kVolume);
        }
        Json::Value want = ParseJson(text);
        want["pid"] = static_cast<int>(getpid());
        EXPECT_EQ(want, journal[i]) << "line " << i;
    }
}

TEST_F(EmulationTest, ConcurrentCallersKeepTheirOwnErrorAndWholeJournalLines)
{
    constexpr int kThreads = 8;
    constexpr int kCalls = 50;
    std::vector<std::thread> threads;
    std::vector<int> lastSeen(kThreads);
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([t, &lastSeen] {
            for (int i = 0; i < kCalls; ++i) {
                VLIBCErrSetEx(t * 1000 + i, "thread.c", t);
                std::this_thread::yield();
            }
            lastSeen[t] = VLIBCErrGet();
        });
    }
    for (std::thread &thread : threads) {
        thread.join();
    }
    std::set<int> codes;
    for (const Json::Value &entry : Journal()) {
        codes.insert(entry["args"][0].asInt());
    }
    EXPECT_EQ(static_cast<size_t>(kThreads * kCalls), codes.size());
    for (int t = 0; t < kThreads; ++t) {
        EXPECT_EQ(t * 1000 + kCalls - 1, lastSeen[t]);
    }
}

TEST_F(EmulationTest, ErrorStateBelongsToTheThread)
{
    VLIBCErrSetEx(42, "main.c", 1);
    int otherCode = -1;
    std::string otherFile = "unset";
    std::thread([&] {
        otherCode = VLIBCErrGet();
        otherFile = VLIBCErrorGetFile();
        VLIBCErrSetEx(43, "other.c", 2);
    }).join();
    EXPECT_EQ(0, otherCode);
    EXPECT_EQ("", otherFile);
    EXPECT_EQ(42, VLIBCErrGet());
    EXPECT_STREQ("main.c", VLIBCErrorGetFile());
}

// ---- Share database ----

class ShareDbTest : public EmulationTest {
protected:
    void SetUp() override
    {
        EmulationTest::SetUp();
        WriteState("shares.json", R"([
            {"name": "Photo", "path": ")" + Vol("photo") + R"("},
            {"name": "photo_raw", "path": ")" + Vol("photo/raw/") + R"("},
            {"name": "vault", "path": ")" + Vol("vault") + R"(", "encrypted": true, "uses_encryption": true},
            {"name": "docs", "path": ")" + Vol("docs") + R"(", "read_only": true}
        ])");
    }
};

TEST_F(ShareDbTest, LookUpIgnoresCaseAndReturnsTheStoredRecord)
{
    struct Case {
        const char *query;
        const char *name;
        int encrypted, usesEncryption, readOnly;
    };
    const Case cases[] = {
        {"Photo", "Photo", 0, 0, 0}, {"PHOTO", "Photo", 0, 0, 0}, {"photo", "Photo", 0, 0, 0},
        {"VAULT", "vault", 1, 1, 0}, {"Docs", "docs", 0, 0, 1},
    };
    for (const Case &c : cases) {
        SCOPED_TRACE(c.query);
        PVEXOSHARE share = nullptr;
        ASSERT_EQ(0, VEXOShareGet(c.query, &share));
        EXPECT_STREQ(c.name, share->szName);
        EXPECT_EQ(Vol(c.name == std::string("Photo") ? "photo" : c.name), share->szPath);
        int flag = -1;
        ASSERT_EQ(0, VLIBShareIsEncryptedGet(share, &flag));
        EXPECT_EQ(c.encrypted, flag);
        ASSERT_EQ(0, VLIBShareIsEncryptionGet(share, &flag));
        EXPECT_EQ(c.usesEncryption, flag);
        ASSERT_EQ(0, VLIBShareIsReadOnlyGet(share, &flag));
        EXPECT_EQ(c.readOnly, flag);
        VEXOShareFree(share);
    }

    PVEXOSHARE share = nullptr;
    EXPECT_LT(VEXOShareGet("photos", &share), 0);
    EXPECT_EQ(0x1400, VLIBCErrGet());
    EXPECT_EQ(nullptr, share);
}

TEST_F(ShareDbTest, NamePathGetTakesTheLongestShareByWholeComponents)
{
    struct Case {
        std::string path;
        const char *name;  // null: no share holds the path
        std::string sharePath;
    };
    const Case cases[] = {
        {Vol("photo"), "Photo", Vol("photo")},
        {Vol("photo/2024/a.jpg"), "Photo", Vol("photo")},
        {Vol("photo/raw"), "photo_raw", Vol("photo/raw")},
        {Vol("photo/raw/x.dng"), "photo_raw", Vol("photo/raw")},
        {Vol("photo/rawfile"), "Photo", Vol("photo")},
        {Vol("photos/a.jpg"), nullptr, ""},
        {Vol("vaultx"), nullptr, ""},
        {"/", nullptr, ""},
    };
    for (const Case &c : cases) {
        SCOPED_TRACE(c.path);
        char name[64] = "stale";
        char sharePath[4096] = "stale";
        const int result = VEXOShareNamePathGet(c.path.c_str(), name, sizeof(name), sharePath, sizeof(sharePath));
        if (c.name == nullptr) {
            EXPECT_LT(result, 0);
            EXPECT_EQ(0x1400, VLIBCErrGet());
        } else {
            ASSERT_EQ(0, result);
            EXPECT_STREQ(c.name, name);
            EXPECT_EQ(c.sharePath, sharePath);
        }
    }

    char name[4];
    char sharePath[6];
    ASSERT_EQ(0, VEXOShareNamePathGet(Vol("photo/raw/x").c_str(), name, sizeof(name), sharePath, sizeof(sharePath)));
    EXPECT_STREQ("pho", name);
    EXPECT_EQ(Vol("photo/raw").substr(0, 5), sharePath);
}

TEST_F(ShareDbTest, RecycleBinAndSnapshotFollowTheHoldingShare)
{
    struct Case {
        std::string path;
        int recycle;
        int snapshot;
    };
    const Case cases[] = {
        {Vol("photo/#recycle"), 1, 0},
        {Vol("photo/#recycle/a.jpg"), 1, 0},
        {Vol("photo/#recyclebin/a.jpg"), 0, 0},
        {Vol("photo/sub/#recycle/a.jpg"), 0, 0},
        {Vol("photo/raw/#recycle/x.dng"), 1, 0},
        {Vol("photo/#snapshot/GMT+00-2024/a.jpg"), 0, 1},
        {Vol("photo/#snapshots"), 0, 0},
        {Vol("photo/raw/#snapshot"), 0, 1},
        {Vol("#recycle/a"), 0, 0},
    };
    for (const Case &c : cases) {
        SCOPED_TRACE(c.path);
        EXPECT_EQ(c.recycle, VEXOShareIsShareRecycle(c.path.c_str()) != 0 ? 1 : 0);
        int inSnapshot = -1;
        ASSERT_EQ(0, VLIBFhsPathInSnapshot(c.path.c_str(), &inSnapshot));
        EXPECT_EQ(c.snapshot, inSnapshot);
    }
}

TEST_F(ShareDbTest, EditsAfterFirstUseArePickedUp)
{
    PVEXOSHARE share = nullptr;
    ASSERT_EQ(0, VEXOShareGet("vault", &share));
    VEXOShareFree(share);

    // Same length, rewritten in place at once: only the content tells the versions apart.
    WriteState("shares.json", R"([{"name": "vaulT", "path": "/a/b"}])");
    ASSERT_EQ(0, VEXOShareGet("vault", &share));
    EXPECT_STREQ("vaulT", share->szName);
    EXPECT_STREQ("/a/b", share->szPath);
    VEXOShareFree(share);

    // As on a file system with coarse time stamps: the rewrite keeps size, inode and time.
    const stdfs::file_time_type written = stdfs::last_write_time(State("shares.json"));
    WriteState("shares.json", R"([{"name": "vaulX", "path": "/a/b"}])");
    stdfs::last_write_time(State("shares.json"), written);
    EXPECT_LT(VEXOShareGet("vault", &share), 0);
}

TEST_F(ShareDbTest, UnusableDatabaseFailsEveryLookUp)
{
    const std::string bad[] = {
        R"([{"name": "photo"}])",
        R"({"name": "photo", "path": "/p"})",
        R"([{"name": "photo", "path": "relative"}])",
        "[",
        R"([{"name": "x", "path": "/x", "read_only": 1}])",
    };
    for (const std::string &text : bad) {
        SCOPED_TRACE(text);
        WriteState("shares.json", text);
        PVEXOSHARE share = nullptr;
        EXPECT_LT(VEXOShareGet("photo", &share), 0);
        EXPECT_EQ(0xE00, VLIBCErrGet());
        int inSnapshot = 0;
        EXPECT_LT(VLIBFhsPathInSnapshot("/p/#snapshot", &inSnapshot), 0);
    }
    stdfs::remove(State("shares.json"));
    PVEXOSHARE share = nullptr;
    EXPECT_LT(VEXOShareGet("photo", &share), 0);
    EXPECT_EQ(0x1400, VLIBCErrGet());
}

// ---- Services and SMB ----

class ServiceTest : public EmulationTest {
protected:
    Json::Value Services() { return ParseJson(ReadFile(State("services.json"))); }

    // A command that writes its own pid to the file, then sleeps until it is stopped.
    void SetSleeperCommand(const std::string &service, const std::string &pidFile)
    {
        WriteState("service_commands.json", R"({")" + service + R"(": ["/bin/sh", "-c", "echo $$ > )" + pidFile +
                                                R"(; exec sleep 60"]})");
    }

    static pid_t PidFrom(const std::string &pidFile)
    {
        pid_t pid = 0;
        WaitFor([&] { return (pid = atoi(ReadFile(pidFile).c_str())) > 0; });
        return pid;
    }
};

TEST_F(ServiceTest, StartLaunchesTheCommandOnceAndStopTerminatesIt)
{
    const std::string pidFile = Vol("indexd.pid");
    SetSleeperCommand("indexd", pidFile);

    // Whatever the caller's standard input is, the program's is /dev/null.
    int callerInput[2];
    ASSERT_EQ(0, pipe(callerInput));
    const int savedInput = dup(STDIN_FILENO);
    dup2(callerInput[0], STDIN_FILENO);
    const int started = VLIBServiceStart("indexd", 0);
    dup2(savedInput, STDIN_FILENO);
    for (int fd : {savedInput, callerInput[0], callerInput[1]}) {
        close(fd);
    }
    ASSERT_EQ(0, started);
    const pid_t pid = PidFrom(pidFile);
    ASSERT_GT(pid, 0);
    EXPECT_TRUE(ProcessRuns(pid));
    EXPECT_EQ(pid, getsid(pid));  // its own session
    EXPECT_EQ("/dev/null", stdfs::read_symlink("/proc/" + std::to_string(pid) + "/fd/0").string());
    EXPECT_EQ(Json::Value(true), Services()["indexd"]["running"]);
    EXPECT_EQ(pid, Services()["indexd"]["pid"].asInt());

    // Starting a running service launches nothing more.
    WriteFile(pidFile, "");
    ASSERT_EQ(0, VLIBServiceStart("indexd", 0));
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
    EXPECT_EQ("", ReadFile(pidFile));
    EXPECT_EQ(pid, Services()["indexd"]["pid"].asInt());

    ASSERT_EQ(0, VLIBServiceStop("indexd", 0));
    EXPECT_FALSE(ProcessRuns(pid));
    EXPECT_EQ(Json::Value(false), Services()["indexd"]["running"]);
    EXPECT_EQ(0, VLIBServiceStop("indexd", 0));

    std::vector<int> results;
    for (const Json::Value &entry : Journal()) {
        results.push_back(entry["result"].asInt());
    }
    EXPECT_EQ(std::vector<int>({0, 0, 0, 0}), results);
}

TEST_F(ServiceTest, RestartReplacesTheProcess)
{
    const std::string pidFile = Vol("indexd.pid");
    SetSleeperCommand("indexd", pidFile);
    ASSERT_EQ(0, VLIBServiceStart("indexd", 0));
    const pid_t first = PidFrom(pidFile);
    WriteFile(pidFile, "");

    ASSERT_EQ(0, VLIBServiceRestart("indexd"));
    const pid_t second = PidFrom(pidFile);
    EXPECT_FALSE(ProcessRuns(first));
    EXPECT_TRUE(ProcessRuns(second));
    EXPECT_NE(first, second);
    EXPECT_EQ(second, Services()["indexd"]["pid"].asInt());
}

TEST_F(ServiceTest, ServiceWhoseProcessExitedCountsAsStopped)
{
    const std::string runs = Vol("runs");
    WriteState("service_commands.json", R"({"oneshot": ["/bin/sh", "-c", "echo run >> )" + runs + R"("]})");
    ASSERT_EQ(0, VLIBServiceStart("oneshot", 0));
    const pid_t pid = Services()["oneshot"]["pid"].asInt();
    ASSERT_TRUE(WaitFor([&] { return !ProcessRuns(pid); }));

    ASSERT_EQ(0, VLIBServiceStart("oneshot", 0));
    ASSERT_TRUE(WaitFor([&] { return ReadFile(runs) == "run\nrun\n"; }));
}

TEST_F(ServiceTest, ServiceWithoutCommandOnlyChangesItsState)
{
    ASSERT_EQ(0, VLIBServiceStart("samba", 0));
    EXPECT_EQ(ParseJson(R"({"samba": {"running": true}})"), Services());
    ASSERT_EQ(0, VLIBServiceStop("samba", 0));
    EXPECT_EQ(ParseJson(R"({"samba": {"running": false}})"), Services());
}

TEST_F(ServiceTest, CommandThatCannotRunFailsTheStart)
{
    WriteState("service_commands.json", R"({"broken": [")" + Vol("no-such-program") + R"("]})");
    EXPECT_EQ(-1, VLIBServiceStart("broken", 0));
    EXPECT_EQ(0x3300, VLIBCErrGet());
    EXPECT_FALSE(stdfs::exists(State("services.json")));
    EXPECT_EQ(-1, Journal().at(0)["result"].asInt());
}

TEST_F(ServiceTest, SpotlightSwitchIsKeptInSmbJson)
{
    EXPECT_EQ(0, VEXOSMBIsEnableSpotlight());
    WriteState("smb.json", R"({"spotlight": true, "workgroup": "HOME"})");
    EXPECT_NE(0, VEXOSMBIsEnableSpotlight());
    ASSERT_EQ(0, VEXOSMBSetSpotlight(0));
    EXPECT_EQ(0, VEXOSMBIsEnableSpotlight());
    EXPECT_EQ(ParseJson(R"({"spotlight": false, "workgroup": "HOME"})"), ParseJson(ReadFile(State("smb.json"))));
}

// ---- Program execution ----

TEST_F(EmulationTest, ExecSucceedsOnlyOnExitStatusZero)
{
    const char *const quoting[] = {"sh", "-c", R"(test "$0" = a && test "$1" = "b c")", "a", "b c", nullptr};
    const char *const exit3[] = {"sh", "-c", "exit 3", nullptr};
    struct Case {
        const char *what;
        std::function<int()> call;
        int error;  // 0: the call succeeds
    };
    const Case cases[] = {
        {"true", [] { return VLIBCExec("/bin/true", nullptr); }, 0},
        {"false", [] { return VLIBCExec("/bin/false", nullptr); }, 0x3301},
        {"arguments as given",
         [] { return VLIBCExec("/bin/sh", "-c", R"(test "$0" = a && test "$1" = "b c")", "a", "b c", nullptr); }, 0},
        {"argument vector as given", [&] { return VLIBCExecv("/bin/sh", quoting, 0); }, 0},
        {"exit status 3", [&] { return VLIBCExecv("/bin/sh", exit3, 0); }, 0x3301},
        {"killed by a signal", [] { return VLIBCExec("/bin/sh", "-c", "kill -9 $$", nullptr); }, 0x3301},
        {"no such program", [] { return VLIBCExec("/nonexistent/program", nullptr); }, 0x3300},
    };
    for (const Case &c : cases) {
        SCOPED_TRACE(c.what);
        ClearError();
        EXPECT_EQ(c.error == 0 ? 0 : -1, c.call());
        EXPECT_EQ(c.error, VLIBCErrGet());
    }
}

// ---- Monitor queues ----

TEST_F(EmulationTest, MalformedQueueDescriptionsAreRefused)
{
    const char *const malformed[] = {
        R"([])",
        R"({"config": []})",
        R"({"queue": 5, "config": []})",
        R"({"queue": "", "config": []})",
        R"({"queue": "/q", "config": {}})",
        R"({"queue": "/q", "config": [{"path": "/p", "ignore": []}]})",
        R"({"queue": "/q", "config": [{"path": "/p", "mask": "1", "ignore": []}]})",
        R"({"queue": "/q", "config": [{"path": "/p", "mask": 1.5, "ignore": []}]})",
        R"({"queue": "/q", "config": [{"mask": 1, "ignore": []}]})",
        R"({"queue": "/q", "config": [{"path": "/p", "mask": 1, "ignore": "x"}]})",
        R"({"queue": "/q", "config": [{"path": "/p", "mask": 1, "ignore": ["x", 2]}]})",
    };
    for (const char *text : malformed) {
        EXPECT_THROW(MonitorQueue(ParseJson(text)), std::invalid_argument) << text;
    }
    EXPECT_NO_THROW(MonitorQueue(
        ParseJson(R"({"queue": "/q", "config": [{"path": "/p", "mask": 4294967295, "ignore": ["@eaDir"]}]})")));
}

TEST_F(EmulationTest, MonitorQueuesKeepOneRegistrationPerOwnerAndQueue)
{
    using VEXO::VNOTIFYD::MONITOR_QUEUE_TYPE_0;
    using VEXO::VNOTIFYD::MONITOR_QUEUE_TYPE_1;
    const Json::Value first =
        ParseJson(R"({"queue": "/q/one", "config": [{"path": "/a", "mask": 1, "ignore": []}]})");
    const Json::Value changed =
        ParseJson(R"({"queue": "/q/one", "config": [{"path": "/b", "mask": 2, "ignore": []}]})");
    const Json::Value second = ParseJson(R"({"queue": "/q/two", "config": []})");
    const auto registrations = [&] { return ParseJson(ReadFile(State("monitor_queues.json"))); };

    ASSERT_TRUE(MonitorQueue::Upsert(MonitorQueue(first), "fileindex", MONITOR_QUEUE_TYPE_1));
    ASSERT_TRUE(MonitorQueue::Upsert(MonitorQueue(changed), "fileindex", MONITOR_QUEUE_TYPE_0));
    ASSERT_TRUE(MonitorQueue::Upsert(MonitorQueue(second), "fileindex", MONITOR_QUEUE_TYPE_1));
    ASSERT_TRUE(MonitorQueue::Upsert(MonitorQueue(first), "backup", MONITOR_QUEUE_TYPE_1));
    Json::Value expected(Json::objectValue);
    expected["fileindex"]["/q/one"]["type"] = 0;
    expected["fileindex"]["/q/one"]["description"] = changed;
    expected["fileindex"]["/q/two"]["type"] = 1;
    expected["fileindex"]["/q/two"]["description"] = second;
    expected["backup"]["/q/one"]["type"] = 1;
    expected["backup"]["/q/one"]["description"] = first;
    EXPECT_EQ(expected, registrations());

    ASSERT_TRUE(MonitorQueue::Delete("/q/one", "fileindex", MONITOR_QUEUE_TYPE_0));
    ASSERT_TRUE(MonitorQueue::Delete("/q/one", "fileindex", MONITOR_QUEUE_TYPE_0));
    ASSERT_TRUE(MonitorQueue::Delete("/q/one", "nobody", MONITOR_QUEUE_TYPE_0));
    expected["fileindex"].removeMember("/q/one");
    EXPECT_EQ(expected, registrations());
    ASSERT_TRUE(MonitorQueue::Delete("/q/two", "fileindex", MONITOR_QUEUE_TYPE_1));
    expected.removeMember("fileindex");
    EXPECT_EQ(expected, registrations());

    const std::vector<Json::Value> journal = Journal();
    ASSERT_EQ(8u, journal.size());
    EXPECT_EQ("MonitorQueue::Upsert", journal[1]["op"].asString());
    EXPECT_EQ(changed, journal[1]["args"][0]);
    EXPECT_EQ(ParseJson(R"(["/q/one", "fileindex", 0])"), journal[4]["args"]);
    EXPECT_EQ(Json::Value(true), journal[4]["result"]);
}

TEST_F(EmulationTest, ConcurrentRegistrationsLoseNothing)
{
    constexpr int kThreads = 8;
    constexpr int kQueues = 10;
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([t] {
            for (int q = 0; q < kQueues; ++q) {
                Json::Value description(Json::objectValue);
                description["queue"] = "/q/" + std::to_string(q);
                description["config"] = Json::Value(Json::arrayValue);
                MonitorQueue::Upsert(MonitorQueue(description), "owner" + std::to_string(t),
                                     VEXO::VNOTIFYD::MONITOR_QUEUE_TYPE_1);
            }
        });
    }
    for (std::thread &thread : threads) {
        thread.join();
    }
    const Json::Value registrations = ParseJson(ReadFile(State("monitor_queues.json")));
    ASSERT_EQ(static_cast<unsigned>(kThreads), registrations.size());
    for (const std::string &owner : registrations.getMemberNames()) {
        EXPECT_EQ(static_cast<unsigned>(kQueues), registrations[owner].size()) << owner;
    }
}

// ---- File systems and storage ----

TEST_F(EmulationTest, MountPointsAndTheirFailures)
{
    WriteFile(Vol("file"), "x");
    EXPECT_EQ(1, VEXOFSDirIsMntPoint("/"));
    EXPECT_EQ(0, VEXOFSDirIsMntPoint(kVolume.c_str()));
    EXPECT_LT(VEXOFSDirIsMntPoint(Vol("missing").c_str()), 0);
    EXPECT_EQ(0x2A00, VLIBCErrGet());
    ClearError();
    EXPECT_LT(VEXOFSDirIsMntPoint(Vol("file").c_str()), 0);
    EXPECT_EQ(0x2A00, VLIBCErrGet());
}

TEST_F(EmulationTest, FileSystemTypeCodesAndTheirClasses)
{
    EXPECT_EQ(-1, VEXOGetFSType(Vol("missing").c_str(), 0));
    EXPECT_EQ(0x2A00, VLIBCErrGet());
    EXPECT_GE(VEXOGetFSType(kVolume.c_str(), 0), 0);
    for (int code = 0; code <= 13; ++code) {
        SCOPED_TRACE(code);
        EXPECT_EQ(code == 8 || code == 9, VEXOFSIsRemoteFS(code) != 0);
        EXPECT_EQ(code == 10 || code == 11 || code == 13, VEXOFSIsImageFS(code) != 0);
    }
}

TEST_F(EmulationTest, MetadataDirectoriesAreMadeOnceAndRecognised)
{
    EXPECT_EQ(0, VEXOEAMKDir(0, Vol("@eaDir").c_str()));
    EXPECT_EQ(0, VEXOEAMKDir(0, Vol("@eaDir").c_str()));
    EXPECT_TRUE(stdfs::is_directory(Vol("@eaDir")));
    WriteFile(Vol("plain"), "x");
    EXPECT_EQ(-1, VEXOEAMKDir(0, Vol("plain").c_str()));
    EXPECT_EQ(0x2A00, VLIBCErrGet());

    EXPECT_EQ(1, VEXOEAIsHiddenDir("@eaDir"));
    for (const char *name : {"@eadir", "eaDir", "x/@eaDir", "@eaDir/", "", "#recycle"}) {
        EXPECT_EQ(0, VEXOEAIsHiddenDir(name)) << name;
    }
}

TEST_F(EmulationTest, QuotaFollowsTheFreeSpace)
{
    EXPECT_EQ(1, VEXOQuotaIsEnough(0, kVolume.c_str(), 0));
    EXPECT_EQ(1, VEXOQuotaIsEnough(0, kVolume.c_str(), 4096));
    ClearError();
    EXPECT_EQ(0, VEXOQuotaIsEnough(0, kVolume.c_str(), ULLONG_MAX));
    EXPECT_EQ(0x2900, VLIBCErrGet());
    EXPECT_EQ(0, VEXOQuotaIsEnough(0, Vol("missing").c_str(), 0));
    EXPECT_EQ(0x2A00, VLIBCErrGet());
}

// ---- Text comparison ----

TEST_F(EmulationTest, CaseInsensitiveComparisonFollowsUnicode)
{
    struct Case {
        const char *a;
        const char *b;
        int sign;
    };
    const Case cases[] = {
        {"photo", "PHOTO", 0},
        {"\xc3\x84rger", "\xc3\xa4RGER", 0},              // Ärger / äRGER
        {"stra\xc3\x9f" "e", "STRASSE", 0},               // straße folds to strasse
        {"\xce\xa3\xce\x9f\xce\xa6", "\xcf\x83\xce\xbf\xcf\x86", 0},  // Greek capitals / small
        {"a", "b", -1},
        {"B", "a", 1},
        {"abc", "abcd", -1},
        {"A\xff", "a\xff", 0},                            // not UTF-8: bytes, ASCII folded
        {"a\xfe", "a\xff", -1},
    };
    for (const Case &c : cases) {
        SCOPED_TRACE(std::string(c.a) + " / " + c.b);
        const int result = VLIBCUnicodeUTF8StrCaseCmp(c.a, c.b);
        EXPECT_EQ(c.sign, (result > 0) - (result < 0));
    }
}

}  // namespace
