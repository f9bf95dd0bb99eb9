// The routes of /api/v1/: requests read strictly, library steps under the mutex, records and statuses.
#include "api.h"

#include <algorithm>
#include <climits>
#include <ctime>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "busy.h"
#include "check_report.h"
#include "daemon_probe.h"
#include "failure.h"
#include "fileindex/index_mgr.h"
#include "fileindex/error.h"
#include "fileindex/status.h"
#include "fileindex/utils.h"
#include "library_calls.h"
#include "path_checks.h"
#include "path_encoding.h"
#include "records.h"
#include "replies.h"
#include "requests.h"
#include "status_report.h"

namespace fileindex_panel {

using namespace VEXO::FILEINDEX;
using fileindex_tool::Failure;
using fileindex_tool::FoldersAt;
using fileindex_tool::PathArray;
using fileindex_tool::FailureKind;
using fileindex_tool::LibraryFailure;
using fileindex_tool::TerminalText;
using fileindex_tool::ToolFailure;

namespace {

const char kFollowUpHint[] = "a step that sets no error code failed (after folder.conf was saved: change monitoring, "
                             "the service start, a daemon command, an event); the system log names it";
const char kReadHint[] = "the library recorded no reason; the system log has its line";

const std::set<std::string> kSortKeys = {"path", "name", "document", "audio", "video", "photo"};

// Reads the body with read, or answers 400 and gives false.
template <class Read>
bool ReadBody(const httplib::Request &request, httplib::Response &response, Read read)
{
    Json::Value body;
    std::string problem;
    if (!ParseBody(request.body, body, problem) || !read(body, problem)) {
        Refuse(response, 400, problem);
        return false;
    }
    return true;
}

bool ListFolders(std::vector<Folder> &list, const std::string &what, Failure &failure)
{
    if (!IndexMgr::List(list)) {
        failure = LibraryFailure(what, kReadHint);
        return false;
    }
    return true;
}

// Fails with "not in the folder list" (code 4) for the first of paths that is no indexed folder
// (exact) or lies in none (not exact).
bool CheckIndexed(const std::vector<Folder> &list, const std::vector<std::string> &paths, bool exact,
                  const std::string &what, Failure &failure)
{
    for (const std::string &path : paths) {
        const bool known = exact ? std::any_of(list.begin(), list.end(),
                                               [&path](const Folder &folder) { return folder.m_path == path; })
                                 : IndexMgr::IsPathIndexed(path, list);
        if (!known) {
            failure = ToolFailure(FailureKind::kNotFound, FILEIDX_ERR_NO_SUCH_FOLDER,
                                  what + ": " + TerminalText(path) +
                                      (exact ? " is not in the folder list" : " is in no indexed folder") +
                                      "; the folder table shows the indexed folders");
            return false;
        }
    }
    return true;
}

// The failure of a writer that stayed busy names the lock and who holds it.
Failure Busy(const Failure &failure, const std::string &what, const fileindex_tool::LockFile &lock)
{
    return failure.kind == FailureKind::kBusy ? fileindex_tool::BusyFailure(what, lock, kBusyWaitSeconds) : failure;
}

// ---- GET /api/v1/folders ----

void GetFolders(const httplib::Request &request, httplib::Response &response)
{
    unsigned long offset = 0, limit = 0;
    const std::string sortBy = request.has_param("sort_by") ? request.get_param_value("sort_by") : "path";
    const std::string direction =
        request.has_param("sort_direction") ? request.get_param_value("sort_direction") : "ASC";
    if (!ReadCount(request.get_param_value("offset"), 0, ULONG_MAX, offset) ||
        !ReadCount(request.get_param_value("limit"), 100, kMaxRequestElements, limit)) {
        Refuse(response, 400, "offset must be a whole number, limit one from 0 to 1000");
        return;
    }
    if (kSortKeys.count(sortBy) == 0 || (direction != "ASC" && direction != "DESC")) {
        Refuse(response, 400, "sort_by must be path, name, document, audio, video or photo, and sort_direction ASC "
                              "or DESC");
        return;
    }
    Json::Value additional(Json::arrayValue);
    additional.append("status");
    additional.append("is_valid");
    Json::Value page;
    Failure failure;
    const bool listed = CallLibrary(
        [&](Failure &failed) {
            bool ok = true;
            if (direction == "ASC") {
                ok = IndexMgr::List(page, offset, limit, sortBy, "", additional);
            } else {
                // The descending page counted from the end: the ascending page that ends where this
                // one begins, reversed (the library's own descending form only reverses the first).
                Json::Value count;
                ok = IndexMgr::List(count, 0, 0, sortBy, "", Json::Value(Json::arrayValue));
                const unsigned long total = ok ? count["total"].asUInt64() : 0;
                const unsigned long end = offset < total ? total - offset : 0;
                const unsigned long begin = end > limit ? end - limit : 0;
                ok = ok && IndexMgr::List(page, begin, end - begin, sortBy, "", additional);
                Json::Value &folders = page["folder"];
                for (Json::ArrayIndex i = 0; ok && i < folders.size() / 2; ++i) {
                    folders[i].swap(folders[folders.size() - 1 - i]);
                }
                page["offset"] = static_cast<Json::UInt64>(offset);
            }
            if (!ok) {
                failed = LibraryFailure("listing the folders", kReadHint);
                return false;
            }
            // A folder that may not be indexed carries the rule that refuses it.
            for (Json::Value &record : page["folder"]) {
                if (!record["additional"]["is_valid"].asBool()) {
                    const IndexRefusal refusal = GetPathIndexRefusal(record["path"].asString());
                    record["additional"]["refusal"] = IndexRefusalName(refusal);
                    record["additional"]["refusal_text"] = IndexRefusalText(refusal);
                }
            }
            return true;
        },
        failure);
    if (listed) {
        Send(response, fileindex_tool::FolderPage(std::move(page)));
    } else {
        SendFailure(response, failure);
    }
}

// ---- POST /api/v1/folders ----

void PostFolders(const httplib::Request &request, httplib::Response &response, StatusFeed &feed)
{
    Json::Value settings;
    std::vector<std::string> paths;
    if (!ReadBody(request, response, [&](const Json::Value &body, std::string &problem) {
            return ReadFolderSettings(body, settings, paths, problem);
        })) {
        return;
    }
    const std::string what = "saving the folder settings";
    Failure failure;
    for (Json::ArrayIndex i = 0; i < settings.size(); ++i) {
        if (!fileindex_tool::NormaliseFolderPath(what, paths[i], paths[i], failure)) {
            SendFailure(response, failure);
            return;
        }
        settings[i]["path"] = paths[i];
    }
    std::vector<Folder> stored;
    const bool saved = CallLibraryRetryingBusy(
        [&](Failure &failed) {
            std::vector<Folder> list;
            if (!ListFolders(list, what, failed)) {
                return false;
            }
            // A folder not in the list yet must exist and may be indexed; a listed one may change.
            for (const std::string &path : paths) {
                if (FoldersAt(list, {path}).empty() && (!fileindex_tool::CheckPathExists(what, path, failed) ||
                                                         !fileindex_tool::CheckMayBeIndexed(what, path, failed))) {
                    return false;
                }
            }
            fileindex_tool::ClearLastError();
            if (!IndexMgr::Upsert(settings)) {
                failed = fileindex_tool::DaemonFailure(what, "folder.conf is saved", kFollowUpHint);
                return false;
            }
            return ListFolders(list, what, failed) && (stored = FoldersAt(list, paths), true);
        },
        failure);
    feed.Invalidate();
    if (saved) {
        Send(response, fileindex_tool::FolderRecords(stored));
    } else {
        SendFailure(response, Busy(failure, what, fileindex_tool::kFolderListLock));
    }
}

// ---- POST /api/v1/folders/remove, /api/v1/reindex ----

// A batch operation of the library on an array of paths, each of which must be an indexed folder
// (exact) or lie in one.
struct PathsOperation {
    const char *what;
    bool exact;
    bool (*operation)(const Json::Value &paths);
    const char *state;  // what stands when fileindexd was not told; "" when it is not told anything
    const char *hint;   // what a failure without an error code means
};

// Reads the paths and runs the operation; answers with the records of the folders at those paths
// as the list held them before (removed), or with the paths themselves (reindexed).
void RunPathsOperation(const httplib::Request &request, httplib::Response &response, StatusFeed &feed,
                       const PathsOperation &run)
{
    std::vector<std::string> paths;
    if (!ReadBody(request, response,
                  [&](const Json::Value &body, std::string &problem) { return ReadPaths(body, paths, problem); })) {
        return;
    }
    std::vector<Folder> before;
    const LibraryStep step = [&](Failure &failed) {
        if (!ListFolders(before, run.what, failed) || !CheckIndexed(before, paths, run.exact, run.what, failed)) {
            return false;
        }
        fileindex_tool::ClearLastError();
        if (!run.operation(PathArray(paths))) {
            failed = *run.state != '\0' ? fileindex_tool::DaemonFailure(run.what, run.state, run.hint)
                                         : LibraryFailure(run.what, run.hint);
            return false;
        }
        return true;
    };
    Failure failure;
    // Removal takes the folder lock before any effect; a reindex is not tried again, since events
    // queued before a failure stay queued.
    const bool done = run.exact ? CallLibraryRetryingBusy(step, failure) : CallLibrary(step, failure);
    feed.Invalidate();
    if (!done) {
        SendFailure(response, Busy(failure, run.what, fileindex_tool::kFolderListLock));
    } else if (run.exact) {
        Send(response, fileindex_tool::FolderRecords(FoldersAt(before, paths)));
    } else {
        Json::Value queued(Json::arrayValue);
        for (const std::string &path : paths) {
            Json::Value record;
            fileindex_tool::SetBytesMember(record, "path", path);
            queued.append(record);
        }
        Send(response, queued);
    }
}

void PostRemove(const httplib::Request &request, httplib::Response &response, StatusFeed &feed)
{
    RunPathsOperation(request, response, feed, {"removing folders", true, IndexMgr::Delete, "folder.conf is saved", kFollowUpHint});
}

void PostReindex(const httplib::Request &request, httplib::Response &response, StatusFeed &feed)
{
    RunPathsOperation(request, response, feed,
                      {"reindexing", false, IndexMgr::Reindex, "",
                       "an event could not be queued; the system log names it"});
}

// ---- GET /api/v1/check ----

void GetCheck(const httplib::Request &request, httplib::Response &response)
{
    Json::Value element;
    if (request.has_param("path_bytes")) {
        element["path_bytes"] = request.get_param_value("path_bytes");
    } else {
        element = request.get_param_value("path");
    }
    std::string path, problem;
    if (!ReadPath(element, path, problem)) {
        Refuse(response, 400, "?path= or ?path_bytes=: " + problem);
        return;
    }
    Json::Value report;
    Failure failure;
    CallLibrary(
        [&](Failure &) {
            report = fileindex_tool::CheckReport(path);
            return true;
        },
        failure);
    Send(response, report);
}

// ---- POST /api/v1/pause, /api/v1/resume, /api/v1/shares/revive ----

// Runs a writer of status.conf (retried while busy) and answers with what answer gives.
void ChangeStatus(httplib::Response &response, StatusFeed &feed, const std::string &what,
                  const std::function<bool(Failure &)> &change, const std::function<Json::Value()> &answer)
{
    Json::Value document;
    Failure failure;
    const bool done = CallLibraryRetryingBusy(
        [&](Failure &failed) {
            if (!change(failed)) {
                return false;
            }
            document = answer();
            return true;
        },
        failure);
    feed.Invalidate();
    if (done) {
        Send(response, document);
    } else {
        SendFailure(response, Busy(failure, what, fileindex_tool::kStatusLock));
    }
}

// {"resume_time"} as status.conf holds it now.
Json::Value PauseState()
{
    long long resumeTime = -1;
    StatusMgr::GetPauseInfo(resumeTime);
    Json::Value document;
    document["resume_time"] = static_cast<Json::Int64>(resumeTime);
    return document;
}

void PostPause(const httplib::Request &request, httplib::Response &response, StatusFeed &feed)
{
    // The resume time is kept in 32 signed bits: the pause must end before that runs out.
    const long long maxHours = (INT_MAX - static_cast<long long>(time(nullptr))) / 3600;
    int hours = 0;
    if (!ReadBody(request, response, [&](const Json::Value &body, std::string &problem) {
            const Json::Value &value = body["hours"];
            if (!body.isObject() || body.size() != 1 || !value.isIntegral() || value.asLargestInt() < 0 ||
                value.asLargestInt() > maxHours) {
                problem = "the body must be {\"hours\": N}, N a whole number from 0 (until resumed) to " +
                          std::to_string(maxHours);
                return false;
            }
            hours = static_cast<int>(value.asLargestInt());
            return true;
        })) {
        return;
    }
    ChangeStatus(
        response, feed, "pausing",
        [hours](Failure &failed) {
            if (!StatusMgr::Pause(hours)) {
                failed = fileindex_tool::DaemonFailure("pausing", "status.conf is saved", kReadHint);
                return false;
            }
            return true;
        },
        PauseState);
}

void PostResume(const httplib::Request &, httplib::Response &response, StatusFeed &feed)
{
    ChangeStatus(
        response, feed, "resuming",
        [](Failure &failed) {
            if (!StatusMgr::Resume()) {
                failed = fileindex_tool::DaemonFailure("resuming", "status.conf is saved", kReadHint);
                return false;
            }
            return true;
        },
        PauseState);
}

void PostRevive(const httplib::Request &request, httplib::Response &response, StatusFeed &feed)
{
    std::string share;
    if (!ReadBody(request, response, [&](const Json::Value &body, std::string &problem) {
            if (!body.isObject() || body.size() != 1 || !body["share_name"].isString()) {
                problem = "the body must be {\"share_name\": \"<share>\"}";
                return false;
            }
            share = body["share_name"].asString();
            return true;
        })) {
        return;
    }
    const std::string what = "reviving share " + TerminalText(share);
    ChangeStatus(
        response, feed, what,
        [&](Failure &failed) {
            if (!fileindex_tool::CheckShareExists(what, share, failed)) {
                return false;
            }
            fileindex_tool::ClearLastError();
            if (!StatusMgr::ShareRevive(share)) {
                failed = fileindex_tool::DaemonFailure(what, "status.conf is saved", kReadHint);
                return false;
            }
            return true;
        },
        [&share]() { return fileindex_tool::ShareMarks(share); });
}

// Answers 405 with Allow for each method the route does not take (allowed: "GET", "GET, POST", ...).
void RefuseOtherMethods(httplib::Server &server, const std::string &path, const std::string &allowed)
{
    const httplib::Server::Handler refuse = [allowed](const httplib::Request &request, httplib::Response &response) {
        response.set_header("Allow", allowed);
        Refuse(response, 405, request.method + " is not answered at " + request.path + "; use " + allowed);
    };
    using Register = httplib::Server &(httplib::Server::*)(const std::string &, httplib::Server::Handler);
    const std::pair<const char *, Register> methods[] = {
        {"GET", &httplib::Server::Get},       {"POST", &httplib::Server::Post},
        {"PUT", &httplib::Server::Put},       {"DELETE", &httplib::Server::Delete},
        {"PATCH", &httplib::Server::Patch},
    };
    for (const auto &method : methods) {
        if (allowed.find(method.first) == std::string::npos) {
            (server.*method.second)(path, refuse);
        }
    }
}

}  // namespace

Reply ReadStatus()
{
    Reply reply;
    reply.ok = CallLibrary(
        [&reply](Failure &failed) {
            fileindex_tool::StatusReport report;
            if (!fileindex_tool::TakeStatusReport({}, report)) {
                failed = LibraryFailure("reading the status", kReadHint);
                return false;
            }
            reply.body = fileindex_tool::StatusRecord(report);
            return true;
        },
        reply.failure);
    return reply;
}

void AddApiRoutes(httplib::Server &server, StatusFeed &feed)
{
    server.Get("/api/v1/status", [&feed](const httplib::Request &, httplib::Response &response) {
        const Reply reply = feed.Current();
        if (reply.ok) {
            Send(response, reply.body);
        } else {
            SendFailure(response, reply.failure);
        }
    });
    server.Get("/api/v1/folders", GetFolders);
    server.Get("/api/v1/check", GetCheck);
    RefuseOtherMethods(server, "/api/v1/status", "GET");
    RefuseOtherMethods(server, "/api/v1/check", "GET");
    RefuseOtherMethods(server, "/api/v1/folders", "GET, POST");
    const std::pair<const char *, void (*)(const httplib::Request &, httplib::Response &, StatusFeed &)> posts[] = {
        {"/api/v1/folders", PostFolders}, {"/api/v1/folders/remove", PostRemove}, {"/api/v1/reindex", PostReindex},
        {"/api/v1/pause", PostPause},     {"/api/v1/resume", PostResume},         {"/api/v1/shares/revive", PostRevive},
    };
    for (const auto &post : posts) {
        const auto handler = post.second;
        server.Post(post.first, [&feed, handler](const httplib::Request &request, httplib::Response &response) {
            handler(request, response, feed);
        });
        if (post.first != std::string("/api/v1/folders")) {
            RefuseOtherMethods(server, post.first, "POST");
        }
    }
}

}  // namespace fileindex_panel
