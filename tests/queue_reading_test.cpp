// Queue files read fast: every line judged as the JSON library judges it, lines found whole across
// the reader's blocks, and a listing that reads each share, queue and status.conf once reporting
// exactly what each folder's own calls report, malformed lines included.
#include <cstdio>
#include <set>

#include "config/json_io.h"
#include "daemon/event_queue.h"
#include "daemon/queue_record.h"
#include "fileindex/index_mgr.h"
#include "fileindex/error.h"
#include "fileindex/status.h"
#include "fileindex/utils.h"
#include "share/storage_paths.h"
#include "tests/support/log_capture.h"
#include "tests/support/sandbox.h"

using namespace VEXO::FILEINDEX;

namespace fileindex_test {
namespace {

TEST(QueueLineTest, TextReaderJudgesEveryLineAsTheJsonLibraryDoes)
{
    const struct {
        std::string line;
        bool record;
        unsigned event;
        std::string path;
        std::string pathOld;
    } cases[] = {
        {R"({"event":65536,"path":"/v/a"})", true, 65536, "/v/a", ""},
        {R"( { "event" : 256 , "path":"/v/b", "path_old":"/v/a" } )", true, 256, "/v/b", "/v/a"},
        {R"({"event":2,"path":"/v/b","path_old":"/v/a"})", true, 2, "/v/b", ""},
        {R"({"event":256,"path":"/v/b","path_old":"/v/a"})", true, 256, "/v/b", "/v/a"},
        {"{\"event\":0,\"path\":\"\"}\r", true, 0, "", ""},
        {R"({"event":256,"path":"/v/b","path_old":7})", true, 256, "/v/b", ""},
        {R"({"event":6.5536e4,"path":"/v/a"})", true, 65536, "/v/a", ""},
        {R"({"event":65536.9,"path":"/v/a"})", true, 65536, "/v/a", ""},
        {R"({"event":-0,"path":"/v/a"})", true, 0, "/v/a", ""},
        {R"({"event":4294967295,"path":"/v/a"})", true, 4294967295u, "/v/a", ""},
        {R"({"event":true,"path":"/v/a"})", true, 1, "/v/a", ""},
        {R"({"event":null,"path":"/v/a"})", true, 0, "/v/a", ""},
        {R"({"event":"x","event":1,"path":"/v/a"})", true, 1, "/v/a", ""},
        {R"({"event":1,"p\u0061th":"\/v\/caf\u00e9\"\\\t"})", true, 1, "/v/caf\xc3\xa9\"\\\t", ""},
        {"{\"event\":1,\"path\":\"/v/caf\xe9\"}", true, 1, "/v/caf\xe9", ""},
        {R"({"event":1,"path":"/v/\ud83d\ude00"})", true, 1, "/v/\xf0\x9f\x98\x80", ""},
        {R"({"event":1,"path":"/v/a","data":[1.5,-2e-3,{"d":{"e":[]}}]})", true, 1, "/v/a", ""},
        {R"({"data":{"audio":true,"event":false},"event":131072,"path":"/v/a"})", true, 131072, "/v/a", ""},
        {R"({"data":null,"event":256,"path":"/v/b","path_old":"/v/a"})", true, 256, "/v/b", "/v/a"},
        {R"({"data":{"n":1,"a\"":{}},"event":65536,"path":"/v/a"})", true, 65536, "/v/a", ""},
        {R"({"data":{"a":true,},"event":1,"path":"/v/a"})", false, 0, "", ""},
        {R"({"data":{"a":nul},"event":1,"path":"/v/a"})", false, 0, "", ""},
        {R"({"event":-1,"path":"/v/a"})", false, 0, "", ""},
        {R"({"event":4294967296,"path":"/v/a"})", false, 0, "", ""},
        {R"({"event":"65536","path":"/v/a"})", false, 0, "", ""},
        {R"({"event":1,"path":"/v/a","event":[1]})", false, 0, "", ""},
        {R"({"event":1,"path\u0000":"/v/a"})", false, 0, "", ""},
        {R"({"event":1,"path":"/v/\ud800"})", false, 0, "", ""},
        {R"({"event":1,"path":"/v/a","data":1e400})", false, 0, "", ""},
        {"{\"event\":1,\"path\":\"\t\"}", false, 0, "", ""},  // raw control characters, read one byte,
        {"{\"event\":1,\"path\":\"/v/ab\tc\"}", false, 0, "", ""},  // eight
        {"{\"event\":1,\"path\":\"/v/a\x01\",\"data\":\"0123456789abcdef\"}", false, 0, "", ""},  // and sixteen at a time
        {R"({"event":01,"path":"/v/a"})", false, 0, "", ""},
        {R"({"event":1,"path":"/v/a"} x)", false, 0, "", ""},
        {R"({"event":1,"path":"/v/a")", false, 0, "", ""},
        {R"([{"event":1,"path":"/v/a"}])", false, 0, "", ""},
        {"", false, 0, "", ""},
    };
    for (const auto &c : cases) {
        for (const auto parse : {ParseQueueRecord, ParseQueueRecordAsJsonValue}) {
            QueueRecord record;
            ASSERT_EQ(parse(c.line, record), c.record) << c.line;
            if (c.record) {
                EXPECT_EQ(record.event, c.event) << c.line;
                EXPECT_EQ(record.path, c.path) << c.line;
                EXPECT_EQ(record.pathOld, c.pathOld) << c.line;
            }
        }
    }
}

