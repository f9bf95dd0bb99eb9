// Whether a path, a full path or a share is covered by the indexed folders, through IndexMgr and
// through the flat entry points.
#include "fileindex/error.h"
#include "fileindex/fileidx.h"
#include "fileindex/index_mgr.h"
#include "tests/support/log_capture.h"
#include "tests/support/sandbox.h"

using namespace VEXO::FILEINDEX;

namespace fileindex_test {
namespace {

class QueriesTest : public SandboxTest {
protected:
    void SetUp() override
    {
        SandboxTest::SetUp();
        DeclareShares("volume1/photo volume1/video volume1/video2");
    }

    static std::vector<Folder> FoldersAt(std::initializer_list<const char *> paths)
    {
        std::vector<Folder> folders;
        for (const char *path : paths) {
            Folder folder;
            folder.Load(path, Json::Value(Json::objectValue));
            folders.push_back(folder);
        }
        return folders;
    }
};

TEST_F(QueriesTest, ComponentRuleDecidesWhatIsInsideAFolder)
{
    const std::vector<Folder> photo = FoldersAt({"/photo"});
    const std::vector<Folder> photoA = FoldersAt({"/photo/a"});
    const struct {
        const char *path;
        bool indexed;          // with folder /photo; also as a full path
        bool containsIndexed;  // with folder /photo/a
    } cases[] = {
        {"/photo", true, true},
        {"/photo/a", true, true},
        {"/photo/a/b", true, false},
        {"/photo/ab", true, false},
        {"/photo/", true, false},
        {"/photo2", false, false},
        {"/pho", false, false},
        {"/Photo", false, false},
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

TEST_F(QueriesTest, QueriesReadTheFolderListAfreshAtEveryCall)
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

TEST_F(QueriesTest, ShareIsIndexedByExactNameAndUnnamedFoldersArePassedOver)
{
    WriteFile(FILEINDEX_FOLDER_CONF_PATH, R"({"":{},"/video2/a":{}})");
    EXPECT_FALSE(IndexMgr::IsShareIndexed("video"));
    EXPECT_EQ(LogCapture::Messages().back(), "Failed to get share name from path: ");
    EXPECT_TRUE(IndexMgr::IsShareIndexed("video2"));
    EXPECT_EQ(FILEIDXIsShareIndexed("video2"), 1);
    EXPECT_EQ(FILEIDXIsShareIndexed("Video2"), 0);
    EXPECT_EQ(FILEIDXIsShareIndexed("photo"), 0);
}

}  // namespace
}  // namespace fileindex_test
