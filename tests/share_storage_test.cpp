// Where each share keeps its event queue and index database, and the registration of its indexed
// folders with the file-change notification daemon.
#include <sys/stat.h>

#include <cstring>

#include "fileindex/error.h"
#include "fileindex/fileidx.h"
#include "fileindex/index_mgr.h"
#include "share/storage_paths.h"
#include "tests/support/log_capture.h"
#include "tests/support/sandbox.h"

using namespace VEXO::FILEINDEX;

namespace fileindex_test {
namespace {

class ShareStorageTest : public SandboxTest {
protected:
    void SetUp() override
    {
        SandboxTest::SetUp();
        DeclareShares("volume1/photo volume1/video");
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
    }

    static std::string Queue(const std::string &share) { return StoragePath(SharePath(share), kQueueFileName); }
};

TEST_F(ShareStorageTest, InvalidArgumentsNameTheFirstFailedCheck)
{
    char buffer[64];
    const struct {
        bool queue;
        const char *name;
        char *out;
        int size;
        const char *check;
    } cases[] = {
        {true, nullptr, nullptr, 0, "__null != szName"},
        {true, "photo", nullptr, 64, "__null != szOutQueuePath"},
        {false, "photo", nullptr, 64, "__null != szOutDBPath"},
        {true, "photo", buffer, 0, "cbOutLen > 0"},
        {false, "photo", buffer, -5, "cbOutLen > 0"},
    };
    for (const auto &c : cases) {
        LogCapture::Clear();
        const int result = c.queue ? FILEIDXQueuePathGet(c.name, c.out, c.size) : FILEIDXDBPathGet(c.name, c.out, c.size);
        EXPECT_EQ(result, -1) << c.check;
        EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>{std::string("Invaild Argument (") + c.check + ")=[0]\n"});
        const Json::Value recorded = JournalOf("VLIBCErrSetEx").back()["args"];
        EXPECT_EQ(recorded[0].asInt(), 0x0D00);
        EXPECT_EQ(recorded[1].asString(), "utils.cpp");
    }
    EXPECT_EQ(JournalOf("VLIBCErrSetEx").size(), 5u);
    EXPECT_TRUE(JournalOf("VEXOEAMKDir").empty()) << "nothing is made for a refused call";
    EXPECT_EQ(ErrorHandler::GetError(), FILEIDX_ERR_NONE) << "the library's own code is untouched";
}

TEST_F(ShareStorageTest, QueuePathMakesTheMetadataDirectoryButNotTheQueue)
{
    char buffer[4096];
    const int length = FILEIDXQueuePathGet("PHOTO", buffer, sizeof(buffer));
    EXPECT_EQ(buffer, Queue("photo"));
    EXPECT_EQ(length, static_cast<int>(strlen(buffer)));
    EXPECT_TRUE(stdfs::exists(MetadataDirPath(SharePath("photo"))));
    EXPECT_FALSE(stdfs::exists(buffer));
    EXPECT_TRUE(LogCapture::Lines().empty());
}

TEST_F(ShareStorageTest, DatabasePathMakesTheDirectoryOnceAndQuietlyAfterwards)
{
    char buffer[4096];
    const std::string database = StoragePath(SharePath("photo"), kDatabaseDirName);
    EXPECT_EQ(FILEIDXDBPathGet("photo", buffer, sizeof(buffer)), static_cast<int>(database.size()));
    EXPECT_EQ(buffer, database);
    struct stat st;
    ASSERT_EQ(stat(database.c_str(), &st), 0);
    EXPECT_TRUE(S_ISDIR(st.st_mode));
    EXPECT_EQ(FILEIDXDBPathGet("photo", buffer, sizeof(buffer)), static_cast<int>(database.size()));
    EXPECT_TRUE(LogCapture::Lines().empty());
}

TEST_F(ShareStorageTest, ShortBufferGetsATruncatedTerminatedPath)
{
    char buffer[12];
    memset(buffer, 'z', sizeof(buffer));
    EXPECT_EQ(FILEIDXQueuePathGet("photo", buffer, sizeof(buffer)), 11);
    EXPECT_EQ(std::string(buffer), Queue("photo").substr(0, 11));
}

TEST_F(ShareStorageTest, FailuresOnTheWayAreLoggedAndUnknownSharesRefused)
{
    char buffer[4096];
    EXPECT_EQ(FILEIDXQueuePathGet("nosuch", buffer, sizeof(buffer)), -1);
    ASSERT_EQ(LogCapture::Messages().size(), 1u);
    EXPECT_EQ(LogCapture::Messages()[0].rfind("VEXOShareGet failed, name=nosuch, code=", 0), 0u);

    // A file where the metadata directory belongs: neither directory can be made, and the path
    // is still handed out.
    LogCapture::Clear();
    WriteFile(MetadataDirPath(SharePath("video")), "");
    const std::string database = StoragePath(SharePath("video"), kDatabaseDirName);
    EXPECT_EQ(FILEIDXDBPathGet("video", buffer, sizeof(buffer)), static_cast<int>(database.size()));
    const std::vector<std::string> messages = LogCapture::Messages();
    ASSERT_EQ(messages.size(), 2u);
    EXPECT_EQ(messages[0].rfind("VEXOEAMKDir failed, path=" + MetadataDirPath(SharePath("video")) + ", code=", 0), 0u);
    EXPECT_EQ(messages[1], "mkdir failed, path=" + database + ", reason=Not a directory");
}

class MonitorRegistrationTest : public ShareStorageTest {};

TEST_F(MonitorRegistrationTest, ShareIsRegisteredWithOneEntryPerIndexedFolder)
{
    WriteFile(FILEINDEX_FOLDER_CONF_PATH, R"({"/photo/b":{},"/photo/a":{},"/photo":{},"/video/x":{}})");
    ASSERT_TRUE(IndexMgr::UpsertVNotifydCfg("photo"));
    const std::vector<Json::Value> calls = JournalOf("MonitorQueue::Upsert");
    ASSERT_EQ(calls.size(), 1u);
    Json::Value expected = ParseJson(R"([{"queue": "", "config": [
        {"path": "", "mask": 65486, "ignore": ["@eaDir"]},
        {"path": "", "mask": 65486, "ignore": ["@eaDir"]},
        {"path": "", "mask": 65486, "ignore": ["@eaDir"]}]}, "fileindex", 1])");
    expected[0]["queue"] = Queue("photo");
    expected[0]["config"][0]["path"] = SharePath("photo");
    expected[0]["config"][1]["path"] = SharePath("photo") + "/a";
    expected[0]["config"][2]["path"] = SharePath("photo") + "/b";
    EXPECT_EQ(calls[0]["args"], expected);
}

