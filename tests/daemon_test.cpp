// What reaches the indexing daemon: the frame of each command, a sender that never hangs or dies
// because the daemon is missing or goes away, and custom events in a share's queue file (one line
// each, nothing added when a reindex of the path is pending, never waiting on a busy queue, and a
// need-reindex mark when an event is lost).
#include <signal.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstring>
#include <sstream>

#include "daemon/event_queue.h"
#include "daemon/queue_record.h"
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

class DaemonChannelTest : public SandboxTest {};

// One frame per connection, byte for byte: the length of the text with its NUL, the text, the NUL.
// The length goes out on its own, and a long text in pieces of at most 1024 bytes.
TEST_F(DaemonChannelTest, OneFramePerConnectionByteForByte)
{
    FrameListener daemon;
    Json::Value data;
    data["folder_path"] = "/photo/caf\xe9\xff";
    ASSERT_TRUE(SendCammandToDaemon("upsert_folder_setting", data));
    ASSERT_TRUE(SendCammandToDaemon("resume", Json::Value(Json::objectValue)));
    const std::string longPath = "/photo/" + std::string(5000, 'x');
    data["folder_path"] = longPath;
    SocketWriteRecorder writes;
    ASSERT_TRUE(SendCammandToDaemon("upsert_folder_setting", data));

    const std::string texts[] = {"{\"data\":{\"folder_path\":\"/photo/caf\xe9\xff\"},\"type\":\"upsert_folder_setting\"}",
                                 "{\"data\":{},\"type\":\"resume\"}",
                                 "{\"data\":{\"folder_path\":\"" + longPath + "\"},\"type\":\"upsert_folder_setting\"}"};
    const std::vector<std::string> connections = daemon.Connections(3);
    ASSERT_EQ(connections.size(), 3u);
    for (size_t i = 0; i < connections.size(); ++i) {
        const uint32_t length = static_cast<uint32_t>(texts[i].size() + 1);
        EXPECT_EQ(connections[i], std::string(reinterpret_cast<const char *>(&length), 4) + texts[i] + '\0') << i;
    }
    const std::vector<size_t> sizes = writes.Sizes();
    ASSERT_GE(sizes.size(), 6u);
    EXPECT_EQ(sizes[0], 4u) << "the length goes first, on its own";
    size_t total = 0;
    for (size_t i = 1; i < sizes.size(); ++i) {
        EXPECT_LE(sizes[i], 1024u);
        total += sizes[i];
    }
    EXPECT_EQ(total, texts[2].size() + 1);
}

TEST_F(DaemonChannelTest, MissingDaemonFailsAtOnce)
{
    const auto start = std::chrono::steady_clock::now();
    EXPECT_FALSE(SendCammandToDaemon("resume", Json::Value(Json::objectValue)));

    // A socket file left behind by a daemon that died refuses the connection just as fast.
    const int stale = socket(AF_UNIX, SOCK_STREAM, 0);
    sockaddr_un address = {};
    address.sun_family = AF_UNIX;
    strcpy(address.sun_path, FILEINDEX_DAEMON_SOCKET_PATH);
    ASSERT_EQ(bind(stale, reinterpret_cast<sockaddr *>(&address), sizeof(address)), 0);
    close(stale);
    EXPECT_FALSE(SendCammandToDaemon("resume", Json::Value(Json::objectValue)));
    EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(100));
}

TEST_F(DaemonChannelTest, DaemonThatHangsUpGivesFalseAndTheCallerSurvives)
{
    Json::Value data;
    data["folder_path"] = std::string(1 << 20, 'x');  // more than the socket buffer holds
    bool sent = true;
    {
        FrameListener daemon(FrameListener::Mode::kCloseAtOnce);
        sent = SendCammandToDaemon("upsert_folder_setting", data);
        daemon.Connections(1);
    }
    EXPECT_FALSE(sent);
    struct sigaction action;
    sigaction(SIGPIPE, nullptr, &action);
    EXPECT_EQ(action.sa_handler, SIG_IGN) << "SIGPIPE stays ignored after the call";
}

