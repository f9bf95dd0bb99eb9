// The folder list: loading, merging settings with their change reports, removing, listing, the
// locked lookup of IndexMgr, and the paged listing with its sort orders and computed information.
#include <memory>

#include "fileindex/error.h"
#include "fileindex/fileidx.h"
#include "fileindex/folder.h"
#include "fileindex/index_mgr.h"
#include "folder/change_report.h"
#include "tests/support/child.h"
#include "tests/support/log_capture.h"
#include "tests/support/sandbox.h"

using namespace VEXO::FILEINDEX;

namespace fileindex_test {
namespace {

const std::string kFolderConf = FILEINDEX_FOLDER_CONF_PATH;

Json::Value Report(bool document, bool audio, bool video, bool photo)
{
    Json::Value report;
    report["document"] = document;
    report["audio"] = audio;
    report["video"] = video;
    report["photo"] = photo;
    return report;
}

Folder MakeFolder(const std::string &path, const std::string &record = "{}")
{
    Folder folder;
    folder.Load(path, ParseJson(record));
    return folder;
}

class FoldersTest : public SandboxTest {
protected:
    void SetUp() override
    {
        SandboxTest::SetUp();
        DeclareShares("volume1/photo volume1/video volume1/video2 volume2/music volume1/ro+read_only");
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
    }

    // Upserts into a fresh list loaded from disk and saves, as a writer would.
    static void UpsertAndSave(const std::string &request)
    {
        Folders folders;
        ASSERT_TRUE(folders.Load());
        Json::Value report;
        ASSERT_TRUE(folders.Upsert(report, ParseJson(request)));
        ASSERT_TRUE(folders.Save());
    }

    static Json::Value StoredDocument() { return ParseJson(ReadFile(kFolderConf)); }
};

// Load merges a record's well-typed members into what the folder holds and Reload starts from the
// defaults. The full path is resolved at load; a folder whose share was not found logs when asked.
TEST_F(FoldersTest, RecordLoadMergesWellTypedMembersAndReloadStartsFromDefaults)
{
    Folder folder = MakeFolder("/photo/a", R"({"name":"a","video":true})");
    EXPECT_TRUE(folder.Load("/photo/a", ParseJson(R"({"path":"/ignored","name":5,"audio":true,"photo":1})")));
    EXPECT_EQ(folder.asJson(),
              ParseJson(R"({"path":"/photo/a","name":"a","document":false,"audio":true,"video":true,"photo":false})"));
    EXPECT_TRUE(folder.Reload("/photo/a", Json::Value(Json::objectValue)));
    EXPECT_EQ(folder.asJson(),
              ParseJson(R"({"path":"/photo/a","name":"","document":false,"audio":false,"video":false,"photo":false})"));
    EXPECT_FALSE(folder.Reload("/gone/a", Json::Value(Json::objectValue)));

    SetFaults(ParseJson(R"({"VEXOShareGet": {"result": -1}})"));
    EXPECT_EQ(MakeFolder("/photo/b").GetFullPath(), "");
    EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>{"Failed to get full path from /photo/b"});
    EXPECT_EQ(folder.GetFullPath(), HostPath("/volume1/photo/a"));
    EXPECT_EQ(LogCapture::Messages().size(), 1u) << "a resolved folder asks nobody";
}

// A folder list that cannot be used fails the list with its code, and the queries answer no (0 from
// the flat functions, never a negative number).
TEST_F(FoldersTest, FolderListFileThatCannotBeUsedFailsWithItsCode)
{
    const struct {
        const char *content;
        _tag_fileindex_err_ code;
        std::string message;
    } cases[] = {
        {"[\"/photo\"]", FILEIDX_ERR_MALFORMED_CONFIG, "Malformed folders: [\"/photo\"]"},
        {"\"text\"", FILEIDX_ERR_MALFORMED_CONFIG, "Malformed folders: \"text\""},
        {"{\"/photo\":{\"name\":", FILEIDX_ERR_LOAD_CONFIG, "Failed to load json from " + kFolderConf},
        {"", FILEIDX_ERR_LOAD_CONFIG, "Failed to load json from " + kFolderConf},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.content);
        WriteFile(kFolderConf, c.content);
        LogCapture::Clear();
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
        std::vector<Folder> listed(1);
        EXPECT_FALSE(IndexMgr::List(listed));
        EXPECT_EQ(listed.size(), 1u) << "out is untouched on failure";
        EXPECT_EQ(ErrorHandler::GetError(), c.code);
        EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>{c.message});
        EXPECT_EQ(FILEIDXIsPathIndexed("/photo"), 0);
        EXPECT_EQ(FILEIDXIsFullPathIndexed(HostPath("/volume1/photo").c_str()), 0);
        EXPECT_EQ(FILEIDXIsShareIndexed("photo"), 0);
        EXPECT_FALSE(IndexMgr::IsPathContainIndexed("/"));
    }
}

