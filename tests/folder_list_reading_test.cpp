// The queries read folder.conf straight from its text: the same folders, paths resolved with the
// same log lines and error codes, as the folder list loaded through its JSON document, and always
// the file as it is now.
#include <tuple>

#include "config/json_io.h"
#include "fileindex/error.h"
#include "fileindex/index_mgr.h"
#include "tests/support/child.h"
#include "tests/support/log_capture.h"
#include "tests/support/sandbox.h"

using namespace VEXO::FILEINDEX;

namespace fileindex_test {
namespace {

class FolderListReadingTest : public SandboxTest {
protected:
    void SetUp() override
    {
        SandboxTest::SetUp();
        DeclareShares("volume1/photo");
    }

    // What listing the folders shows: the result, every member of each folder, the log lines and
    // the error code.
    using Outcome = std::tuple<bool, std::vector<std::vector<std::string>>, std::vector<std::string>, int>;

    static Outcome Observe(const std::function<bool(std::vector<Folder> &)> &list)
    {
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
        LogCapture::Clear();
        std::vector<Folder> folders;
        const bool listed = list(folders);
        std::vector<std::vector<std::string>> members;
        for (const Folder &f : folders) {
            members.push_back({f.m_path, f.m_fullPath, f.m_name, std::to_string(f.m_bDocument), std::to_string(f.m_bAudio),
                               std::to_string(f.m_bVideo), std::to_string(f.m_bPhoto)});
        }
        return {listed, members, LogCapture::Messages(), ErrorHandler::GetError()};
    }
};

TEST_F(FolderListReadingTest, TextReaderListsWhatTheFolderListLoads)
{
    const struct {
        std::string text;  // folder.conf, none when empty
        size_t folders;    // -1: listing fails
    } cases[] = {
        {"", 0},
        {"{}", 0},
        {R"({"/photo/a":{"path":"/photo/a","name":"A","document":true,"audio":false,"video":true,"photo":false}})", 1},
        {R"({"/photo/caf\u00e9":{"name":"say \"hi\" \/ \\","photo":true},"/photo/b\u0000":{}})", 2},
        {R"({"/photo/\ud83d\ude00":{},"/photo/a":{}})", 2},
        {"{\"/photo/caf\xe9\":{\"name\":\"\xff\"}}", 1},
        {R"({"/photo/a":{"name":"first","audio":true},"/photo/a":{"video":true}})", 1},
        {R"({"/photo/a":{"name":"x","name":5,"audio":true,"audio":"yes","photo":1,"photo":true}})", 1},
        {R"({"/photo/a":"text","/photo/b":[{"name":"n"}],"/photo/c":null})", 3},
        {R"({"/zz/a":{},"":{},"/photo/b":{"size":65536},"/zz/b":{},"/photo/a":{}})", 5},
        {R"({"/photo/a":{"size":6.5536e4}})", 1},
        {R"({"/photo/a":{"size":1e400}})", static_cast<size_t>(-1)},
        {R"([{"/photo/a":{}}])", static_cast<size_t>(-1)},
        {R"({"/photo/a":{})", static_cast<size_t>(-1)},
    };
    for (const auto &c : cases) {
        stdfs::remove(FILEINDEX_FOLDER_CONF_PATH);
        if (!c.text.empty()) {
            WriteFile(FILEINDEX_FOLDER_CONF_PATH, c.text);
        }
        const Outcome throughDocument = Observe([](std::vector<Folder> &out) {
            Folders folders;
            return folders.Load() && folders.List(out);
        });
        const Outcome fromText = Observe([](std::vector<Folder> &out) { return IndexMgr::List(out); });
        EXPECT_EQ(fromText, throughDocument) << c.text;
        EXPECT_EQ(std::get<0>(fromText) ? std::get<1>(fromText).size() : static_cast<size_t>(-1), c.folders) << c.text;
    }
}

// An upsert's report compares the new setting with the one that governed the path before; a folder
// whose share was unknown when the list was loaded is asked for again then, and logged if still
// unknown, before it is passed over.
TEST_F(FolderListReadingTest, FolderUnresolvedAtLoadIsAskedForAgainWhenAnUpsertIsJudged)
{
    const struct {
        bool shareAppears;
        const char *path;   // of the setting added, with photo true
        bool photoChanges;  // in its report
        std::vector<std::string> messages;
    } cases[] = {
        {true, "/later/a/b", false, {}},
        {false, "/photo/x", true, {"Failed to get full path from /later/a"}},
    };
    for (const auto &c : cases) {
        SetUp();
        WriteFile(FILEINDEX_FOLDER_CONF_PATH, R"({"/later/a":{"photo":true}})");
        Folders folders;
        ASSERT_TRUE(folders.Load());
        DeclareShares(c.shareAppears ? "volume1/photo volume1/later" : "volume1/photo volume1/other");
        Json::Value setting = ParseJson(R"({"photo":true})");
        setting["path"] = c.path;
        Json::Value report;
        LogCapture::Clear();
        ASSERT_TRUE(folders.Upsert(report, setting)) << c.path;
        EXPECT_EQ(report["photo"].asBool(), c.photoChanges) << c.path;
        EXPECT_EQ(LogCapture::Messages(), c.messages) << c.path;
    }
}

// Another process saves a list of the same size, most likely within the same clock tick: the very
// next query answers from it.
TEST_F(FolderListReadingTest, SaveByAnotherProcessIsSeenByTheNextQuery)
{
    WriteFile(FILEINDEX_FOLDER_CONF_PATH, R"({"/photo/a":{"path":"/photo/a"}})");
    EXPECT_TRUE(IndexMgr::IsPathIndexed("/photo/a/x"));
    Child saver([](const Child::Ready &) {
        _exit(toFile(ParseJson(R"({"/photo/b":{"path":"/photo/b"}})"), FILEINDEX_FOLDER_CONF_PATH) ? 0 : 1);
    });
    EXPECT_EQ(saver.Wait(), 0);
    EXPECT_FALSE(IndexMgr::IsPathIndexed("/photo/a/x"));
    EXPECT_TRUE(IndexMgr::IsPathContainIndexed("/photo"));
    EXPECT_TRUE(IndexMgr::IsFullPathIndexed(SharePath("photo") + "/b"));
}

}  // namespace
}  // namespace fileindex_test