// fileindex-standin-daemon, in both modes, ends at once on SIGTERM or SIGINT, taking its socket with
// it, even when started with both signals blocked (a program that blocks them for its own threads
// may start it so), and once its socket is gone (a sandbox rebuilt under it): none is left behind.
TEST_F(DaemonChannelTest, TheStandInEndsOnASignalOrOnceItsSocketIsGone)
{
    const struct Row {
        bool processQueues;
        int signal;  // 0: the socket is removed instead
        bool startedBlocked;
    } rows[] = {
        {false, SIGTERM, false}, {false, SIGINT, false}, {false, SIGTERM, true}, {false, 0, false},
        {true, SIGTERM, false},  {true, SIGINT, true},   {true, 0, false},
    };
    for (const Row &row : rows) {
        SCOPED_TRACE(std::string(row.processQueues ? "--process-queues, " : "") +
                     (row.signal == 0 ? "socket removed" : strsignal(row.signal)) +
                     (row.startedBlocked ? ", started blocked" : ""));
        unlink(FILEINDEX_DAEMON_SOCKET_PATH);  // one a failed row left
        Child standIn([&row](const Child::Ready &) {
            sigset_t stop;
            sigemptyset(&stop);
            sigaddset(&stop, SIGTERM);
            sigaddset(&stop, SIGINT);
            sigprocmask(row.startedBlocked ? SIG_BLOCK : SIG_UNBLOCK, &stop, nullptr);
            execl(FILEINDEX_STANDIN_DAEMON, FILEINDEX_STANDIN_DAEMON, "--output", "/dev/null",
                  row.processQueues ? "--process-queues" : nullptr, nullptr);
            _exit(127);
        });
        for (int i = 0; i < 500 && access(FILEINDEX_DAEMON_SOCKET_PATH, F_OK) != 0; ++i) {
            usleep(10000);
        }
        ASSERT_EQ(access(FILEINDEX_DAEMON_SOCKET_PATH, F_OK), 0) << "the stand-in did not listen";
        if (row.signal != 0) {
            standIn.Kill(row.signal);
        } else {
            unlink(FILEINDEX_DAEMON_SOCKET_PATH);
        }
        EXPECT_EQ(standIn.WaitFor(std::chrono::seconds(1)), 0);
        EXPECT_NE(access(FILEINDEX_DAEMON_SOCKET_PATH, F_OK), 0);
    }
}

class EventQueueTest : public SandboxTest {
protected:
    void SetUp() override
    {
        SandboxTest::SetUp();
        DeclareShares("volume1/photo");
        stdfs::create_directories(MetadataDirPath(SharePath("photo")));
        m_queue = StoragePath(SharePath("photo"), kQueueFileName);
        m_folder = SharePath("photo") + "/holiday";
        LOG_LEVEL = LOG_ERR;
    }

    void TearDown() override { LOG_LEVEL = LOG_ERR; }

    bool AddReport() const
    {
        return AddCustomEvent(kEventFolderSettingChanged, m_folder,
                              ParseJson(R"({"document":false,"audio":true,"video":false,"photo":false})"));
    }

    std::string m_queue;
    std::string m_folder;
};

TEST_F(EventQueueTest, EventIsAppendedAsOneLineToANewQueueFile)
{
    ASSERT_TRUE(AddReport());
    ASSERT_TRUE(AddCustomEvent(kEventReindex, m_folder + "/x", Json::Value()));
    EXPECT_EQ(ReadFile(m_queue), "{\"data\":{\"audio\":true,\"document\":false,\"photo\":false,\"video\":false},"
                                 "\"event\":131072,\"path\":\"" + m_folder + "\"}\n"
                                 "{\"data\":null,\"event\":65536,\"path\":\"" + m_folder + "/x\"}\n");
    struct stat st;
    ASSERT_EQ(stat(m_queue.c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 0777, 0644u);
    EXPECT_FALSE(stdfs::exists(QueueCompanionPath(m_queue))) << "the companion file is never created";
}

TEST_F(EventQueueTest, PendingReindexOfThePathMakesAnyNewEventUnnecessary)
{
    const std::string reindex = "{\"event\":65536,\"path\":\"" + m_folder + "\"}\n";
    const std::string companion = QueueCompanionPath(m_queue);
    const struct {
        std::string queue;
        std::string companion;
        bool covered;
    } cases[] = {
        {reindex, "", true},
        {"", reindex, true},
        {"not json\n{\"event\":\n[1]\n{\"path\":\"x\"}\n" + reindex, "", true},
        {"{\"event\":131072,\"path\":\"" + m_folder + "\"}\n", "", false},
        {"{\"event\":65536,\"path\":\"" + m_folder + "/sub\"}\n", "", false},
        {"{\"event\":\"65536\",\"path\":\"" + m_folder + "\"}\n", "", false},
        {"{\"event\":65536,\"path\":[\"" + m_folder + "\"]}\n", "", false},
        {"{\"event\":65536.0,\"path\":\"" + m_folder + "\"}\n", "", true},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.queue + " | " + c.companion);
        WriteFile(m_queue, c.queue);
        stdfs::remove(companion);
        if (!c.companion.empty()) {
            WriteFile(companion, c.companion);
        }
        EXPECT_EQ(HasQueuedReindexEvent(m_folder, m_queue) || HasQueuedReindexEvent(m_folder, companion), c.covered);
        ASSERT_TRUE(AddReport());
        EXPECT_EQ(ReadFile(m_queue).size() == c.queue.size(), c.covered);
    }
    EXPECT_TRUE(LogCapture::Lines().empty());
}