// A record of the wrong type loads as the defaults, one whose share is gone still loads, and both are
// written back as full records; a second Load keeps the values of the first and adds new paths.
TEST_F(FoldersTest, OddRecordsLoadAndAreWrittenBackAsFullRecords)
{
    WriteFile(kFolderConf, R"({"/photo/str":"text","/gone/x":{"path":"/elsewhere","name":"x","audio":true,"extra":1}})");
    Folders folders;
    ASSERT_TRUE(folders.Load());
    WriteFile(kFolderConf, R"({"/photo/str":{"name":"second"},"/photo/b":{}})");
    ASSERT_TRUE(folders.Load());
    std::vector<Folder> listed;
    ASSERT_TRUE(folders.List(listed));
    ASSERT_EQ(listed.size(), 3u);
    EXPECT_EQ(listed[0].m_path + " " + listed[0].m_fullPath, "/gone/x ");
    ASSERT_TRUE(folders.Save());
    EXPECT_EQ(StoredDocument(), ParseJson(R"({
        "/gone/x":{"path":"/gone/x","name":"x","document":false,"audio":true,"video":false,"photo":false},
        "/photo/b":{"path":"/photo/b","name":"","document":false,"audio":false,"video":false,"photo":false},
        "/photo/str":{"path":"/photo/str","name":"","document":false,"audio":false,"video":false,"photo":false}})"));
}

// Steps into one list: a new path starts from defaults, a stored one keeps what the request leaves
// out or gives with the wrong type, and each report is taken against the setting that governed the
// path before.
TEST_F(FoldersTest, UpsertMergesIntoDefaultsOrTheStoredSettingAndReportsWhatChanged)
{
    const struct {
        const char *request;
        bool document, audio, video, photo;
    } steps[] = {
        {R"({"path":"/photo"})", true, true, true, true},  // nothing governed it
        {R"({"path":"/photo","photo":true,"video":true})", false, false, true, true},
        {R"({"path":"/photo/inner","photo":true,"audio":true})", false, true, true, false},  // against /photo
        {R"({"path":"/photo/a","name":"A","document":true,"audio":false})", true, false, true, true},
        {R"({"path":"/photo/a","audio":true,"video":"yes"})", false, true, false, false},
        {R"({"path":"/photo/a","audio":true})", false, false, false, false},
    };
    Folders folders;
    ASSERT_TRUE(folders.Load());
    for (const auto &step : steps) {
        Json::Value report;
        ASSERT_TRUE(folders.Upsert(report, ParseJson(step.request)));
        EXPECT_EQ(report, Report(step.document, step.audio, step.video, step.photo)) << step.request;
    }
    ASSERT_TRUE(folders.Save());
    EXPECT_EQ(StoredDocument(), ParseJson(R"({
        "/photo":{"path":"/photo","name":"","document":false,"audio":false,"video":true,"photo":true},
        "/photo/inner":{"path":"/photo/inner","name":"","document":false,"audio":true,"video":false,"photo":true},
        "/photo/a":{"path":"/photo/a","name":"A","document":true,"audio":true,"video":false,"photo":false}})"));
}

