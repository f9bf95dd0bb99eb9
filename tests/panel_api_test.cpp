// fileindex-panel as programs and pages use it: a process on a free loopback port, asked over HTTP,
// with the status code, the body and the appliance's files checked after every request.
#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <ctime>
#include <future>
#include <regex>
#include <string>
#include <vector>

#include <httplib.h>

#include "config/json_io.h"
#include "tests/support/child.h"
#include "tests/support/frame_listener.h"
#include "tests/support/sandbox.h"
#include "tests/support/spawn.h"

namespace fileindex_test {
namespace {

const std::string kFolderConf = FILEINDEX_FOLDER_CONF_PATH;
const std::string kStatusConf = FILEINDEX_STATUS_CONF_PATH;

// A running fileindex-panel: started with args, its printed URL read, ended with SIGTERM.
class Panel {
public:
    // Standard error goes to the file errPath.
    Panel(const std::vector<std::string> &args, const std::string &errPath) : m_errPath(errPath)
    {
        int out[2];
        EXPECT_EQ(pipe2(out, O_CLOEXEC), 0);
        m_pid = SpawnProgram(FILEINDEX_PANEL, args,
                             {Redirect::Descriptor(STDOUT_FILENO, out[1]),
                              Redirect::File(STDERR_FILENO, errPath, O_WRONLY | O_CREAT | O_TRUNC)});
        close(out[1]);
        // The URL line, or nothing when the panel refused to start.
        for (char c; read(out[0], &c, 1) == 1 && c != '\n';) {
            url += c;
        }
        close(out[0]);
        std::smatch parts;
        if (std::regex_match(url, parts, std::regex("http://127\\.0\\.0\\.1:([0-9]+)/\\?token=([0-9a-f]{64})"))) {
            port = std::stoi(parts[1]);
            token = parts[2];
        }
    }
    ~Panel() { Stop(); }

    // SIGTERM, then the exit status (128 + signal when it did not exit).
    int Stop()
    {
        if (m_pid > 0) {
            kill(m_pid, SIGTERM);
            int status = 0;
            waitpid(m_pid, &status, 0);
            m_status = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
            m_pid = -1;
        }
        return m_status;
    }

    std::string url;
    int port = 0;
    std::string token;
    std::string Errors() const { return ReadFile(m_errPath); }

private:
    std::string m_errPath;
    pid_t m_pid = -1;
    int m_status = -1;
};

enum class Auth { kBearer, kCookie, kNone };

struct Answer {
    int status = 0;
    std::string body;
    httplib::Headers headers;
};

class PanelApiTest : public SandboxTest {
protected:
    void SetUp() override
    {
        SandboxTest::SetUp();
        DeclareShares("volume1/photo volume2/music");
        for (const char *folder : {"/holiday", "/#recycle", "/caf\xe9"}) {
            stdfs::create_directories(SharePath("photo") + folder);
        }
        m_panel = std::make_unique<Panel>(std::vector<std::string>{"--listen", "127.0.0.1:0", "--token-file",
                                                                   HostPath("/panel.token")},
                                          HostPath("/panel.err"));
        ASSERT_NE(m_panel->port, 0) << m_panel->Errors();
    }

    // One request; Origin and Host are those of the panel's own page unless headers say otherwise.
    Answer Ask(const std::string &method, const std::string &target, const std::string &body = std::string(),
               Auth auth = Auth::kBearer, httplib::Headers headers = {})
    {
        httplib::Client client("127.0.0.1", m_panel->port);
        httplib::Request request;
        request.method = method;
        request.path = target;
        request.body = body;
        request.headers = headers;
        if (auth == Auth::kBearer) {
            request.headers.emplace("Authorization", "Bearer " + m_panel->token);
        } else if (auth == Auth::kCookie) {
            request.headers.emplace("Cookie", "other=1; fileindex_panel_" + std::to_string(m_panel->port) + "=" +
                                                  m_panel->token);
        }
        if (!body.empty()) {
            request.headers.emplace("Content-Type", "application/json");
        }
        const httplib::Result result = client.send(request);
        EXPECT_TRUE(result) << method << " " << target;
        return result ? Answer{result->status, result->body, result->headers} : Answer{};
    }

    std::string Authority() const { return "127.0.0.1:" + std::to_string(m_panel->port); }

