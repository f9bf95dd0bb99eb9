// Custom events in a share's queue file: one line per event, nothing added when a reindex of the
// path is pending, never waiting on a busy queue, and a need-reindex mark when an event is lost.
#include <sys/stat.h>
#include <syslog.h>

#include <algorithm>
#include <sstream>

#include "daemon/event_queue.h"
#include "daemon/queue_record.h"
#include "fileindex/error.h"
#include "fileindex/status.h"
#include "fileindex/utils.h"
#include "share/storage_paths.h"
#include "tests/support/child.h"
#include "tests/support/log_capture.h"
#include "tests/support/sandbox.h"

using namespace VEXO::FILEINDEX;

namespace fileindex_test {
namespace {

class EventQueueTest : public SandboxTest {
protected:
    void SetUp() override
    {
        SandboxTest::SetUp();
        DeclareShares("volume1/photo");
        stdfs::create_directories(MetadataDirPath(SharePath("photo")));
        m_queue = StoragePath(SharePath("photo"), kQueueFileName);
        m_companion = QueueCompanionPath(m_queue);
        m_folder = SharePath("photo") + "/holiday";
        LOG_LEVEL = LOG_ERR;
    }

    void TearDown() override { LOG_LEVEL = LOG_ERR; }

    static Json::Value Report()
    {
        return ParseJson(R"({"document":false,"audio":true,"video":false,"photo":false})");
    }

    std::string m_queue;
    std::string m_companion;
    std::string m_folder;
};

TEST_F(EventQueueTest, EventIsAppendedAsOneLineToANewQueueFile)
{
    ASSERT_TRUE(AddCustomEvent(kEventFolderSettingChanged, m_folder, Report()));
    ASSERT_TRUE(AddCustomEvent(kEventReindex, m_folder + "/x", Json::Value()));
    EXPECT_EQ(ReadFile(m_queue),
              "{\"data\":{\"audio\":true,\"document\":false,\"photo\":false,\"video\":false},"
              "\"event\":131072,\"path\":\"" +
                  m_folder + "\"}\n{\"data\":null,\"event\":65536,\"path\":\"" + m_folder + "/x\"}\n");
    struct stat st;
    ASSERT_EQ(stat(m_queue.c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 0777, 0644u);
    EXPECT_FALSE(stdfs::exists(m_companion)) << "the companion file is never created";
}

TEST_F(EventQueueTest, PendingReindexOfThePathMakesAnyNewEventUnnecessary)
{
    const std::string reindex = "{\"event\":65536,\"path\":\"" + m_folder + "\"}\n";
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
        stdfs::remove(m_companion);
        if (!c.companion.empty()) {
            WriteFile(m_companion, c.companion);
        }
        EXPECT_EQ(HasQueuedReindexEvent(m_folder, m_queue) || HasQueuedReindexEvent(m_folder, m_companion),
                  c.covered);
        ASSERT_TRUE(AddCustomEvent(kEventFolderSettingChanged, m_folder, Report()));
        const size_t lines = static_cast<size_t>(std::count(c.queue.begin(), c.queue.end(), '\n'));
        const std::string after = ReadFile(m_queue);
        EXPECT_EQ(static_cast<size_t>(std::count(after.begin(), after.end(), '\n')), c.covered ? lines : lines + 1);
    }
    EXPECT_TRUE(LogCapture::Lines().empty());
}

TEST_F(EventQueueTest, BusyQueueDropsTheEventAndReportsSuccess)
{
    WriteFile(m_queue, "");
    const struct {
        int level;
        bool debugLine;
    } levels[] = {{LOG_ERR, false}, {6, false}, {LOG_DEBUG, true}, {8, false}};
    LockHolder appender(m_queue, true);
    for (const auto &l : levels) {
        LOG_LEVEL = l.level;
        LogCapture::Clear();
        EXPECT_TRUE(AddCustomEvent(kEventFolderSettingChanged, m_folder, Report())) << l.level;
        EXPECT_EQ(ReadFile(m_queue), "");
        const std::vector<std::string> expected =
            l.debugLine ? std::vector<std::string>{"try lock too many times, path=" + m_queue +
                                                   ", reason=Resource temporarily unavailable"}
                        : std::vector<std::string>{};
        EXPECT_EQ(LogCapture::Messages(), expected) << l.level;
    }
    EXPECT_FALSE(StatusMgr::ShareIsNeedReindex("photo")) << "a dropped event is not a lost one";
}

// An event that cannot be queued is not lost: its share (the empty name when no share holds the
// path) is marked for a reindex, and a mark that cannot be set either is logged.
TEST_F(EventQueueTest, EventThatCannotBeQueuedMarksItsShareForReindex)
{
    stdfs::create_directories(m_queue);  // a directory where the queue file belongs cannot be opened
    EXPECT_FALSE(AddCustomEvent(kEventFolderSettingChanged, m_folder, Report()));
    EXPECT_TRUE(LogCapture::Lines().empty());
    const std::string outside = HostPath("/volume9/elsewhere");
    EXPECT_FALSE(AddCustomEvent(kEventReindex, outside, Json::Value()));
    EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>{"VEXOShareNamePathGet failed, path=" + outside});
    EXPECT_EQ(ParseJson(ReadFile(FILEINDEX_STATUS_CONF_PATH))["need_reindex"], ParseJson(R"({"photo":true,"":true})"));

    LogCapture::Clear();
    LockHolder statusWriter(FILEINDEX_STATUS_LOCK_PATH, true);
    EXPECT_FALSE(AddCustomEvent(kEventReindex, outside, Json::Value()));
    EXPECT_EQ(LogCapture::Messages(), (std::vector<std::string>{"VEXOShareNamePathGet failed, path=" + outside,
                                                                "Failed to lock folder",
                                                                "ShareSetNeedReindex failed, share="}));
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