TEST_F(FoldersTest, UpsertRefusesARequestWithoutAResolvablePath)
{
    UpsertAndSave(R"({"path":"/photo/a"})");
    const std::string before = ReadFile(kFolderConf);
    const struct {
        const char *request;
        std::vector<std::string> messages;
    } cases[] = {
        {R"({"name":"no path"})", {R"(Bad param: {"name":"no path"})"}},
        {R"({"path":5})", {R"(Bad param: {"path":5})"}},
        {R"(["/photo/b"])", {R"(Bad param: ["/photo/b"])"}},
        {R"({"path":"/nosuch/b"})", {R"(Bad param: {"path":"/nosuch/b"})"}},
        {R"({"path":""})", {"GetShareNameByPath failed, path=", R"(Bad param: {"path":""})"}},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.request);
        LogCapture::Clear();
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
        Folders folders;
        ASSERT_TRUE(folders.Load());
        Json::Value report = "untouched";
        EXPECT_FALSE(folders.Upsert(report, ParseJson(c.request)));
        EXPECT_EQ(report, "untouched");
        EXPECT_EQ(ErrorHandler::GetError(), FILEIDX_ERR_BAD_PARAM);
        EXPECT_EQ(LogCapture::Messages(), c.messages);
        ASSERT_TRUE(folders.Save());
        EXPECT_EQ(ReadFile(kFolderConf), before) << "the table was changed";
    }
}

TEST_F(FoldersTest, TheThousandthFolderFitsAndTheNextOneDoesNot)
{
    Folders folders;
    ASSERT_TRUE(folders.Load());
    Json::Value report;
    for (int i = 0; i < 1000; ++i) {
        ASSERT_TRUE(folders.Upsert(report, ParseJson(R"({"path":"/photo/)" + std::to_string(i) + R"("})"))) << i;
    }
    ASSERT_TRUE(folders.Save());
    EXPECT_EQ(StoredDocument().size(), 1000u);

    LogCapture::Clear();
    EXPECT_FALSE(folders.Upsert(report, ParseJson(R"({"path":"/photo/new"})")));
    EXPECT_EQ(ErrorHandler::GetError(), FILEIDX_ERR_EXCEED_MAX_FOLDER);
    EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>{"Exceed max folder size"});
    std::vector<Folder> listed;
    folders.List(listed);
    EXPECT_EQ(listed.size(), 1001u) << "the refused record stays in memory; callers must not save";

    Folders reloaded;
    ASSERT_TRUE(reloaded.Load());
    EXPECT_TRUE(reloaded.Upsert(report, ParseJson(R"({"path":"/photo/999","audio":true})")))
        << "changing a stored folder of a full list is still allowed";
}

TEST_F(FoldersTest, DeleteReportsKeyedByPathAndErasesEvenWhenThePathNoLongerResolves)
{
    WriteFile(kFolderConf, R"({"/photo":{"photo":true},"/photo/a":{"photo":true,"audio":true},"/gone/x":{}})");
    Folders folders;
    ASSERT_TRUE(folders.Load());

    Json::Value report;
    ASSERT_TRUE(folders.Delete(report, "/photo/a"));
    Json::Value expected;
    expected["/photo/a"] = Report(false, true, false, false);  // /photo governs it afterwards
    EXPECT_EQ(report, expected);

    ASSERT_TRUE(folders.Delete(report, "/photo/not-listed"));
    expected = Json::Value();
    expected["/photo/not-listed"] = Report(false, false, false, false);
    EXPECT_EQ(report, expected);

    report = "untouched";
    ErrorHandler::SetError(FILEIDX_ERR_NONE);
    EXPECT_TRUE(folders.Delete(report, "/gone/x"));
    EXPECT_EQ(report, "untouched");
    ASSERT_TRUE(folders.Save());
    EXPECT_EQ(StoredDocument().getMemberNames(), std::vector<std::string>{"/photo"});
}

