// Shares and paths: conversions between share-relative and full paths and the small helpers the
// library leans on, whether a path or share is covered by the indexed folders (through IndexMgr and
// the flat entry points), where each share keeps its event queue and index database, and the
// registration of its indexed folders with the file-change notification daemon.
#include <syslog.h>
#include <unistd.h>

#include <cstring>

#include "fileindex/error.h"
#include "fileindex/fileidx.h"
#include "fileindex/index_mgr.h"
#include "fileindex/utils.h"
#include "share/storage_paths.h"
#include "tests/support/log_capture.h"
#include "tests/support/sandbox.h"

using namespace VEXO::FILEINDEX;

namespace fileindex_test {
namespace {

TEST(SharePaths, ShareNameIsTheFirstComponentAfterAnUncheckedFirstCharacter)
{
    const struct {
        const char *path;
        bool ok;
        const char *share;
    } cases[] = {
        {"", false, "untouched"},
        {"/", true, ""},
        {"/photo", true, "photo"},
        {"/photo/holiday/trip", true, "photo"},
        {"photo/x", true, "hoto"},
        {"//x", true, ""},
        {"/caf\xe9/x", true, "caf\xe9"},
    };
    for (const auto &c : cases) {
        std::string share = "untouched";
        EXPECT_EQ(GetShareNameByPath(share, c.path), c.ok) << c.path;
        EXPECT_EQ(share, c.share) << c.path;
    }
}

TEST(SharePaths, ReplaceShareNameRewritesOnlyTheFirstComponent)
{
    const struct {
        const char *path;
        const char *share;
        const char *result;
    } cases[] = {
        {"", "z", ""},
        {"/a", "b", "/b"},
        {"/a/b/c", "z", "/z/b/c"},
        {"x/y", "z", "/z/y"},
        {"/old/", "new", "/new/"},
    };
    for (const auto &c : cases) {
        EXPECT_EQ(ReplaceShareName(c.path, c.share), c.result) << c.path;
    }
}

class SharesTest : public SandboxTest {
protected:
    void SetUp() override
    {
        SandboxTest::SetUp();
        DeclareShares("volume1/photo volume1/video volume1/video2 volume2/music");
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
    }

    static std::string Queue(const std::string &share) { return StoragePath(SharePath(share), kQueueFileName); }

