// Conversions between share-relative and full paths, and the small helpers the library leans on.
#include <syslog.h>
#include <unistd.h>

#include "fileindex/error.h"
#include "fileindex/utils.h"
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

class ShareResolutionTest : public SandboxTest {
protected:
    void SetUp() override
    {
        SandboxTest::SetUp();
        DeclareShares("volume1/photo volume2/music");
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
    }
};

TEST_F(ShareResolutionTest, FullPathIsTheShareVolumeFollowedByThePathAsGiven)
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

TEST_F(ShareResolutionTest, ShareOfAFullPathFollowsWholeComponents)
{
    std::string share;
    std::string sharePath;
    ASSERT_TRUE(GetShareNamePathByFullPath(share, sharePath, HostPath("/volume1/photo/a/b")));
    EXPECT_EQ(share + " " + sharePath, "photo " + SharePath("photo"));

    const std::string sibling = HostPath("/volume1/photo2/a");
    EXPECT_FALSE(GetShareNamePathByFullPath(share, sharePath, sibling));
    EXPECT_EQ(share + " " + sharePath, "photo " + SharePath("photo")) << "untouched";
    EXPECT_EQ(ErrorHandler::GetError(), FILEIDX_ERR_PATH);
    EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>{"VEXOShareNamePathGet failed, path=" + sibling});
}

TEST_F(ShareResolutionTest, ExistenceTestsDoNotFollowSymbolicLinks)
{
    const std::string dir = SharePath("photo");
    const std::string file = dir + "/file";
    WriteFile(file, "x");
    ASSERT_EQ(symlink(dir.c_str(), (dir + "/dirlink").c_str()), 0);
    ASSERT_EQ(symlink(file.c_str(), (dir + "/filelink").c_str()), 0);

    EXPECT_TRUE(IsDirExist(dir));
    EXPECT_FALSE(IsDirExist(file));
    EXPECT_FALSE(IsDirExist(dir + "/dirlink"));
    EXPECT_TRUE(IsFileExist(file));
    EXPECT_FALSE(IsFileExist(dir));
    EXPECT_FALSE(IsFileExist(dir + "/filelink"));
    EXPECT_FALSE(IsFileExist(dir + "/missing"));
}

}  // namespace
}  // namespace fileindex_test
