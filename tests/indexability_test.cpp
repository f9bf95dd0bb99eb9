// What may be indexed: the refusal rules for folders, in their order and with their log lines, and
// the entries the crawler skips.
#include <unistd.h>

#include "fileindex/error.h"
#include "fileindex/utils.h"
#include "platform/fs.h"
#include "tests/support/log_capture.h"
#include "tests/support/sandbox.h"

using namespace VEXO::FILEINDEX;
using R = IndexRefusal;

namespace fileindex_test {
namespace {

// text with every "%s" replaced by path.
std::string Fill(std::string text, const std::string &path)
{
    for (size_t at; (at = text.find("%s")) != std::string::npos;) {
        text.replace(at, 2, path);
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
    const char *kMount = R"({"VEXOFSDirIsMntPoint": {"match": "%s", "result": 1})";
    const char *kRealpath = "check realpath failed, path=%s";
    const struct {
        std::string faults;  // "%s" stands for the path passed, in faults and log
        const char *path;    // below the sandbox root, or share-relative when relative
        bool relative;
        IndexRefusal refusal;
        const char *log;  // the messages, one per line; "" for none
        bool pathError;   // error 2 (FILEIDX_ERR_PATH) set
    } cases[] = {
        {"{}", "/volume1/photo/a", false, R::kNone, "", false},
        {"{}", "/volume1/photo/a/", false, R::kNotCanonical, kRealpath, false},
        {"{}", "/volume1/photo//a", false, R::kNotCanonical, kRealpath, false},
        {"{}", "/volume1/photo/a/../a", false, R::kNotCanonical, kRealpath, false},
        {"{}", "/volume1/photo/link", false, R::kNotCanonical, kRealpath, false},
        {"{}", "/volume1/photo/#recycle//a", false, R::kRecycleBin, "", false},  // refused before the doubled "/" counts
        {"{}", "/volume1/photo/#snapshot//s", false, R::kSnapshot, "", false},
        {"{}", "/volume1/photo/missing", false, R::kUnknownFileSystem, "", false},  // type unknown
        {R"({"VEXOGetFSType": {"match": "%s", "result": 8}})", "/volume1/photo/a", false, R::kRemoteFileSystem, "", false},
        {R"({"VEXOGetFSType": {"match": "%s", "result": 11}})", "/volume1/photo/a", false, R::kImageFileSystem, "", false},
        {R"({"VEXOGetFSType": {"match": "%s", "result": 12}})", "/volume1/photo/a", false, R::kFileSystemType12, "", false},
        {"{}", "/volume1", false, R::kNoShare,
         "VEXOShareNamePathGet failed, path=%s\nGetShareNamePathByFullPath failed, path=%s", true},
        {R"({"VEXOShareGet": {"match": "photo", "result": -1}})", "/volume1/photo/a", false, R::kShareLookupFailed,
         "VEXOShareGet failed, share=photo", false},
        {"{}", "/volume1/locked", false, R::kEncryptedShare, "", false},
        {"{}", "/volume1/ro", false, R::kReadOnlyShare, "", false},
        {"{}", "/volume1/NetBackup", false, R::kExcludedShare, "", false},
        {"{}", "/volume1/Surveillance", false, R::kNone, "", false},  // only "surveillance" is excluded
        {R"({"VLIBShareIsReadOnlyGet": {"result": -1}})", "/volume1/photo/a", false, R::kShareStateUnreadable, "", false},
        {std::string(kMount) + "}", "/volume1/photo/a", false, R::kMountPoint, "Mount point[%s] is not allowed to be indexed", false},
        {std::string(kMount) + R"(, "VLIBShareIsEncryptionGet": {"result": -1}})", "/volume1/photo/a", false, R::kNone, "", false},
        {std::string(kMount) + "}", "/volume1/vault", false, R::kNone, "", false},
        {"{}", "/photo/a", true, R::kNone, "", false},
        {"{}", "/ro", true, R::kReadOnlyShare, "", false},
        {"{}", "/nosuch/a", true, R::kPathUnresolved, "GetFullPath failed, path=%s", true},
    };
    for (const auto &c : cases) {
        const std::string path = c.relative ? c.path : HostPath(c.path);
        SetFaults(ParseJson(Fill(c.faults, path)));
        LogCapture::Clear();
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
        const std::string row = path + " " + c.faults + " " + IndexRefusalName(c.refusal);
        EXPECT_EQ(c.relative ? CanPathBeIndexed(path) : CanFullPathBeIndexed(path), c.refusal == R::kNone) << row;
        std::string log;
        for (const std::string &message : LogCapture::Messages()) {
            log += (log.empty() ? "" : "\n") + message;
        }
        EXPECT_EQ(log, Fill(c.log, path)) << path << c.faults;
        EXPECT_EQ(ErrorHandler::GetError(), c.pathError ? FILEIDX_ERR_PATH : FILEIDX_ERR_NONE) << path << c.faults;
        // The reason comes from the same rules: the same answer, from the same platform answers.
        const IndexRefusal refusal = c.relative ? GetPathIndexRefusal(path) : GetFullPathIndexRefusal(path);
        EXPECT_STREQ(IndexRefusalName(refusal), IndexRefusalName(c.refusal)) << row;
    }
    EXPECT_FALSE(CanShareBeIndexed(nullptr));
}

TEST_F(IndexabilityTest, CrawlerSkipsReservedNamesAndForeignFileSystemsButKeepsAnUnknownType)
{
    const struct {
        const char *faults;
        std::string path;
        IndexRefusal refusal;
    } cases[] = {
        {"{}", "no-slash", R::kNoDirectory},
        {"{}", HostPath("/volume1/photo/a"), R::kNone},
        {"{}", HostPath("/volume1/photo/.TemporaryItems"), R::kReservedName},
        {"{}", HostPath("/volume1/photo/.TemporaryItems/a"), R::kNone},  // only the last component counts
        {"{}", HostPath("/volume1/photo/.ds_store"), R::kNone},
        {"{}", HostPath("/volume1/photo/#recycle/a"), R::kRecycleBin},
        {"{}", HostPath("/volume1/photo/#snapshot/s"), R::kSnapshot},
        {"{}", HostPath("/volume1/photo/missing"), R::kNone},  // type unknown: kept
        {R"({"VEXOGetFSType": {"result": 12}})", HostPath("/volume1/photo/a"), R::kFileSystemType12},
    };
    for (const auto &c : cases) {
        SetFaults(ParseJson(c.faults));
        EXPECT_EQ(IsSkipIndex(c.path), c.refusal != R::kNone) << c.path << " " << c.faults;
        EXPECT_STREQ(IndexRefusalName(GetSkipIndexRefusal(c.path)), IndexRefusalName(c.refusal)) << c.path;
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