class QueueScanTest : public SandboxTest {
protected:
    void SetUp() override
    {
        SandboxTest::SetUp();
        DeclareShares("volume1/photo");
        for (const char *folder : {"a", "b", "c", "d", "caf\xe9"}) {
            stdfs::create_directories(SharePath("photo") + "/" + folder);
        }
        stdfs::create_directories(MetadataDirPath(SharePath("photo")));
        m_queue = StoragePath(SharePath("photo"), kQueueFileName);
    }

    // A record of an event on the entry at path inside the share.
    static std::string Event(const std::string &path, unsigned event = 2)
    {
        Json::Value record;
        record["event"] = event;
        record["path"] = SharePath("photo") + path;
        return toString(record) + "\n";
    }

    std::string m_queue;
};

// Lines cross the reader's blocks of 256 KiB, and one is longer than a block: each must still be
// judged whole, or a record turns into two malformed lines.
TEST_F(QueueScanTest, LongQueueIsJudgedLineByLine)
{
    std::string queue;
    while (queue.size() < 400 * 1024) {
        queue += Event("/d/" + std::to_string(queue.size()));
    }
    queue += "{\"event\":1,\"path\":\"" + SharePath("photo") + "/a/" + std::string(300 * 1024, 'x') + "\"}\n";
    queue += "{\"event\":1,\n";
    queue += R"({"event":6.5536e4,"path":")" + SharePath("photo") + R"(\/caf\u00e9"})" "\n";
    queue += Event("/caf\xe9/p.jpg") + Event("/d/last");
    WriteFile(m_queue, queue);

    EXPECT_TRUE(HasQueuedReindexEvent(SharePath("photo") + "/caf\xc3\xa9", m_queue));
    EXPECT_FALSE(HasQueuedReindexEvent(SharePath("photo") + "/caf\xe9", m_queue));
    EXPECT_TRUE(LogCapture::Lines().empty());
    const struct {
        const char *folder;
        const char *word;
        size_t malformed;  // lines logged before the folder's first event
    } cases[] = {{"/photo/a", "processing", 0}, {"/photo/caf\xe9", "processing", 1}, {"/photo/b", "finished", 1}};
    for (const auto &c : cases) {
        LogCapture::Clear();
        EXPECT_EQ(StatusMgr::GetFolderStatus(c.folder), c.word) << c.folder;
        EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>(c.malformed, "Malformed command: {\"event\":1,"))
            << c.folder;
    }
}

