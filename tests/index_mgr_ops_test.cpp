// The index management operations end to end: what each one does to folder.conf, the platform (the
// emulation's journal), the daemon (frames) and the event queues, in which order, and what a failure
// leaves behind.
#include <unistd.h>

#include <functional>
#include <memory>
#include <sstream>

#include "config/json_io.h"
#include "fileindex/error.h"
#include "fileindex/index_mgr.h"
#include "fileindex/utils.h"
#include "share/storage_paths.h"
#include "tests/support/child.h"
#include "tests/support/frame_listener.h"
#include "tests/support/log_capture.h"
#include "tests/support/sandbox.h"
#include "tests/support/syscall_faults.h"

using namespace VEXO::FILEINDEX;
using Lines = std::vector<std::string>;

namespace fileindex_test {
namespace {

// A string without the sandbox root, anything else as JSON text.
std::string Text(const Json::Value &value)
{
    const std::string root = FILEINDEX_ROOT_DIR;
    const std::string text = value.isString() ? value.asString() : toString(value);
    return text.compare(0, root.size(), root) == 0 ? text.substr(root.size()) : text;
}

// "VLIBServiceStart fileindexd 1"; "watch <share path>: <folder>..." and "unwatch <share path>" for
// the monitor registrations; " (forced)" added to a forced call.
std::string DescribeCall(const Json::Value &entry)
{
    const Json::Value &args = entry["args"];
    std::string text = entry["op"].asString();
    if (text == "MonitorQueue::Upsert" || text == "MonitorQueue::Delete") {
        const bool watch = text == "MonitorQueue::Upsert";
        const std::string queue = Text(watch ? args[0]["queue"] : args[0]);
        text = (watch ? "watch " : "unwatch ") + queue.substr(0, queue.size() - StoragePath("", kQueueFileName).size());
        if (watch) {
            text += ":";
            for (const Json::Value &folder : args[0]["config"]) {
                text += " " + Text(folder["path"]);
            }
        }
    } else {
        for (const Json::Value &arg : args) {
            text += " " + Text(arg);
        }
    }
    return entry["forced"].asBool() ? text + " (forced)" : text;
}

std::string DescribeCommand(const std::string &frame)
{
    const Json::Value command = ParseJson(FrameListener::TextOfFrame(frame));
    std::string text = "send " + command["type"].asString();
    for (const std::string &key : command["data"].getMemberNames()) {
        text += " " + key + "=" + Text(command["data"][key]);
    }
    return text;
}

Lines Join(std::initializer_list<Lines> parts)
{
    Lines all;
    for (const Lines &part : parts) {
        all.insert(all.end(), part.begin(), part.end());
    }
    return all;
}

const char kAllChanged[] = R"({"audio":true,"document":true,"photo":true,"video":true})";
const std::string kStopFails = R"("VLIBServiceStop": {"result": -1, "error": 13056, "file": "svc.c", "line": 9})";

class IndexMgrOpsTest : public SandboxTest {
protected:
    // One operation on a fresh appliance: shares photo and music on volume1, video on volume2, the
    // folders and the status file stored, the faults forced, and a daemon listening unless noDaemon.
    struct Case {
        const char *name;
        Lines stored;
        std::string faults;
        std::function<bool()> operation;
        bool result;
        _tag_fileindex_err_ error;
        Lines messages;
        Lines effects;  // platform calls and daemon commands, in order
        Lines storedAfter;
        Lines events;  // the photo queue's records, then the video queue's
        const char *status = "{}";
        bool noDaemon = false;
    };

    void SetUp() override
    {
        SandboxTest::SetUp();
        DeclareShares("volume1/photo volume1/music volume2/video");
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
    }

    void Expect(const Case &c)
    {
        SCOPED_TRACE(c.name);
        SetUp();
        Json::Value folders(Json::objectValue);
        for (const std::string &path : c.stored) {
            folders[path] = Json::Value(Json::objectValue);
        }
        WriteFile(FILEINDEX_FOLDER_CONF_PATH, toString(folders));
        WriteFile(FILEINDEX_STATUS_CONF_PATH, c.status);
        SetFaults(ParseJson(c.faults));
        EXPECT_EQ(Run(c.operation, !c.noDaemon), c.result);
        EXPECT_EQ(ErrorHandler::GetError(), c.error);
        EXPECT_EQ(LogCapture::Messages(), c.messages);
        EXPECT_EQ(m_effects, c.effects);
        EXPECT_EQ(ParseJson(ReadFile(FILEINDEX_FOLDER_CONF_PATH)).getMemberNames(), c.storedAfter);
        EXPECT_EQ(Join({Events("photo"), Events("video")}), c.events);
    }

