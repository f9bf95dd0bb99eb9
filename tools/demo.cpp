// fileindex-demo: a walk through the library on the emulated platform, under the build's sandbox
// root. It sets up an appliance with three shares, starts a stand-in for fileindexd as the
// "fileindexd" service, and then uses the library as a management program would: paths are
// resolved, folder settings added end to end (folder list, change monitoring, service, daemon
// commands, events), indexing paused and resumed, a share marked out of space and revived, events
// queued, a reindex asked for, a share paused and resumed, and a folder removed. Every command that
// reaches the stand-in daemon is printed at the end.
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <iostream>
#include <string>

#include "appliance_paths.h"
#include "config/file_io.h"
#include "config/json_io.h"
#include "fileindex/error.h"
#include "fileindex/fileidx.h"
#include "fileindex/folder.h"
#include "fileindex/index_mgr.h"
#include "fileindex/status.h"
#include "fileindex/utils.h"
#include "platform/service.h"

using namespace VEXO::FILEINDEX;

namespace {

namespace stdfs = std::filesystem;

const std::string kRoot = FILEINDEX_ROOT_DIR;
const std::string kState = FILEINDEX_EMULATION_STATE_DIR;
const std::string kCommandsFile = kRoot + "/fileindexd-commands.jsonl";

void Step(const std::string &title)
{
    std::cout << "\n== " << title << "\n";
}

void Show(const std::string &label, const std::string &value)
{
    std::cout << "   " << label << ": " << value << "\n";
}

std::string ReadText(const std::string &path)
{
    std::string text;
    ReadWholeFile(path, text);
    return text;
}

// A fresh appliance: configuration, lock and run directories, the emulated share database, the
// administrators' notification tool, and the stand-in daemon configured as the fileindexd service.
bool SetUpAppliance(const std::string &standInDaemon)
{
    if (kRoot.empty()) {
        std::cerr << "this demo needs a build with a sandbox FILEINDEX_ROOT\n";
        return false;
    }
    stdfs::create_directories(kRoot);
    for (const stdfs::directory_entry &entry : stdfs::directory_iterator(kRoot)) {
        stdfs::remove_all(entry.path());
    }
    for (const char *file : {FILEINDEX_APPLIANCE_FILES}) {
        stdfs::create_directories(stdfs::path(file).parent_path());
    }
    stdfs::create_directories(kState);
    for (const char *dir : {"/volume1/photo/holiday", "/volume1/video", "/volume2/music"}) {
        stdfs::create_directories(kRoot + dir);
    }
    Json::Value shares(Json::arrayValue);
    for (const char *location : {"volume1/photo", "volume1/video", "volume2/music"}) {
        Json::Value share;
        share["name"] = std::string(location).substr(8);
        share["path"] = kRoot + "/" + location;
        shares.append(share);
    }
    ReplaceFileAtomically(kState + "/shares.json", toString(shares));
    ReplaceFileAtomically(FILEINDEX_NOTIFY_TOOL_PATH, "#!/bin/sh\nexit 0\n");
    chmod(FILEINDEX_NOTIFY_TOOL_PATH, 0755);
    Json::Value commands;
    commands["fileindexd"].append(standInDaemon);
    commands["fileindexd"].append("--output");
    commands["fileindexd"].append(kCommandsFile);
    ReplaceFileAtomically(kState + "/service_commands.json", toString(commands));
    return true;
}

void WaitForDaemonSocket()
{
    for (int i = 0; i < 500 && access(FILEINDEX_DAEMON_SOCKET_PATH, F_OK) != 0; ++i) {
        usleep(10000);
    }
}

std::string StandInDaemonPath(const char *argv0)
{
    const std::string self = argv0;
    const size_t slash = self.rfind('/');
    return (slash == std::string::npos ? std::string(".") : self.substr(0, slash)) + "/fileindex-standin-daemon";
}

}  // namespace