    static std::vector<Folder> FoldersAt(std::initializer_list<const char *> paths)
    {
        std::vector<Folder> folders(paths.size());
        for (size_t i = 0; i < paths.size(); ++i) {
            folders[i].Load(paths.begin()[i], Json::Value(Json::objectValue));
        }
        return folders;
    }
};

TEST_F(SharesTest, FullPathIsTheShareVolumeFollowedByThePathAsGiven)
{
    const struct {
        const char *path;
        std::string full;  // "": the path does not resolve
        _tag_fileindex_err_ code;
        std::vector<std::string> messages;
    } cases[] = {
        {"/photo", HostPath("/volume1/photo"), FILEIDX_ERR_NONE, {}},
        {"/photo/holiday/trip", HostPath("/volume1/photo/holiday/trip"), FILEIDX_ERR_NONE, {}},
        {"/music//a/", HostPath("/volume2/music//a/"), FILEIDX_ERR_NONE, {}},
        {"/Photo/x", HostPath("/volume1/Photo/x"), FILEIDX_ERR_NONE, {}},  // the caller's case is kept
        {"/nosuch/a", "", FILEIDX_ERR_PATH, {}},
        {"", "", FILEIDX_ERR_NONE, {"GetShareNameByPath failed, path="}},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.path);
        LogCapture::Clear();
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
        std::string full = "untouched";
        EXPECT_EQ(GetFullPath(full, c.path), !c.full.empty());
        EXPECT_EQ(full, c.full.empty() ? "untouched" : c.full);
        EXPECT_EQ(ErrorHandler::GetError(), c.code);
        EXPECT_EQ(LogCapture::Messages(), c.messages);
    }
    // Log lines go out at error priority, source file and line first.
    const std::vector<LogLine> lines = LogCapture::Lines();
    ASSERT_EQ(lines.size(), 1u);
    EXPECT_EQ(lines[0].priority, LOG_ERR);
    EXPECT_EQ(lines[0].text.rfind("utils.cpp:", 0), 0u);
}

TEST_F(SharesTest, ExistenceTestsDoNotFollowSymbolicLinks)
{
    const std::string dir = SharePath("photo");
    WriteFile(dir + "/file", "x");
    ASSERT_EQ(symlink(dir.c_str(), (dir + "/dirlink").c_str()), 0);
    ASSERT_EQ(symlink((dir + "/file").c_str(), (dir + "/filelink").c_str()), 0);
    const struct {
        std::string path;
        bool dir, file;
    } cases[] = {{dir, true, false}, {dir + "/file", false, true}, {dir + "/dirlink", false, false},
                 {dir + "/filelink", false, false}, {dir + "/missing", false, false}};
    for (const auto &c : cases) {
        EXPECT_EQ(IsDirExist(c.path), c.dir) << c.path;
        EXPECT_EQ(IsFileExist(c.path), c.file) << c.path;
    }
}

TEST_F(SharesTest, ComponentRuleDecidesWhatIsInsideAFolder)
{
    const std::vector<Folder> photo = FoldersAt({"/photo"});
    const std::vector<Folder> photoA = FoldersAt({"/photo/a"});
    const struct {
        const char *path;
        bool indexed;          // with folder /photo; also as a full path
        bool containsIndexed;  // with folder /photo/a
    } cases[] = {
        {"/photo", true, true}, {"/photo/a", true, true}, {"/photo/a/b", true, false}, {"/photo/ab", true, false},
        {"/photo/", true, false}, {"/photo2", false, false}, {"/pho", false, false}, {"/Photo", false, false},
        {"/", false, false},
    };
    for (const auto &c : cases) {
        EXPECT_EQ(IndexMgr::IsPathIndexed(c.path, photo), c.indexed) << c.path;
        EXPECT_EQ(IndexMgr::IsFullPathIndexed(HostPath("/volume1") + c.path, photo), c.indexed) << c.path;
        EXPECT_EQ(IndexMgr::IsPathContainIndexed(c.path, photoA), c.containsIndexed) << c.path;
    }
    EXPECT_FALSE(IndexMgr::IsPathIndexed("/photo", {}));
    EXPECT_FALSE(IndexMgr::IsPathContainIndexed("/", {}));
    EXPECT_FALSE(IndexMgr::IsFullPathIndexed("/photo", photo)) << "a share-relative path is not a full path";
}

TEST_F(SharesTest, QueriesReadTheFolderListAfreshAtEveryCall)
{
    EXPECT_FALSE(IndexMgr::IsPathIndexed("/photo/a"));
    WriteFile(FILEINDEX_FOLDER_CONF_PATH, R"({"/photo/a":{}})");
    EXPECT_TRUE(IndexMgr::IsPathIndexed("/photo/a/b"));
    EXPECT_TRUE(IndexMgr::IsPathContainIndexed("/photo"));
    EXPECT_TRUE(IndexMgr::IsFullPathIndexed(HostPath("/volume1/photo/a")));
    EXPECT_EQ(FILEIDXIsPathIndexed("/photo/a"), 1);
    EXPECT_EQ(FILEIDXIsPathIndexed("/photo/b"), 0);
    EXPECT_EQ(FILEIDXIsFullPathIndexed(HostPath("/volume1/photo/a/x").c_str()), 1);
    EXPECT_EQ(FILEIDXIsFullPathIndexed(HostPath("/volume1/photo").c_str()), 0);
    EXPECT_EQ(FILEIDXIsPathIndexed(nullptr), 0);
    EXPECT_EQ(FILEIDXIsFullPathIndexed(nullptr), 0);
    EXPECT_EQ(FILEIDXIsShareIndexed(nullptr), 0);
}

TEST_F(SharesTest, ShareIsIndexedByExactNameAndUnnamedFoldersArePassedOver)
{
    WriteFile(FILEINDEX_FOLDER_CONF_PATH, R"({"":{},"/video2/a":{}})");
    EXPECT_FALSE(IndexMgr::IsShareIndexed("video"));
    EXPECT_EQ(LogCapture::Messages().back(), "Failed to get share name from path: ");
    EXPECT_TRUE(IndexMgr::IsShareIndexed("video2"));
    EXPECT_EQ(FILEIDXIsShareIndexed("video2"), 1);
    EXPECT_EQ(FILEIDXIsShareIndexed("Video2"), 0);
    EXPECT_EQ(FILEIDXIsShareIndexed("photo"), 0);
}

TEST_F(SharesTest, InvalidArgumentsNameTheFirstFailedCheck)
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
        const int result =
            c.queue ? FILEIDXQueuePathGet(c.name, c.out, c.size) : FILEIDXDBPathGet(c.name, c.out, c.size);
        EXPECT_EQ(result, -1) << c.check;
        EXPECT_EQ(LogCapture::Messages(),
                  std::vector<std::string>{std::string("Invaild Argument (") + c.check + ")=[0]\n"});
        const Json::Value recorded = Journal("VLIBCErrSetEx").back()["args"];
        EXPECT_EQ(recorded[0].asInt(), 0x0D00);
        EXPECT_EQ(recorded[1].asString(), "utils.cpp");
    }
    EXPECT_EQ(Journal("VLIBCErrSetEx").size(), 5u);
    EXPECT_TRUE(Journal("VEXOEAMKDir").empty()) << "nothing is made for a refused call";
    EXPECT_EQ(ErrorHandler::GetError(), FILEIDX_ERR_NONE) << "the library's own code is untouched";
}