    // Runs operation and sets m_effects to what it did, in order: the platform calls journaled
    // (the making of storage directories left out) and the commands the daemon received, each
    // command after the calls made before it was sent. The folder lock must be free afterwards.
    bool Run(const std::function<bool()> &operation, bool daemonListens = true)
    {
        const size_t before = Journal().size();
        std::unique_ptr<FrameListener> daemon(daemonListens ? new FrameListener : nullptr);
        std::vector<size_t> callsAtWrite;  // two socket writes per command
        bool result;
        {
            SocketWriteRecorder writes([&] { callsAtWrite.push_back(Journal().size()); });
            result = operation();
        }
        const Lines frames = daemon ? daemon->Connections(callsAtWrite.size() / 2) : Lines();
        const std::vector<Json::Value> journal = Journal();
        m_effects.clear();
        for (size_t call = before, sent = 0; call <= journal.size(); ++call) {
            for (; sent < frames.size() && callsAtWrite[2 * sent] == call; ++sent) {
                m_effects.push_back(DescribeCommand(frames[sent]));
            }
            if (call < journal.size() && journal[call]["op"] != "VEXOEAMKDir") {
                m_effects.push_back(DescribeCall(journal[call]));
            }
        }
        EXPECT_FALSE(IsLockHeld(FILEINDEX_FOLDER_LOCK_PATH)) << "the folder lock must be released on every path";
        return result;
    }

    // A share's queue records, "<event> <path> <data>".
    static Lines Events(const std::string &share)
    {
        Lines events;
        std::istringstream lines(ReadFile(StoragePath(SharePath(share), kQueueFileName)));
        for (std::string line; std::getline(lines, line);) {
            const Json::Value record = ParseJson(line);
            events.push_back(Text(record["event"]) + " " + Text(record["path"]) + " " + Text(record["data"]));
        }
        return events;
    }

    // The three removals that wipe a share's index data.
    static Lines Wipe(const std::string &share)
    {
        const std::string queue = StoragePath(SharePath(share), kQueueFileName);
        Lines calls;
        for (const std::string &path : {queue, QueueCompanionPath(queue), StoragePath(SharePath(share), kDatabaseDirName)}) {
            calls.push_back("VLIBCExec /bin/rm -rf " + Text(path));
        }
        return calls;
    }