// Get reads under the folder lock and releases it on every path; List reads without it.
TEST_F(FoldersTest, GetFindsTheExactPathUnderTheFolderLock)
{
    UpsertAndSave(R"({"path":"/photo/a","name":"A"})");
    const struct {
        const char *path;
        bool locked;  // another process holds the folder lock
        _tag_fileindex_err_ code;
        const char *message;  // nullptr: found
    } cases[] = {
        {"/photo/a/", false, FILEIDX_ERR_NO_SUCH_FOLDER, "No such folder: /photo/a/"},
        {"/photo/a", true, FILEIDX_ERR_LOCK, "Failed to lock folder"},
        {"/photo/a", false, FILEIDX_ERR_NONE, nullptr},
        {"/photo/a", false, FILEIDX_ERR_NONE, nullptr},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(std::string(c.path) + (c.locked ? " while locked" : ""));
        LogCapture::Clear();
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
        const auto writer = c.locked ? std::make_unique<LockHolder>(FILEINDEX_FOLDER_LOCK_PATH, true) : nullptr;
        Json::Value record = "untouched";
        EXPECT_EQ(IndexMgr::Get(record, c.path), c.message == nullptr);
        EXPECT_EQ(record, c.message == nullptr ? ParseJson(ReadFile(kFolderConf))["/photo/a"] : "untouched");
        EXPECT_EQ(ErrorHandler::GetError(), c.code);
        EXPECT_EQ(LogCapture::Messages(), c.message == nullptr ? std::vector<std::string>{}
                                                               : std::vector<std::string>{c.message});
        std::vector<Folder> listed;
        EXPECT_TRUE(IndexMgr::List(listed));
        EXPECT_EQ(listed.size(), 1u);
    }
}

TEST_F(FoldersTest, ListOfOneShareComparesWholeNamesExactly)
{
    WriteFile(kFolderConf, R"({"/video/a":{},"/video2/b":{},"/Video/c":{},"":{},"/video":{}})");
    Folders folders;
    ASSERT_TRUE(folders.Load());
    const auto listedPaths = [&folders](const std::string &share) {
        std::vector<Folder> listed(3);
        EXPECT_TRUE(folders.List(listed, share));
        std::vector<std::string> paths;
        for (const Folder &folder : listed) {
            paths.push_back(folder.m_path);
        }
        return paths;
    };
    EXPECT_EQ(listedPaths("video"), (std::vector<std::string>{"/video", "/video/a"}));
    EXPECT_EQ(listedPaths(""), (std::vector<std::string>{"", "/Video/c", "/video", "/video/a", "/video2/b"}));
}

TEST_F(FoldersTest, GoverningSettingIsTheLastMatchInListOrderNotTheInnermost)
{
    const Folder outer = MakeFolder("/photo", R"({"name":"outer"})");
    const Folder inner = MakeFolder("/photo/a", R"({"name":"inner"})");
    const Folder sibling = MakeFolder("/photo/ab", R"({"name":"sibling"})");
    const Folder orphan = MakeFolder("/gone", R"({"name":"orphan"})");
    const std::string inside = HostPath("/volume1/photo/a/x");
    const struct {
        std::vector<Folder> folders;
        std::string path;
        const char *governing;  // nullptr: no setting governs
    } cases[] = {
        {{outer, inner}, inside, "inner"},
        {{inner, outer}, inside, "outer"},
        {{outer, inner}, HostPath("/volume1/photo/a"), "inner"},
        {{inner, sibling}, HostPath("/volume1/photo/ab"), "sibling"},
        {{inner}, HostPath("/volume1/photo/ab"), nullptr},
        {{orphan}, "/anything", nullptr},
        {{}, inside, nullptr},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.path);
        const Json::Value governing = GetMostSuitableCfg(c.folders, c.path);
        if (c.governing == nullptr) {
            EXPECT_EQ(governing, Json::Value(Json::objectValue));
        } else {
            EXPECT_EQ(governing["name"], c.governing);
        }
    }
}

TEST_F(FoldersTest, BytesThatAreNotUtf8SurviveUpsertSaveLoadAndGet)
{
    const std::string path = "/photo/caf\xe9/\xff\"q\\\x1f";
    UpsertAndSave("{\"path\":\"/photo/caf\xe9/\xff\\\"q\\\\\\u001f\",\"name\":\"n\xfe\x80\",\"video\":true}");
    Json::Value record;
    ASSERT_TRUE(IndexMgr::Get(record, path));
    EXPECT_EQ(record["path"].asString(), path);
    EXPECT_EQ(record["name"].asString(), "n\xfe\x80");
    std::vector<Folder> listed;
    ASSERT_TRUE(IndexMgr::List(listed));
    ASSERT_EQ(listed.size(), 1u);
    EXPECT_EQ(listed[0].m_fullPath, HostPath("/volume1") + path);
}

class FolderListingTest : public FoldersTest {
protected:
    void SetUp() override
    {
        FoldersTest::SetUp();
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
