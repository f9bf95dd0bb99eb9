// The indexing progress report: pending work judged from the shares' queue files, and what the
// pause and no-space state of the status file make of it.
#include <ctime>

#include "fileindex/status.h"
#include "share/storage_paths.h"
#include "tests/support/log_capture.h"
#include "tests/support/sandbox.h"

using namespace VEXO::FILEINDEX;

namespace fileindex_test {
namespace {

class ProgressTest : public SandboxTest {
protected:
    void SetUp() override
    {
        SandboxTest::SetUp();
        DeclareShares("volume1/photo volume1/music volume1/ro+read_only");
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