    Lines m_effects;
};

TEST_F(IndexMgrOpsTest, UpsertSavesFirstThenRegistersStartsTellsAndQueues)
{
    const Lines registered = {"watch /volume1/photo: /volume1/photo/a", "watch /volume2/video: /volume2/video/b"};
    const Lines started = {"VLIBServiceStart fileindexd 1", "VEXOSMBSetSpotlight 1", "VLIBServiceRestart samba"};
    const auto two = [] { return IndexMgr::Upsert(ParseJson(R"([{"path":"/photo/a"},{"path":"/video/b"}])")); };
    const auto none = [] { return IndexMgr::Upsert(Json::Value(Json::arrayValue)); };
    const Case cases[] = {
        // Three folders in two shares, /photo/z twice, neither in path nor in share order.
        {"upsert", {}, "{}", [] { return IndexMgr::Upsert(ParseJson(R"([{"path":"/video/b","video":true},
             {"path":"/photo/z"},{"path":"/photo/a","photo":true},{"path":"/photo/z","photo":true}])")); },
         true, FILEIDX_ERR_NONE, {},
         Join({{"watch /volume1/photo: /volume1/photo/a /volume1/photo/z", "watch /volume2/video: /volume2/video/b"}, started,
               {"send upsert_folder_setting folder_path=/video/b", "send upsert_folder_setting folder_path=/photo/z",
                "send upsert_folder_setting folder_path=/photo/a", "send upsert_folder_setting folder_path=/photo/z"}}),
         {"/photo/a", "/photo/z", "/video/b"},
         {"131072 /volume1/photo/a " + std::string(kAllChanged),
          R"(131072 /volume1/photo/z {"audio":false,"document":false,"photo":true,"video":false})",
          "131072 /volume2/video/b " + std::string(kAllChanged)}},
        {"empty upsert", {}, "{}", none, true, FILEIDX_ERR_NONE, {}, started, {}, {}},
        {"Spotlight already on", {}, R"({"VEXOSMBIsEnableSpotlight": {"result": 1}})", none, true, FILEIDX_ERR_NONE, {},
         {"VLIBServiceStart fileindexd 1"}, {}, {}},
        {"second element refused", {"/music/m"}, "{}",
         [] { return IndexMgr::Upsert(ParseJson(R"([{"path":"/photo/a"},{"path":"/nosuch/b"}])")); }, false,
         FILEIDX_ERR_BAD_PARAM, {R"(Bad param: {"path":"/nosuch/b"})", R"(Upsert failed, folder={"path":"/nosuch/b"})"}, {},
         {"/music/m"}, {}},
        {"service does not start", {}, R"({"VLIBServiceStart": {"result": -1, "error": 4660, "file": "svc.c", "line": 7}})",
         two, false, FILEIDX_ERR_NONE, {"VLIBServiceStart failed: err=[0x1234 svc.c:7]"},
         Join({registered, {"VLIBServiceStart fileindexd 1 (forced)"}}), {"/photo/a", "/video/b"}, {}},
        {"no daemon", {}, "{}", two, false, FILEIDX_ERR_NONE, {"SendCammandToDaemon failed"}, Join({registered, started}),
         {"/photo/a", "/video/b"}, {}, "{}", true},
    };
    for (const Case &c : cases) {
        Expect(c);
    }
}

TEST_F(IndexMgrOpsTest, SecondWriterFailsWhileAnUpsertTalksToTheDaemon)
{
    FrameListener daemon;
    std::vector<int> secondWriter;  // its exit status: the error it failed with, 0 on success
    const pid_t test = getpid();
    {
        SocketWriteRecorder writes([&] {
            if (getpid() == test) {
                Child other([](const Child::Ready &) {
                    _exit(IndexMgr::Upsert(ParseJson(R"([{"path":"/music/m"}])")) ? 0 : ErrorHandler::GetError());
                });
                secondWriter.push_back(other.Wait());
            }
        });
        ASSERT_TRUE(IndexMgr::Upsert(ParseJson(R"([{"path":"/photo/a"}])")));
    }
    EXPECT_EQ(secondWriter, std::vector<int>(2, FILEIDX_ERR_LOCK)) << "one try per write of the command";
    EXPECT_EQ(ParseJson(ReadFile(FILEINDEX_FOLDER_CONF_PATH)).getMemberNames(), Lines{"/photo/a"});
}

TEST_F(IndexMgrOpsTest, DeleteTellsTheDaemonOrStopsTheServiceThenHandlesEachShare)
{
    const Case cases[] = {
        // One of two folders of photo and the only folder of video go, while other folders remain.
        {"delete", {"/music/m", "/photo/a", "/photo/b", "/video/c"}, "{}",
         [] { return IndexMgr::Delete(ParseJson(R"(["/video/c","/photo/b"])")); }, true, FILEIDX_ERR_NONE, {},
         Join({{"send delete_folder_setting folder_path=/video/c", "send delete_folder_setting folder_path=/photo/b",
                "watch /volume1/photo: /volume1/photo/a"}, Wipe("video"), {"unwatch /volume2/video"}}),
         {"/music/m", "/photo/a"}, {R"(131072 /volume1/photo/b {"/photo/b":)" + std::string(kAllChanged) + "}"}},
        // The last folder: nothing is sent, the service stops (its failure only logged), Spotlight goes off.
        {"last folder", {"/photo/a"}, R"({"VEXOSMBIsEnableSpotlight": {"result": 1}, )" + kStopFails + "}",
         [] { return IndexMgr::Delete(ParseJson(R"(["/photo/a"])")); }, true, FILEIDX_ERR_NONE,
         {"VLIBServiceStop failed: err=[0x3300 svc.c:9]"},
         Join({{"VLIBServiceStop fileindexd 1 (forced)", "VEXOSMBSetSpotlight 0", "VLIBServiceRestart samba"}, Wipe("photo"),
               {"unwatch /volume1/photo"}}), {}, {}},
        {"share gone", {"/gone/x", "/photo/a"}, "{}", [] { return IndexMgr::Delete(ParseJson(R"(["/gone/x"])")); }, false,
         FILEIDX_ERR_PATH, {"GetFullPath failed, path=/gone/x", "Update failed"},
         {"send delete_folder_setting folder_path=/gone/x"}, {"/photo/a"}, {}},
        {"not a list of paths", {"/photo/a"}, "{}", [] { return IndexMgr::Delete(ParseJson(R"(["/photo/a",["x"]])")); },
         false, FILEIDX_ERR_BAD_PARAM, {R"(Bad param: ["/photo/a",["x"]])"}, {}, {"/photo/a"}, {}},
    };
    for (const Case &c : cases) {
        Expect(c);
    }
}

TEST_F(IndexMgrOpsTest, SharesAndReindexTouchOnlyWhatEachStepOwns)
{
    const Lines all = {"/photo/a", "/photo/b", "/video/c"};
    const char *noSpace = R"({"no_space":{"photo":true}})";
    const Case cases[] = {
        {"remove", all, "{}", [] { return IndexMgr::ShareRemove("photo"); }, true, FILEIDX_ERR_NONE, {}, {}, {"/video/c"}, {}},
        {"rename", all, "{}", [] { return IndexMgr::ShareRename("photo", "music"); }, true, FILEIDX_ERR_NONE, {}, {},
         {"/music/a", "/music/b", "/video/c"}, {}},
        {"rename before the new name resolves", all, "{}", [] { return IndexMgr::ShareRename("photo", "pics"); }, false,
         FILEIDX_ERR_BAD_PARAM,
         {R"(Bad param: {"audio":false,"document":false,"name":"","path":"/pics/a","photo":false,"video":false})"}, {}, all, {}},
        {"pause", all, "{}", [] { return IndexMgr::SharePause("photo"); }, true, FILEIDX_ERR_NONE, {},
         {"send delete_share_worker share_name=photo", "unwatch /volume1/photo"}, all, {}},
        {"pause without a daemon", all, "{}", [] { return IndexMgr::SharePause("photo"); }, false, FILEIDX_ERR_NONE, {}, {},
         all, {}, "{}", true},
        {"resume", all, R"({"MonitorQueue::Upsert": {"result": 0}})", [] { return IndexMgr::ShareResume("photo"); }, false,
         FILEIDX_ERR_NONE, {"MonitorQueue::Add failed", "UpsertVNotifydCfg failed, share=photo"},
         {"watch /volume1/photo: /volume1/photo/a /volume1/photo/b (forced)"}, all, {}},
        // Two paths in an out-of-space share: revived once, every path queued in request order.
        {"reindex", all, "{}", [] { return IndexMgr::Reindex(ParseJson(R"(["/photo/a/x","/video/c","/photo/a"])")); }, true,
         FILEIDX_ERR_NONE, {}, {"send revive_share_worker share_name=photo"}, all,
         {"65536 /volume1/photo/a/x null", "65536 /volume1/photo/a null", "65536 /volume2/video/c null"}, noSpace},
        {"reindex with a number", all, "{}", [] { return IndexMgr::Reindex(ParseJson(R"(["/video/c",5])")); }, false,
         FILEIDX_ERR_BAD_PARAM, {"Malformed jsArrPath: 5"}, {}, all, {}, noSpace},
        {"reindex of a share without folders", all, "{}",
         [] { return IndexMgr::Reindex(ParseJson(R"(["/video/c","/music/x"])")); }, false, FILEIDX_ERR_NONE, {}, {}, all, {}},
    };
    for (const Case &c : cases) {
        Expect(c);
    }
}

TEST_F(IndexMgrOpsTest, UpgradeFollowsTheFolderList)
{
    const Lines all = {"/photo/a", "/photo/b", "/video/c"};
    const Case cases[] = {
        {"nothing indexed", {}, "{}", Updater_hvx60_beta2, true, FILEIDX_ERR_NONE, {}, {"VLIBServiceStop fileindexd 1"}, {}, {}},
        {"stop fails", {}, "{" + kStopFails + "}", Updater_hvx60_beta2, false, FILEIDX_ERR_NONE,
         {"VLIBServiceStart failed: err=[0x3300 svc.c:9]"}, {"VLIBServiceStop fileindexd 1 (forced)"}, {}, {}},
        {"indexed", all, "{}", Updater_hvx60_beta2, true, FILEIDX_ERR_NONE, {},
         {"VLIBServiceStart fileindexd 1", "VEXOSMBSetSpotlight 1", "watch /volume1/photo: /volume1/photo/a /volume1/photo/b",
          "watch /volume2/video: /volume2/video/c"},
         all, {"65536 /volume1/photo/a null", "65536 /volume1/photo/b null", "65536 /volume2/video/c null"}},
    };
    for (const Case &c : cases) {
        Expect(c);
    }
}

}  // namespace
}  // namespace fileindex_test