TEST_F(EventQueueTest, BusyQueueDropsTheEventAndReportsSuccess)
{
    WriteFile(m_queue, "");
    LockHolder appender(m_queue, true);
    for (const int level : {LOG_ERR, 6, LOG_DEBUG, 8}) {
        LOG_LEVEL = level;
        LogCapture::Clear();
        EXPECT_TRUE(AddReport()) << level;
        EXPECT_EQ(ReadFile(m_queue), "");
        EXPECT_EQ(LogCapture::Messages(), level == LOG_DEBUG ? std::vector<std::string>{"try lock too many times, path=" + m_queue +
                                                                                      ", reason=Resource temporarily unavailable"}
                                                             : std::vector<std::string>{}) << level;
    }
    EXPECT_FALSE(StatusMgr::ShareIsNeedReindex("photo")) << "a dropped event is not a lost one";
}

// An event that cannot be queued is not lost: its share (the empty name when no share holds the
// path) is marked for a reindex, and a mark that cannot be set either is logged. (Each failing step
// of the append has its row in the fault loop of hardening_test.cpp.)
TEST_F(EventQueueTest, EventOutsideEveryShareMarksTheEmptyShareName)
{
    const std::string outside = HostPath("/volume9/elsewhere");
    EXPECT_FALSE(AddCustomEvent(kEventReindex, outside, Json::Value()));
    EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>{"VEXOShareNamePathGet failed, path=" + outside});
    EXPECT_EQ(ParseJson(ReadFile(FILEINDEX_STATUS_CONF_PATH))["need_reindex"], ParseJson(R"({"":true})"));

    LogCapture::Clear();
    LockHolder statusWriter(FILEINDEX_STATUS_LOCK_PATH, true);
    EXPECT_FALSE(AddCustomEvent(kEventReindex, outside, Json::Value()));
    EXPECT_EQ(LogCapture::Messages(), (std::vector<std::string>{"VEXOShareNamePathGet failed, path=" + outside,
                                                                "Failed to lock folder", "ShareSetNeedReindex failed, share="}));
}

// Records of several appending processes never interleave, and each process's records keep their
// order, whatever their size.
TEST_F(EventQueueTest, ConcurrentAppendsKeepWholeLinesInOrder)
{
    constexpr int kWriters = 4;
    constexpr int kEvents = 40;
    const size_t sizes[] = {300, 6000, 70000};
    std::vector<std::unique_ptr<Child>> writers;
    for (int w = 0; w < kWriters; ++w) {
        writers.push_back(std::make_unique<Child>([&, w](const Child::Ready &ready) {
            ready();
            for (int i = 0; i < kEvents; ++i) {
                Json::Value data;
                data["writer"] = w;
                data["seq"] = i;
                data["pad"] = std::string(sizes[(w + i) % 3], 'p');
                AddCustomEvent(kEventFolderSettingChanged, m_folder, data);
            }
        }));
    }
    for (auto &writer : writers) {
        EXPECT_EQ(writer->Wait(), 0);
    }
    std::istringstream lines(ReadFile(m_queue));
    std::vector<int> lastSeq(kWriters, -1);
    int records = 0;
    for (std::string line; std::getline(lines, line); ++records) {
        const Json::Value record = ParseJson(line);
        const int writer = record["data"]["writer"].asInt();
        const int seq = record["data"]["seq"].asInt();
        ASSERT_GT(seq, lastSeq[writer]) << "writer " << writer << " out of order";
        lastSeq[writer] = seq;
    }
    EXPECT_GT(records, kEvents) << "events of several writers should have landed";
}

}  // namespace
}  // namespace fileindex_test