    std::unique_ptr<Panel> m_panel;
};

// The gate: the token, the Host and the Origin decide before any route does, and a refused request
// changes nothing.
TEST_F(PanelApiTest, OnlyTheTokenHolderFromThePanelsOwnPageGetsIn)
{
    const std::string before = R"({"/photo/holiday":{"path":"/photo/holiday","name":"Holiday","photo":true}})";
    WriteFile(kFolderConf, before);
    FrameListener daemon;
    const std::string add = R"([{"path": "/photo/holiday", "name": "H"}])";
    const std::string own = "http://" + Authority();
    struct Row {
        const char *what;
        std::string method, target, body;
        Auth auth;
        httplib::Headers headers;
        int status;
        std::string bodyPattern;
    } rows[] = {
        {"no token", "GET", "/api/v1/status", "", Auth::kNone, {}, 401,
         R"(^\{"error":\{"code":null,"message":"no valid token[^"]*","name":null\}\}$)"},
        {"a wrong bearer token", "GET", "/api/v1/status", "", Auth::kNone,
         {{"Authorization", "Bearer " + std::string(64, '0')}}, 401, "no valid token"},
        {"a wrong cookie", "GET", "/api/v1/status", "", Auth::kNone,
         {{"Cookie", "fileindex_panel_" + std::to_string(m_panel->port) + "=" + std::string(64, 'a')}}, 401, ""},
        {"the page without the token", "GET", "/", "", Auth::kNone, {}, 401, "needs the panel's token"},
        {"a foreign Host (DNS rebinding)", "GET", "/api/v1/status", "", Auth::kBearer, {{"Host", "attacker.example"}},
         403, "does not name this panel"},
        {"another port in Host", "GET", "/api/v1/status", "", Auth::kBearer, {{"Host", "127.0.0.1:1"}}, 403, ""},
        {"a Host that is not UTF-8, quoted in the answer", "GET", "/api/v1/status", "", Auth::kBearer,
         {{"Host", "caf\xe9.example\x7f"}}, 403, R"(the Host header \$'caf\\\\xe9\.example\\\\x7f' does not)"},
        {"localhost as Host", "GET", "/api/v1/status", "", Auth::kBearer,
         {{"Host", "localhost:" + std::to_string(m_panel->port)}}, 200, "\"status\":\"finished\""},
        {"a cross-site POST with the cookie", "POST", "/api/v1/folders", add, Auth::kCookie,
         {{"Origin", "http://attacker.example"}}, 403, "another site"},
        {"a cookie POST without Origin or the page's header", "POST", "/api/v1/folders", add, Auth::kCookie, {}, 403,
         "X-Fileindex-Panel"},
        {"a cookie GET needs neither", "GET", "/api/v1/folders", "", Auth::kCookie, {}, 200, "\"total\":1"},
        {"an unknown route", "GET", "/api/v1/nosuch", "", Auth::kBearer, {}, 404, "\"error\""},
        {"a file from disk", "GET", "/../../../etc/passwd", "", Auth::kBearer, {}, 404, "\"error\""},
        {"GET of a POST route", "GET", "/api/v1/pause", "", Auth::kBearer, {}, 405, "\"error\""},
        {"a body over 1 MiB", "POST", "/api/v1/folders", "[\"" + std::string(1 << 20, 'a') + "\"]", Auth::kBearer, {},
         413, "larger than 1 MiB"},
    };
    for (const Row &row : rows) {
        SCOPED_TRACE(row.what);
        const Answer answer = Ask(row.method, row.target, row.body, row.auth, row.headers);
        EXPECT_EQ(answer.status, row.status);
        EXPECT_TRUE(std::regex_search(answer.body, std::regex(row.bodyPattern))) << answer.body;
        EXPECT_EQ(ReadFile(kFolderConf), before);
    }