int main(int, char **argv)
{
    std::cout << "libfileindex demo on the emulated platform, sandbox root " << kRoot << "\n";
    if (!SetUpAppliance(StandInDaemonPath(argv[0]))) {
        return 1;
    }

    Step("The indexing service starts (the stand-in daemon listens on the daemon socket)");
    Show("VLIBServiceStart(\"fileindexd\")", std::to_string(VLIBServiceStart("fileindexd", 1)));
    WaitForDaemonSocket();

    Step("Shares and paths");
    std::string fullPath;
    GetFullPath(fullPath, "/photo/holiday");
    Show("/photo/holiday is", fullPath);
    std::string share;
    std::string sharePath;
    GetShareNamePathByFullPath(share, sharePath, fullPath);
    Show("its share", share + " at " + sharePath);
    Show("/Photo/x (the share database ignores case)", GetFullPath(fullPath, "/Photo/x") ? fullPath : "unresolved");

    Step("Folder settings added end to end: saved, monitored, service and Spotlight on, daemon told, events queued");
    Json::Value settings;
    fromString(settings, R"([{"path":"/photo/holiday","name":"Holiday","photo":true},
                             {"path":"/video","name":"Films","video":true},
                             {"path":"/photo/holiday","document":true}])");
    Show("IndexMgr::Upsert", IndexMgr::Upsert(settings) ? "done" : "failed");
    Show("folder.conf", ReadText(FILEINDEX_FOLDER_CONF_PATH));

    Step("Lookups and queries");
    Json::Value record;
    IndexMgr::Get(record, "/photo/holiday");
    Show("IndexMgr::Get(/photo/holiday)", toString(record));
    Show("IsPathIndexed(/photo/holiday/2024)", IndexMgr::IsPathIndexed("/photo/holiday/2024") ? "yes" : "no");
    Show("IsPathIndexed(/photo/holiday2)", IndexMgr::IsPathIndexed("/photo/holiday2") ? "yes" : "no");
    Show("IsPathContainIndexed(/photo)", IndexMgr::IsPathContainIndexed("/photo") ? "yes" : "no");
    Show("FILEIDXIsShareIndexed(music)", std::to_string(FILEIDXIsShareIndexed("music")));

    Step("A writer in another process holds the folder lock");
    {
        int ready[2];
        if (pipe(ready) != 0) {
            return 1;
        }
        const pid_t holder = fork();
        if (holder == 0) {
            const int fd = open(FILEINDEX_FOLDER_LOCK_PATH, O_RDWR);
            flock(fd, LOCK_EX);
            (void)write(ready[1], "r", 1);
            pause();
            _exit(0);
        }
        char byte;
        (void)read(ready[0], &byte, 1);
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
        const bool got = IndexMgr::Get(record, "/photo/holiday");
        Show("IndexMgr::Get", std::string(got ? "succeeded" : "failed") + ", error code " +
                                  std::to_string(ErrorHandler::GetError()) + " (lock)");
        kill(holder, SIGKILL);
        waitpid(holder, nullptr, 0);
        close(ready[0]);
        close(ready[1]);
    }

    Step("Change monitoring registered by the upsert");
    Show("registrations", ReadText(kState + "/monitor_queues.json"));

    Step("Pause, resume, out of space, revive");
    Show("StatusMgr::Pause(2)", StatusMgr::Pause(2) ? "sent" : "failed");
    long long resumeTime = 0;
    StatusMgr::GetPauseInfo(resumeTime);
    Show("resume_time", std::to_string(resumeTime));
    Show("StatusMgr::Resume()", StatusMgr::Resume() ? "sent" : "failed");
    Show("StatusMgr::ShareSetNoSpace(photo)", StatusMgr::ShareSetNoSpace("photo", true) ? "marked" : "failed");
    Show("StatusMgr::ShareRevive(photo)", StatusMgr::ShareRevive("photo") ? "sent" : "failed");
    Show("status.conf", ReadText(FILEINDEX_STATUS_CONF_PATH));

    Step("Events in the photo share's queue");
    GetFullPath(fullPath, "/photo/holiday");
    AddCustomEvent(65536, fullPath, Json::Value());
    Json::Value report;
    report["photo"] = true;
    Show("AddCustomEvent(131072) after a pending reindex", AddCustomEvent(131072, fullPath, report) ? "true" : "false");
    char queue[4096];
    FILEIDXQueuePathGet("photo", queue, sizeof(queue));
    Show("queue", ReadText(queue));

    Step("A reindex, the photo share paused and resumed, the video folder removed");
    Json::Value paths;
    paths.append("/photo/holiday");
    Show("IndexMgr::Reindex([/photo/holiday])", IndexMgr::Reindex(paths) ? "queued" : "failed");
    Show("IndexMgr::SharePause(photo)", IndexMgr::SharePause("photo") ? "paused" : "failed");
    Show("IndexMgr::ShareResume(photo)", IndexMgr::ShareResume("photo") ? "resumed" : "failed");
    Json::Value removed;
    removed.append("/video");
    Show("IndexMgr::Delete([/video])", IndexMgr::Delete(removed) ? "removed, video's index data wiped" : "failed");
    Show("folder.conf", ReadText(FILEINDEX_FOLDER_CONF_PATH));

    Step("What reached the platform (journal of the emulation)");
    std::cout << ReadText(kState + "/journal.jsonl");

    VLIBServiceStop("fileindexd", 1);
    Step("Commands the stand-in daemon received");
    std::cout << ReadText(kCommandsFile);
    return 0;
}
