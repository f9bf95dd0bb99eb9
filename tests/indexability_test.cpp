// What may be indexed: the refusal rules for folders, in their order and with their log lines, and
// the entries the crawler skips.
#include <unistd.h>

#include "fileindex/error.h"
#include "fileindex/utils.h"
#include "platform/fs.h"
#include "tests/support/log_capture.h"
#include "tests/support/sandbox.h"

using namespace VEXO::FILEINDEX;

namespace fileindex_test {
namespace {

// "<root>" in a text stands for the sandbox root.
std::string Expand(std::string text)
{
    for (size_t at; (at = text.find("<root>")) != std::string::npos;) {
        text.replace(at, 6, FILEINDEX_ROOT_DIR);
    }
    return text;
}

class IndexabilityTest : public SandboxTest {
protected:
    void SetUp() override
    {
        SandboxTest::SetUp();
        DeclareShares("volume1/photo volume1/vault+uses_encryption volume1/locked+encrypted volume1/ro+read_only "
                      "volume1/Surveillance volume1/NetBackup");
        for (const char *dir : {"/a", "/#recycle/a", "/#snapshot/s"}) {
            stdfs::create_directories(SharePath("photo") + dir);
        }
        ASSERT_EQ(symlink((SharePath("photo") + "/a").c_str(), (SharePath("photo") + "/link").c_str()), 0);
    }
};

TEST_F(IndexabilityTest, FirstRefusalDecidesWithItsLogLineOrSilence)
{
    const char *kMountA = R"({"VEXOFSDirIsMntPoint": {"match": "<root>/volume1/photo/a", "result": 1})";
    const struct {
        std::string faults;
        const char *path;  // full path below the root, or share-relative when relative
        bool relative;
        bool allowed;
        std::vector<std::string> messages;
        _tag_fileindex_err_ error;
    } cases[] = {
        {"{}", "/volume1/photo/a", false, true, {}, FILEIDX_ERR_NONE},
        {"{}", "/volume1/photo/a/", false, false, {"check realpath failed, path=<root>/volume1/photo/a/"}, FILEIDX_ERR_NONE},
        {"{}", "/volume1/photo//a", false, false, {"check realpath failed, path=<root>/volume1/photo//a"}, FILEIDX_ERR_NONE},
        {"{}", "/volume1/photo/a/../a", false, false, {"check realpath failed, path=<root>/volume1/photo/a/../a"}, FILEIDX_ERR_NONE},
        {"{}", "/volume1/photo/link", false, false, {"check realpath failed, path=<root>/volume1/photo/link"}, FILEIDX_ERR_NONE},
        // Refused before the doubled "/" could be noticed.
        {"{}", "/volume1/photo/#recycle//a", false, false, {}, FILEIDX_ERR_NONE},
        {"{}", "/volume1/photo/#snapshot//s", false, false, {}, FILEIDX_ERR_NONE},
        {"{}", "/volume1/photo/missing", false, false, {}, FILEIDX_ERR_NONE},  // type unknown
        {R"({"VEXOGetFSType": {"match": "<root>/volume1/photo/a", "result": 8}})", "/volume1/photo/a", false, false, {}, FILEIDX_ERR_NONE},
        {R"({"VEXOGetFSType": {"match": "<root>/volume1/photo/a", "result": 11}})", "/volume1/photo/a", false, false, {}, FILEIDX_ERR_NONE},
        {R"({"VEXOGetFSType": {"match": "<root>/volume1/photo/a", "result": 12}})", "/volume1/photo/a", false, false, {}, FILEIDX_ERR_NONE},
        {"{}", "/volume1", false, false,
         {"VEXOShareNamePathGet failed, path=<root>/volume1", "GetShareNamePathByFullPath failed, path=<root>/volume1"},
         FILEIDX_ERR_PATH},
        {R"({"VEXOShareGet": {"match": "photo", "result": -1}})", "/volume1/photo/a", false, false,
         {"VEXOShareGet failed, share=photo"}, FILEIDX_ERR_NONE},
        {"{}", "/volume1/locked", false, false, {}, FILEIDX_ERR_NONE},
        {"{}", "/volume1/ro", false, false, {}, FILEIDX_ERR_NONE},
        {"{}", "/volume1/NetBackup", false, false, {}, FILEIDX_ERR_NONE},
        {"{}", "/volume1/Surveillance", false, true, {}, FILEIDX_ERR_NONE},  // only "surveillance" is excluded
        {R"({"VLIBShareIsReadOnlyGet": {"result": -1}})", "/volume1/photo/a", false, false, {}, FILEIDX_ERR_NONE},
        {std::string(kMountA) + "}", "/volume1/photo/a", false, false,
         {"Mount point[<root>/volume1/photo/a] is not allowed to be indexed"}, FILEIDX_ERR_NONE},
        {std::string(kMountA) + R"(, "VLIBShareIsEncryptionGet": {"result": -1}})", "/volume1/photo/a", false, true, {},
         FILEIDX_ERR_NONE},
        {R"({"VEXOFSDirIsMntPoint": {"result": 1}})", "/volume1/vault", false, true, {}, FILEIDX_ERR_NONE},
        {"{}", "/photo/a", true, true, {}, FILEIDX_ERR_NONE},
        {"{}", "/ro", true, false, {}, FILEIDX_ERR_NONE},
        {"{}", "/nosuch/a", true, false, {"GetFullPath failed, path=/nosuch/a"}, FILEIDX_ERR_PATH},
    };
    for (const auto &c : cases) {
        SetFaults(ParseJson(Expand(c.faults)));
        LogCapture::Clear();
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
        const bool allowed = c.relative ? CanPathBeIndexed(c.path) : CanFullPathBeIndexed(HostPath(c.path));
        std::vector<std::string> expected;
        for (const std::string &message : c.messages) {
            expected.push_back(Expand(message));
        }
        EXPECT_EQ(allowed, c.allowed) << c.path << " " << c.faults;
        EXPECT_EQ(LogCapture::Messages(), expected) << c.path << " " << c.faults;
        EXPECT_EQ(ErrorHandler::GetError(), c.error) << c.path << " " << c.faults;
    }
    EXPECT_FALSE(CanShareBeIndexed(nullptr));
}

TEST_F(IndexabilityTest, CrawlerSkipsReservedNamesAndForeignFileSystemsButKeepsAnUnknownType)
{
    const struct {
        const char *faults;
        std::string path;
        bool skip;
    } cases[] = {
        {"{}", "no-slash", true},
        {"{}", HostPath("/volume1/photo/a"), false},
        {"{}", HostPath("/volume1/photo/.TemporaryItems"), true},
        {"{}", HostPath("/volume1/photo/.TemporaryItems/a"), false},  // only the last component counts
        {"{}", HostPath("/volume1/photo/.ds_store"), false},
        {"{}", HostPath("/volume1/photo/#recycle/a"), true},
        {"{}", HostPath("/volume1/photo/#snapshot/s"), true},
        {"{}", HostPath("/volume1/photo/missing"), false},  // type unknown: kept
        {R"({"VEXOGetFSType": {"result": 12}})", HostPath("/volume1/photo/a"), true},
    };
    for (const auto &c : cases) {
        SetFaults(ParseJson(c.faults));
        EXPECT_EQ(IsSkipIndex(c.path), c.skip) << c.path << " " << c.faults;
    }
    EXPECT_TRUE(LogCapture::Lines().empty());
    for (const char *name : {".TemporaryItems", "VEXO@.fileindexdb", "VEXO@file_index_queue", ".VEXOPPSDB", ".DS_Store", "@eaDir"}) {
        EXPECT_TRUE(IsSystemPreservedFileName(name)) << name;
    }

    // The type is asked for even when the name alone decides: the forced answer waits for one call.
    SetFaults(ParseJson(R"({"VEXOGetFSType": {"match": "no-slash", "after": 1, "result": 8}})"));
    EXPECT_TRUE(IsSkipIndex("no-slash"));
    EXPECT_EQ(VEXOGetFSType("no-slash", 0), 8);
}

}  // namespace
}  // namespace fileindex_test