    // The URL's token becomes an HttpOnly, SameSite=Strict cookie and leaves the address bar; the page
    // then carries a strict Content-Security-Policy, and the cookie and the page's header let a change in.
    const Answer exchange = Ask("GET", "/?token=" + m_panel->token, "", Auth::kNone);
    EXPECT_EQ(exchange.status, 303);
    EXPECT_EQ(exchange.headers.find("Location")->second, "/");
    EXPECT_EQ(exchange.headers.find("Set-Cookie")->second, "fileindex_panel_" + std::to_string(m_panel->port) + "=" +
                                                               m_panel->token + "; Path=/; HttpOnly; SameSite=Strict");
    EXPECT_EQ(Ask("GET", "/?token=" + std::string(64, 'f'), "", Auth::kNone).status, 401);
    const Answer page = Ask("GET", "/", "", Auth::kCookie);
    EXPECT_EQ(page.status, 200);
    EXPECT_NE(page.body.find("<script src=\"/panel.js\""), std::string::npos);
    EXPECT_EQ(page.headers.find("Content-Security-Policy")->second.rfind("default-src 'self';", 0), 0u);
    EXPECT_EQ(Ask("POST", "/api/v1/folders", add, Auth::kCookie, {{"Origin", own}}).status, 200);
    EXPECT_EQ(ParseJson(ReadFile(kFolderConf))["/photo/holiday"]["name"], "H");
}


// Each writing route as a table of requests: what it answers and what folder.conf, status.conf and
// the share's event queue hold afterwards. A refused request leaves every file as it was.
TEST_F(PanelApiTest, EachChangeAnswersAndLeavesTheFilesItShould)
{
    const std::string queue = SharePath("photo") + "/@eaDir/VEXO@file_index_queue";
    struct Row {
        const char *what;
        std::string target, body;
        int status;
        std::string bodyPattern;
        std::string folderConfPaths;  // the members of folder.conf afterwards, space-separated
        std::string statusConfPattern;
        std::string queuePattern;
    } rows[] = {
        {"add", "/api/v1/folders", R"([{"path": "/photo/holiday", "name": "Holiday", "photo": true}])", 200,
         R"(^\[\{"audio":false,"document":false,"name":"Holiday",.*"path":"/photo/holiday",)"
         R"("path_bytes":"/photo/holiday","photo":true,"video":false\}\]$)",
         "/photo/holiday", "^$", "\"event\":131072,\"path\":\"[^\"]*/photo/holiday\""},
        {"change one medium, the rest kept", "/api/v1/folders", R"([{"path": "/photo/holiday", "audio": true}])", 200,
         R"("audio":true,"document":false,"name":"Holiday")", "/photo/holiday", "^$", ""},
        {"not JSON", "/api/v1/folders", "[{\"path\": ", 400, "\"message\":\"the body is not JSON", "/photo/holiday",
         "^$", ""},
        {"a medium as a string", "/api/v1/folders", R"([{"path": "/photo/holiday", "photo": "yes"}])", 400,
         "element 0: \\\\\"photo\\\\\" must be true or false", "/photo/holiday", "^$", ""},
        {"an unknown member", "/api/v1/folders", R"([{"path": "/photo/holiday", "photos": true}])", 400,
         "unknown member", "/photo/holiday", "^$", ""},
        {"not an array", "/api/v1/folders", R"({"path": "/photo/holiday"})", 400, "an array", "/photo/holiday", "^$",
         ""},
        {"a share the database does not know", "/api/v1/folders", R"([{"path": "/nosuch/a"}])", 422,
         "\"name\":\"FILEIDX_ERR_", "/photo/holiday", "^$", ""},
        {"reindex", "/api/v1/reindex", R"(["/photo/holiday"])", 200,
         R"(^\[\{"path":"/photo/holiday","path_bytes":"/photo/holiday"\}\]$)",
         "/photo/holiday", "^$", "\"data\":null,\"event\":65536,\"path\":\"[^\"]*/photo/holiday\""},
        {"reindex outside every indexed folder", "/api/v1/reindex", R"(["/music"])", 422, "FILEIDX_ERR_NO_SUCH_FOLDER",
         "/photo/holiday", "^$", ""},
        {"reindex of a number", "/api/v1/reindex", "[7]", 400, "element 0", "/photo/holiday", "^$", ""},
        {"pause for 2 hours", "/api/v1/pause", R"({"hours": 2})", 200, R"(^\{"resume_time":[0-9]{10}\}$)",
         "/photo/holiday", "\"resume_time\":[0-9]{10}", ""},
        {"pause for a text", "/api/v1/pause", R"({"hours": "2"})", 400, "from 0 \\(until resumed\\) to [0-9]+",
         "/photo/holiday", "\"resume_time\":[0-9]{10}", ""},
        {"pause past 2038", "/api/v1/pause", R"({"hours": 1000000})", 400, "to [0-9]+", "/photo/holiday",
         "\"resume_time\":[0-9]{10}", ""},
        {"resume", "/api/v1/resume", "", 200, R"(^\{"resume_time":-1\}$)", "/photo/holiday", "\"resume_time\":-1", ""},
        {"revive an unknown share", "/api/v1/shares/revive", R"({"share_name": "nosuch"})", 422,
         "share nosuch does not exist", "/photo/holiday", "\"resume_time\":-1", ""},
        {"remove a folder not in the list", "/api/v1/folders/remove", R"(["/photo/holiday", "/music"])", 422,
         "FILEIDX_ERR_NO_SUCH_FOLDER", "/photo/holiday", "\"resume_time\":-1", ""},
        {"remove", "/api/v1/folders/remove", R"([{"path": "/photo/holiday"}])", 200, R"("path":"/photo/holiday")", "",
         "\"resume_time\":-1", ""},
    };
    FrameListener daemon;
    for (const Row &row : rows) {
        SCOPED_TRACE(row.what);
        const Answer answer = Ask("POST", row.target, row.body);
        EXPECT_EQ(answer.status, row.status);
        EXPECT_TRUE(std::regex_search(answer.body, std::regex(row.bodyPattern))) << answer.body;
        std::string paths;
        for (const std::string &path : ParseJson(ReadFile(kFolderConf).empty() ? "{}" : ReadFile(kFolderConf))
                                           .getMemberNames()) {
            paths += (paths.empty() ? "" : " ") + path;
        }
        EXPECT_EQ(paths, row.folderConfPaths);
        const std::string statusConf = ReadFile(kStatusConf);
        EXPECT_TRUE(std::regex_search(statusConf, std::regex(row.statusConfPattern))) << statusConf;
        if (!row.queuePattern.empty()) {
            EXPECT_TRUE(std::regex_search(ReadFile(queue), std::regex(row.queuePattern))) << ReadFile(queue);
        }
    }
}


// Another process holds the folder list's or the status file's lock for longer than the panel's own
// retries: every writer answers 503 with Retry-After and writes nothing, and the page can tell busy
// from failed by the error's name. Lock files that cannot be created are no busy lock: 422 at once,
// naming them.
TEST_F(PanelApiTest, ALockHeldByAnotherProcessIsBusyAndWritesNothing)
{
    const std::string folders = R"({"/photo/holiday":{"path":"/photo/holiday","name":"H","photo":true}})";
    const std::string status = R"({"no_space":{"photo":true},"resume_time":-1})";
    WriteFile(kFolderConf, folders);
    WriteFile(kStatusConf, status);
    FrameListener daemon;
    struct Row {
        std::string target, body;
    } rows[] = {
        {"/api/v1/folders", R"([{"path": "/photo/holiday", "audio": true}])"},
        {"/api/v1/folders/remove", R"(["/photo/holiday"])"},
        {"/api/v1/pause", R"({"hours": 0})"},
        {"/api/v1/resume", ""},
        {"/api/v1/shares/revive", R"({"share_name": "photo"})"},
    };
    // Every writer at once, so that their retries overlap.
    LockHolder folderLock(FILEINDEX_FOLDER_LOCK_PATH, true), statusLock(FILEINDEX_STATUS_LOCK_PATH, true);
    std::vector<std::future<Answer>> answers;
    for (const Row &row : rows) {
        answers.push_back(std::async(std::launch::async, [&row, this] { return Ask("POST", row.target, row.body); }));
    }
    for (size_t i = 0; i < answers.size(); ++i) {
        SCOPED_TRACE(rows[i].target);
        const Answer answer = answers[i].get();
        EXPECT_EQ(answer.status, 503);
        EXPECT_EQ(answer.headers.find("Retry-After")->second, "1");
        EXPECT_TRUE(std::regex_search(answer.body, std::regex("\"code\":9,.*\"name\":\"FILEIDX_ERR_LOCK\"")))
            << answer.body;
    }
    stdfs::remove_all(stdfs::path(FILEINDEX_FOLDER_LOCK_PATH).parent_path());
    for (const Row &row : rows) {
        SCOPED_TRACE(row.target + " without the lock files' directory");
        const Answer answer = Ask("POST", row.target, row.body);
        EXPECT_EQ(answer.status, 422);
        EXPECT_NE(answer.body.find(std::string("the folder list lock file ") + FILEINDEX_FOLDER_LOCK_PATH +
                                   " and the status lock file " + FILEINDEX_STATUS_LOCK_PATH +
                                   " cannot be opened or created, so no process holds them: the directory "),
                  std::string::npos)
            << answer.body;
    }
    EXPECT_EQ(ReadFile(kFolderConf), folders);
    EXPECT_EQ(ReadFile(kStatusConf), status);
    EXPECT_TRUE(daemon.Connections(0).empty());
}

// A folder whose path is not UTF-8 is listed with its bytes percent-encoded beside a readable form,
// found by its state, and removed by sending its record's bytes back: folder.conf holds the exact
// bytes throughout.
TEST_F(PanelApiTest, APathThatIsNotUtf8RoundTripsThroughTheRecords)
{
    FrameListener daemon;
    const std::string odd = "/photo/caf\xe9";
    Answer answer =
        Ask("POST", "/api/v1/folders", R"([{"path_bytes": "/photo/caf%E9", "name": "Cafe", "photo": true}])");
    EXPECT_EQ(answer.status, 200) << answer.body;
    EXPECT_TRUE(ParseJson(ReadFile(kFolderConf)).isMember(odd));

    const Json::Value record = ParseJson(Ask("GET", "/api/v1/folders").body)["folders"][0];
    EXPECT_EQ(record["path"], "/photo/caf\\xe9");
    EXPECT_EQ(record["path_bytes"], "/photo/caf%E9");
    EXPECT_EQ(record["additional"]["is_valid"], true);
    const Json::Value status = ParseJson(Ask("GET", "/api/v1/status").body);
    EXPECT_EQ(status["folders"][0]["path_bytes"], "/photo/caf%E9");
    EXPECT_EQ(ParseJson(Ask("GET", "/api/v1/check?path_bytes=/photo/caf%25E9").body)["indexed"], true);

    Json::Value remove(Json::arrayValue);
    remove.append(record);
    answer = Ask("POST", "/api/v1/folders/remove", VEXO::FILEINDEX::toString(remove));
    EXPECT_EQ(answer.status, 200) << answer.body;
    EXPECT_FALSE(ParseJson(ReadFile(kFolderConf)).isMember(odd));
}

// The reading routes as a table: the folder page (its paging and sorting as the library sorts,
// descending pages counted from the end), the check of a typed path, and the status with the
// pause and the shares' marks.
TEST_F(PanelApiTest, EachReadingAnswersWhatTheFilesHold)
{
    Json::Value conf;
    for (const char *path : {"/photo/a", "/photo/b", "/photo/c", "/photo/#recycle"}) {
        stdfs::create_directories(HostPath(std::string("/volume1") + path));
        conf[path]["path"] = path;
        conf[path]["name"] = std::string("n") + path[7];
        conf[path]["photo"] = path[7] != 'b';
    }
    WriteFile(kFolderConf, VEXO::FILEINDEX::toString(conf));
    WriteFile(kStatusConf, R"({"need_reindex":{"music":true},"resume_time":0})");
    struct Row {
        std::string target;
        int status;
        std::string bodyPattern;
        std::string paths;  // the folders of the page, in order
    } rows[] = {
        {"/api/v1/folders?limit=2", 200,
         R"(^\{"folders":\[\{"additional":\{"is_valid":false,"refusal":"recycle_bin",.*"status":"paused"\},)"
         R"(.*\],"offset":0,"total":4\}$)",
         "/photo/#recycle /photo/a"},
        {"/api/v1/folders?offset=1&limit=2&sort_by=photo", 200, "", "/photo/#recycle /photo/a"},
        {"/api/v1/folders?offset=0&limit=1&sort_by=name&sort_direction=DESC", 200, "\"offset\":0,\"total\":4",
         "/photo/c"},
        {"/api/v1/folders?offset=1&limit=2&sort_direction=DESC", 200, "\"offset\":1,\"total\":4",
         "/photo/b /photo/a"},
        {"/api/v1/folders?limit=1001", 400, "limit one from 0 to 1000", ""},
        {"/api/v1/folders?offset=-1", 400, "offset must be a whole number", ""},
        {"/api/v1/folders?sort_by=size", 400, "sort_by must be", ""},
        {"/api/v1/folders?sort_direction=desc", 400, "sort_direction ASC or DESC", ""},
        {"/api/v1/check?path=/photo/%23recycle", 200,
         R"("may_be_indexed":false,.*"refusal":"recycle_bin","refusal_text":"in a share's recycle bin")", ""},
        {"/api/v1/check?path=/nosuch/x", 200, R"("refusal":"path_unresolved")", ""},
        {"/api/v1/check?path=photo", 400, "must begin with", ""},
        {"/api/v1/check", 400, "must begin with", ""},
        {"/api/v1/status", 200,
         R"("folders":\[\{"path":"/photo/#recycle","path_bytes":"/photo/%23recycle","status":"paused"\}.*)"
         R"("resume_time":0,"shares":\[\{"need_reindex":true,"no_space":false,"share_name":"music".*)"
         R"(\{"need_reindex":false,"no_space":false,"share_name":"photo".*"status":"finished")",
         ""},
    };
    for (const Row &row : rows) {
        SCOPED_TRACE(row.target);
        const Answer answer = Ask("GET", row.target);
        EXPECT_EQ(answer.status, row.status);
        EXPECT_TRUE(std::regex_search(answer.body, std::regex(row.bodyPattern))) << answer.body;
        if (!row.paths.empty()) {
            std::string paths;
            const Json::Value page = ParseJson(answer.body);
            for (const Json::Value &record : page["folders"]) {
                paths += (paths.empty() ? "" : " ") + record["path"].asString();
            }
            EXPECT_EQ(paths, row.paths);
        }
    }
}

// Starting and stopping: the token file is made private or refused, a listen address other than
// loopback needs --allow-remote, and SIGTERM ends the panel with status 0.
TEST_F(PanelApiTest, TheTokenFileAndTheListenAddressAreCheckedAtStart)
{
    EXPECT_EQ(m_panel->Stop(), 0);
    struct stat made;
    ASSERT_EQ(lstat(HostPath("/panel.token").c_str(), &made), 0);
    EXPECT_EQ(made.st_mode & 0777, 0600u);
    EXPECT_EQ(ReadFile(HostPath("/panel.token")), m_panel->token + "\n");

    const std::string file = HostPath("/other.token");
    struct Row {
        const char *what;
        std::function<void()> prepare;
        std::vector<std::string> args;
        std::string errorPattern;  // empty: starts and prints the URL
    } rows[] = {
        {"the token file kept", [] {}, {"--listen", "127.0.0.1:0"}, ""},
        {"readable by others", [&] { chmod(file.c_str(), 0644); }, {"--listen", "127.0.0.1:0"}, "others may read"},
        {"a symbolic link", [&] { stdfs::rename(file, file + ".real"), stdfs::create_symlink(file + ".real", file); },
         {"--listen", "127.0.0.1:0"}, "is a symbolic link"},
        {"not a token", [&] { stdfs::remove(file), WriteFile(file, "secret\n"), chmod(file.c_str(), 0600); },
         {"--listen", "127.0.0.1:0"}, "does not hold a token"},
        {"every address", [&] { stdfs::remove(file); }, {"--listen", "0.0.0.0:0"}, "give --allow-remote"},
        {"no port", [] {}, {"--listen", "127.0.0.1"}, "--listen takes ADDR:PORT"},
    };
    for (const Row &row : rows) {
        SCOPED_TRACE(row.what);
        row.prepare();
        std::vector<std::string> args = row.args;
        args.insert(args.end(), {"--token-file", file});
        Panel panel(args, HostPath("/panel.err"));
        EXPECT_EQ(panel.port != 0, row.errorPattern.empty()) << panel.url;
        EXPECT_TRUE(std::regex_search(panel.Errors(), std::regex(row.errorPattern))) << panel.Errors();
        EXPECT_EQ(panel.Stop(), row.errorPattern.empty() ? 0 : row.args[1] == "127.0.0.1:0" ? 1 : 2);
    }
}

}  // namespace
}  // namespace fileindex_test