// The listing asks about each share, reads each queue file and status.conf once for its whole page;
// each folder's "status" and "is_valid", the lines logged for it (in the listing's order) and the
// error code left must still be what asking for that folder alone gives, whatever the shares, the
// queues and the status file hold.
TEST_F(QueueScanTest, ListingAnswersForEachFolderWhatItsOwnCallsAnswer)
{
    DeclareShares("volume1/photo volume1/music volume1/ro+read_only");
    for (const char *folder : {"/music/m", "/ro/r", "/photo/mnt"}) {
        stdfs::create_directories(HostPath("/volume1" + std::string(folder)));
    }
    stdfs::create_directories(MetadataDirPath(SharePath("music")));
    WriteFile(StoragePath(SharePath("music"), kQueueFileName),
              "{\n{\"event\":1,\"path\":\"" + SharePath("music") + "/m/x\"}\n");
    WriteFile(QueueCompanionPath(m_queue), "not json\n" + Event("/c/x"));
    SetFaults(ParseJson(R"({"VEXOFSDirIsMntPoint": {"match": ")" + SharePath("photo") + R"(/mnt", "result": 1}})"));
    // b has events, e and /gone have no directory, /gone no share, /ro a read-only share.
    WriteFile(FILEINDEX_FOLDER_CONF_PATH, R"({"/photo/a":{},"/photo/b":{},"/photo/c":{},"/photo/d":{},"/photo/e":{},
        "/photo/mnt":{},"/photo/#recycle/x":{},"/photo/#snapshot/GMT+00-2024/y":{},"/music/m":{},"/ro/r":{},
        "/gone/x":{}})");
    const std::string manyMalformed = [] {
        std::string lines;
        while (lines.size() <= 1024 * 1024) {
            lines += "{\"half\":\"" + std::string(1000, 'x') + "\n";
        }
        return lines;
    }();
    const struct {
        const char *status;  // status.conf, null for none
        std::string queue;   // photo's queue, replaced between two listings
    } cases[] = {
        {nullptr, "[1]\n" + Event("/b/x") + "{\"event\":1,\n" + Event("/a/y", 256) + Event("/d", 65536) + "{}\n"},
        {R"({"resume_time":0})", Event("/e/z") + "{\"event\":\n"},
        {R"({"no_space":{"music":true},"resume_time":"abc"})", manyMalformed + Event("/a/x") + "{\n"},
        {"[]", Event("/b")},
    };
    std::set<std::string> words;
    for (const auto &c : cases) {
        SCOPED_TRACE(c.status == nullptr ? "no status.conf" : c.status);
        stdfs::remove(FILEINDEX_STATUS_CONF_PATH);
        if (c.status != nullptr) {
            WriteFile(FILEINDEX_STATUS_CONF_PATH, c.status);
        }
        const std::string replacement = m_queue + ".new";
        WriteFile(replacement, c.queue);
        ASSERT_EQ(rename(replacement.c_str(), m_queue.c_str()), 0);

        LogCapture::Clear();
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
        Json::Value page;
        ASSERT_TRUE(IndexMgr::List(page, 0, 20, "path", "", ParseJson(R"(["status", "is_valid"])")));
        const std::vector<std::string> listed = LogCapture::Messages();
        const _tag_fileindex_err_ listedError = ErrorHandler::GetError();

        LogCapture::Clear();
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
        ASSERT_EQ(page["folder"].size(), 11u);
        for (const Json::Value &record : page["folder"]) {
            const std::string path = record["path"].asString();
            const std::string word = StatusMgr::GetFolderStatus(path);
            EXPECT_EQ(record["additional"], ParseJson(R"({"status": ")" + word + R"(", "is_valid": )" +
                                                      (CanPathBeIndexed(path) ? "true}" : "false}")))
                << path;
            words.insert(word);
        }
        EXPECT_EQ(listed, LogCapture::Messages());
        EXPECT_EQ(listedError, ErrorHandler::GetError());
    }
    EXPECT_EQ(words, (std::set<std::string>{"finished", "processing", "paused", "err_no_space"}));
}

}  // namespace
}  // namespace fileindex_test