TEST_F(SharesTest, PathsLieInTheSharesMetadataDirectoryWhichIsMade)
{
    // The names the daemon and the notification daemon look for, spelt out once.
    EXPECT_EQ(StoragePath("/v/s", kQueueFileName), "/v/s/@eaDir/VEXO@file_index_queue");
    EXPECT_EQ(StoragePath("/v/s", kDatabaseDirName), "/v/s/@eaDir/VEXO@.fileindexdb");
    EXPECT_EQ(QueueCompanionPath("/v/s/q"), "/v/s/q.tmp");

    const std::string queue = Queue("photo");
    const std::string database = StoragePath(SharePath("photo"), kDatabaseDirName);
    const struct {
        bool isQueue;
        const char *share;
        int size;
        std::string path;
        bool madeDir;  // the final path is a directory afterwards
    } cases[] = {
        {true, "PHOTO", 4096, queue, false},  // the share's stored path, whatever the case asked for
        {true, "photo", 12, queue, false},    // cut to the buffer, terminated
        // cut within the directory's name: the directory is still made in full, nothing under the cut name
        {false, "photo", static_cast<int>(MetadataDirPath(SharePath("photo")).size()) + 6, database, true},
        {false, "photo", 4096, database, true},
        {false, "photo", 4096, database, true},  // made already: quietly again
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.path + " in " + std::to_string(c.size));
        char buffer[4096];
        memset(buffer, 'z', sizeof(buffer));
        const int length = c.isQueue ? FILEIDXQueuePathGet(c.share, buffer, c.size)
                                     : FILEIDXDBPathGet(c.share, buffer, c.size);
        const std::string expected = c.path.substr(0, static_cast<size_t>(c.size) - 1);
        EXPECT_EQ(std::string(buffer, strnlen(buffer, sizeof(buffer))), expected);
        EXPECT_EQ(length, static_cast<int>(expected.size()));
        EXPECT_TRUE(stdfs::is_directory(MetadataDirPath(SharePath("photo"))));
        EXPECT_EQ(stdfs::is_directory(c.path), c.madeDir);
        EXPECT_TRUE(c.isQueue || expected == c.path || !stdfs::exists(expected));
        EXPECT_FALSE(stdfs::exists(queue)) << "the queue file is made by its first writer";
    }
    EXPECT_TRUE(LogCapture::Lines().empty());
}

TEST_F(SharesTest, FailuresOnTheWayAreLoggedAndUnknownSharesRefused)
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