TEST_F(MonitorRegistrationTest, ShareWithoutFoldersIsRegisteredEmpty)
{
    ASSERT_TRUE(IndexMgr::UpsertVNotifydCfg("video"));
    EXPECT_EQ(JournalOf("MonitorQueue::Upsert").at(0)["args"][0]["config"], Json::Value(Json::arrayValue));
}

TEST_F(MonitorRegistrationTest, UnresolvableFolderAbortsBeforeTheNotificationDaemonIsCalled)
{
    WriteFile(FILEINDEX_FOLDER_CONF_PATH, R"({"/photo/a":{},"/photo/b":{}})");
    // Share look-ups: the queue path, loading both folders, then resolving each for the
    // description; the fifth, for /photo/b, fails.
    SetFaults(ParseJson(R"({"VEXOShareGet": {"after": 4, "result": -1}})"));
    EXPECT_FALSE(IndexMgr::UpsertVNotifydCfg("photo"));
    EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>{"GetFullPath failed, path=/photo/b"});
    EXPECT_TRUE(JournalOf("MonitorQueue::Upsert").empty());
}

TEST_F(MonitorRegistrationTest, RefusedDescriptionsAndRegistrationsFail)
{
    SetFaults(ParseJson(R"({"MonitorQueue::MonitorQueue": {"result": 0}})"));
    EXPECT_FALSE(IndexMgr::UpsertVNotifydCfg("photo"));
    EXPECT_TRUE(LogCapture::Lines().empty());
    EXPECT_TRUE(JournalOf("MonitorQueue::Upsert").empty());

    SetFaults(ParseJson(R"({"MonitorQueue::Upsert": {"result": 0}, "MonitorQueue::Delete": {"result": 0}})"));
    EXPECT_FALSE(IndexMgr::UpsertVNotifydCfg("photo"));
    EXPECT_FALSE(IndexMgr::DeleteVNotifydCfg("photo"));
    EXPECT_EQ(LogCapture::Messages(), (std::vector<std::string>{"MonitorQueue::Add failed", "MonitorQueue::Delete failed"}));

    LogCapture::Clear();
    EXPECT_FALSE(IndexMgr::UpsertVNotifydCfg("nosuch"));
    EXPECT_FALSE(IndexMgr::DeleteVNotifydCfg("nosuch"));
    const std::vector<std::string> messages = LogCapture::Messages();
    ASSERT_EQ(messages.size(), 4u);
    EXPECT_EQ(messages[1], "FILEIDXQueuePathGet failed, share=nosuch");
    EXPECT_EQ(messages[3], "FILEIDXQueuePathGet failed, share=nosuch");
}

TEST_F(MonitorRegistrationTest, DeleteRemovesTheShareRegistration)
{
    ASSERT_TRUE(IndexMgr::UpsertVNotifydCfg("photo"));
    ASSERT_TRUE(IndexMgr::UpsertVNotifydCfg("video"));
    ASSERT_TRUE(IndexMgr::DeleteVNotifydCfg("photo"));
    EXPECT_EQ(JournalOf("MonitorQueue::Delete").at(0)["args"], ParseJson("[\"" + Queue("photo") + "\", \"fileindex\", 1]"));
    const Json::Value registered = ParseJson(ReadFile(StatePath("monitor_queues.json")));
    EXPECT_EQ(registered["fileindex"].getMemberNames(), std::vector<std::string>{Queue("video")});
}

}  // namespace
}  // namespace fileindex_test
