// The paged folder listing: sort orders, pages and the computed "additional" information.
#include "fileindex/error.h"
#include "fileindex/index_mgr.h"
#include "tests/support/log_capture.h"
#include "tests/support/sandbox.h"

using namespace VEXO::FILEINDEX;

namespace fileindex_test {
namespace {

class FolderListingTest : public SandboxTest {
protected:
    void SetUp() override
    {
        SandboxTest::SetUp();
        DeclareShares("volume1/photo volume1/ro+read_only");
        stdfs::create_directories(SharePath("ro") + "/r");
        // Byte order of the paths: Beta, Dog, alpha, cat, eel; ignoring case: alpha, Beta, cat, Dog, eel.
        // Names ignoring case: Alpha (alpha), bravo (Dog), charlie (cat), delta (Beta), Echo (eel).
        WriteFile(FILEINDEX_FOLDER_CONF_PATH, R"({
            "/photo/Beta": {"name": "delta", "document": true, "audio": true},
            "/photo/alpha": {"name": "Alpha", "video": true, "photo": true},
            "/photo/cat": {"name": "charlie", "audio": true, "photo": true},
            "/photo/Dog": {"name": "bravo", "document": true},
            "/photo/eel": {"name": "Echo", "photo": true}})");
    }
};

TEST_F(FolderListingTest, PagesFollowTheSortKeyAndDescendingIgnoresTheOffset)
{
    const struct {
        unsigned long offset;
        unsigned long limit;
        const char *sortBy;
        const char *direction;
        const char *page;  // last path components, in page order
    } cases[] = {
        {0, 10, "path", "", "alpha Beta cat Dog eel"},
        {0, 10, "Name", "", "alpha Beta cat Dog eel"},  // an unknown key sorts by path
        {2, 2, "name", "ASC", "cat Beta"},
        {2, 2, "name", "DESC", "Dog alpha"},  // the first two ascending, reversed
        {0, 10, "name", "DESC", "eel Beta cat Dog alpha"},
        {0, 10, "name", "desc", "alpha Dog cat Beta eel"},  // only "DESC" reverses
        {4, 10, "name", "", "eel"},
        {0, 0, "name", "", ""},
        {5, 10, "name", "", ""},
        {7, 10, "name", "DESC", ""},
        // Flags: false before true; folders the flag does not tell apart stay in byte order.
        {0, 10, "document", "", "alpha cat eel Beta Dog"},
        {0, 10, "audio", "", "Dog alpha eel Beta cat"},
        {0, 10, "video", "", "Beta Dog cat eel alpha"},
        {0, 10, "photo", "", "Beta Dog alpha cat eel"},
        {0, 10, "photo", "DESC", "eel cat alpha Dog Beta"},
    };
    for (const auto &c : cases) {
        Json::Value out;
        ASSERT_TRUE(IndexMgr::List(out, c.offset, c.limit, c.sortBy, c.direction, Json::Value(Json::arrayValue)));
        std::string page;
        for (const Json::Value &record : out["folder"]) {
            page += (page.empty() ? "" : " ") + record["path"].asString().substr(7);
            EXPECT_EQ(record["additional"], Json::Value(Json::objectValue));
        }
        EXPECT_EQ(page, c.page) << c.offset << " " << c.limit << " " << c.sortBy << " " << c.direction;
        EXPECT_EQ(out["total"], 5u);
        EXPECT_EQ(out["offset"], Json::UInt64(c.offset));
    }
    EXPECT_TRUE(LogCapture::Lines().empty());
}

TEST_F(FolderListingTest, UnknownAdditionalKeyBecomesNullWhileABadKeyListEmptiesAdditional)
{
    const struct {
        const char *keys;
        const char *additional;
        std::vector<std::string> messages;
    } cases[] = {
        {R"(["status", "bogus", "is_valid"])", R"({"status": "paused", "bogus": null, "is_valid": false})",
         {"Unknown additional: bogus", "Failed to get additional: bogus"}},
        {R"("status")", "{}", {R"(Bad param: "status")", "GetAdditional failed"}},
        {R"(["is_valid", 5, "status"])", R"({"is_valid": false})", {"Bad param: 5", "GetAdditional failed"}},
    };
    WriteFile(FILEINDEX_FOLDER_CONF_PATH, R"({"/photo/alpha": {}, "/ro/r": {"name": "r", "audio": true}})");
    for (const auto &c : cases) {
        LogCapture::Clear();
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
        Json::Value out;
        ASSERT_TRUE(IndexMgr::List(out, 1, 1, "path", "", ParseJson(c.keys)));
        Json::Value expected = ParseJson(R"({"path": "/ro/r", "name": "r", "document": false, "audio": true,
                                             "video": false, "photo": false})");
        expected["additional"] = ParseJson(c.additional);
        ASSERT_EQ(out["folder"].size(), 1u);
        EXPECT_EQ(out["folder"][0], expected) << c.keys;
        EXPECT_EQ(LogCapture::Messages(), c.messages) << c.keys;
        EXPECT_EQ(ErrorHandler::GetError(), FILEIDX_ERR_BAD_PARAM) << c.keys;
    }
}

}  // namespace
}  // namespace fileindex_test