// A share is registered with one entry per indexed folder, in path order, and removed as a whole.
TEST_F(SharesTest, ShareIsRegisteredWithOneEntryPerIndexedFolderInPathOrder)
{
    WriteFile(FILEINDEX_FOLDER_CONF_PATH, R"({"/photo/b":{},"/photo/a":{},"/photo":{},"/photos/x":{}})");
    const struct {
        const char *share;
        std::vector<std::string> folders;  // inside the share
    } cases[] = {{"photo", {"", "/a", "/b"}}, {"video", {}}};
    for (const auto &c : cases) {
        SCOPED_TRACE(c.share);
        ASSERT_TRUE(IndexMgr::UpsertVNotifydCfg(c.share));
        Json::Value description = ParseJson(R"({"config": []})");
        description["queue"] = Queue(c.share);
        for (const std::string &folder : c.folders) {
            Json::Value entry = ParseJson(R"({"mask": 65486, "ignore": ["@eaDir"]})");
            entry["path"] = SharePath(c.share) + folder;
            description["config"].append(entry);
        }
        Json::Value expected = ParseJson(R"([null, "fileindex", 1])");
        expected[0] = description;
        EXPECT_EQ(Journal("MonitorQueue::Upsert").back()["args"], expected);
    }
    ASSERT_TRUE(IndexMgr::DeleteVNotifydCfg("photo"));
    Json::Value deleted = ParseJson(R"([null, "fileindex", 1])");
    deleted[0] = Queue("photo");
    EXPECT_EQ(Journal("MonitorQueue::Delete").at(0)["args"], deleted);
    EXPECT_EQ(ParseJson(ReadFile(StatePath("monitor_queues.json")))["fileindex"].getMemberNames(),
              std::vector<std::string>{Queue("video")});
}

TEST_F(SharesTest, UnresolvableFolderAbortsBeforeTheNotificationDaemonIsCalled)
{
    WriteFile(FILEINDEX_FOLDER_CONF_PATH, R"({"/photo/a":{},"/photo/b":{}})");
    // Share look-ups: the queue path, loading both folders, then resolving each for the
    // description; the fifth, for /photo/b, fails.
    SetFaults(ParseJson(R"({"VEXOShareGet": {"after": 4, "result": -1}})"));
    EXPECT_FALSE(IndexMgr::UpsertVNotifydCfg("photo"));
    EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>{"GetFullPath failed, path=/photo/b"});
    EXPECT_TRUE(Journal("MonitorQueue::Upsert").empty());
}

TEST_F(SharesTest, RefusedDescriptionsAndRegistrationsFail)
{
    SetFaults(ParseJson(R"({"MonitorQueue::MonitorQueue": {"result": 0}})"));
    EXPECT_FALSE(IndexMgr::UpsertVNotifydCfg("photo"));
    EXPECT_TRUE(LogCapture::Lines().empty());
    EXPECT_TRUE(Journal("MonitorQueue::Upsert").empty());

    SetFaults(ParseJson(R"({"MonitorQueue::Upsert": {"result": 0}, "MonitorQueue::Delete": {"result": 0}})"));
    EXPECT_FALSE(IndexMgr::UpsertVNotifydCfg("photo"));
    EXPECT_FALSE(IndexMgr::DeleteVNotifydCfg("photo"));
    EXPECT_EQ(LogCapture::Messages(),
              (std::vector<std::string>{"MonitorQueue::Add failed", "MonitorQueue::Delete failed"}));

    LogCapture::Clear();
    EXPECT_FALSE(IndexMgr::UpsertVNotifydCfg("nosuch"));
    EXPECT_FALSE(IndexMgr::DeleteVNotifydCfg("nosuch"));
    const std::vector<std::string> messages = LogCapture::Messages();
    ASSERT_EQ(messages.size(), 4u);
    EXPECT_EQ(messages[1], "FILEIDXQueuePathGet failed, share=nosuch");
    EXPECT_EQ(messages[3], "FILEIDXQueuePathGet failed, share=nosuch");
}

}  // namespace
}  // namespace fileindex_test
