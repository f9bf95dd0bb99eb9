// What other users of the appliance, a stalled daemon or a damaged file can do to a caller: no
// hang, no damaged frame, no write through a planted link, no lost descriptor, no exception.
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstring>
#include <functional>
#include <map>

#include "config/file_io.h"
#include "daemon/queue_record.h"
#include "fileindex/error.h"
#include "fileindex/fileidx.h"
#include "fileindex/folder.h"
#include "fileindex/status.h"
#include "fileindex/utils.h"
#include "share/storage_paths.h"
#include "tests/support/child.h"
#include "tests/support/frame_listener.h"
#include "tests/support/log_capture.h"
#include "tests/support/sandbox.h"
#include "tests/support/syscall_faults.h"

using namespace VEXO::FILEINDEX;

namespace fileindex_test {
namespace {

const std::string kStatusConf = FILEINDEX_STATUS_CONF_PATH;
const std::string kStatusLock = FILEINDEX_STATUS_LOCK_PATH;
const std::string kConfigDir = stdfs::path(kStatusConf).parent_path();

// The n-th call of a kind (counting from 0) within one operation, and what failing it must give.
using CallSite = std::pair<Syscall, int>;
struct Outcome {
    bool changed;  // the call succeeds and the file holds the change; else the file is as it was
    std::vector<std::string> log;
    _tag_fileindex_err_ error;
};

// Runs change(seq) once without faults to learn its calls on files under scope, then once per
// call with that call failing (EIO), checking the outcome of its row and, through check (given the
// file as it was before), what the mechanism adds. Every call needs a row, and every row a call.
void RunFaultLoop(const std::string &scope, const std::string &file, const std::map<CallSite, Outcome> &outcomes,
                  const std::function<bool(int seq)> &change, const std::function<void(bool changed, int seq, const std::string &before)> &check)
{
    std::vector<Syscall> calls;
    {
        SyscallTrace trace(scope);
        ASSERT_TRUE(change(0));
        calls = trace.Calls();
    }
    ASSERT_EQ(calls.size(), outcomes.size()) << "every call needs its row";
    std::map<Syscall, int> seen;
    for (size_t i = 0; i < calls.size(); ++i) {
        const CallSite site(calls[i], seen[calls[i]]++);
        const int seq = static_cast<int>(i) + 1;
        SCOPED_TRACE(std::string(SyscallName(site.first)) + " #" + std::to_string(site.second));
        ASSERT_EQ(outcomes.count(site), 1u) << "a call without a row";
        const Outcome &expected = outcomes.at(site);
        const std::string before = ReadFile(file);
        const size_t descriptors = OpenDescriptorCount();
        LogCapture::Clear();
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
        {
            SyscallFault fault(site.first, EIO, scope, site.second);
            EXPECT_EQ(change(seq), expected.changed);
            EXPECT_EQ(fault.Hits(), 1);
        }
        EXPECT_EQ(ReadFile(file) == before, !expected.changed);
        EXPECT_EQ(LogCapture::Messages(), expected.log);
        EXPECT_EQ(ErrorHandler::GetError(), expected.error);
        EXPECT_EQ(OpenDescriptorCount(), descriptors);
        check(expected.changed, seq, before);
        EXPECT_TRUE(change(seq + 1000)) << "the next call";
    }
}

class HardeningTest : public SandboxTest {
protected:
    void SetUp() override
    {
        SandboxTest::SetUp();
        DeclareShares("volume1/photo");
        m_metadataDir = MetadataDirPath(SharePath("photo"));
        stdfs::create_directories(m_metadataDir);
        m_queue = StoragePath(SharePath("photo"), kQueueFileName);
        m_folder = SharePath("photo") + "/holiday";
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
    }

    // The queue line of a folder-setting event for m_folder whose data is {"seq": seq}.
    std::string Record(int seq) const
    {
        return "{\"data\":{\"seq\":" + std::to_string(seq) + "},\"event\":131072,\"path\":\"" + m_folder + "\"}\n";
    }
    bool AddEvent(int seq) const
    {
        Json::Value data;
        data["seq"] = seq;
        return AddCustomEvent(kEventFolderSettingChanged, m_folder, data);
    }

    std::string m_metadataDir;
    std::string m_queue;
    std::string m_folder;
};

// A daemon that is alive but stuck must cost a status writer about a second, leave the status lock
// free, and never receive a frame with bytes repeated or skipped: the whole frame or a cut one.
TEST_F(HardeningTest, StuckDaemonCostsAboutASecondAndGetsNoDamagedFrame)
{
    const struct {
        FrameListener::Mode mode;
        size_t shareNameLength;  // the frame must outgrow the socket buffer for the stall to bite
    } cases[] = {
        {FrameListener::Mode::kBacklogFull, 5},
        {FrameListener::Mode::kStallThenRead, 1 << 20},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(static_cast<int>(c.mode));
        FrameListener daemon(c.mode);
        LogCapture::Clear();
        const std::string share(c.shareNameLength, 's');
        const auto start = std::chrono::steady_clock::now();
        EXPECT_FALSE(StatusMgr::ShareRevive(share));
        EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(2000));
        EXPECT_FALSE(IsLockHeld(kStatusLock));
        EXPECT_EQ(LogCapture::Messages(), std::vector<std::string>{"SendCammandToDaemon failed"});
        if (c.mode == FrameListener::Mode::kStallThenRead) {
            const std::string text = "{\"data\":{\"share_name\":\"" + share + "\"},\"type\":\"revive_share_worker\"}";
            const uint32_t length = static_cast<uint32_t>(text.size() + 1);
            const std::string frame = std::string(reinterpret_cast<const char *>(&length), 4) + text + '\0';
            const std::string received = daemon.Connections(1).at(0);
            EXPECT_LT(received.size(), frame.size());
            EXPECT_TRUE(frame.compare(0, received.size(), received) == 0) << "the daemon received a damaged frame";
        }
    }
}

// A share user, or any account in /tmp, plants a symbolic link where the library writes. Whatever
// it points at stays as it was, nothing is created, and the caller gets an ordinary failure.
TEST_F(HardeningTest, PlantedLinksAreNeverWrittenThrough)
{
    const std::string victim = HostPath("/victim");
    const std::string victimDir = HostPath("/victimdir");
    const std::string missing = HostPath("/missing");
    const std::string database = StoragePath(SharePath("photo"), kDatabaseDirName);
    WriteFile(victim, "victim\n");
    stdfs::create_directories(victimDir);
    char buffer[4096];
    const std::function<bool()> addEvent = [&] { return AddEvent(1); };
    const std::function<bool()> databasePath = [&] { return FILEIDXDBPathGet("photo", buffer, sizeof(buffer)) > 0; };
    const std::function<bool()> statusChange = [] { return StatusMgr::SetUpdated("x"); };
    const std::function<bool()> folderLock = [] {
        Folders folders;
        const bool locked = folders.Lock(true);
        folders.Unlock();
        return locked;
    };
    const struct {
        std::string link;
        const std::string &target;
        const std::function<bool()> &call;
        bool result;
    } cases[] = {
        {m_queue, victim, addEvent, false},
        {m_queue, missing, addEvent, false},
        {QueueCompanionPath(m_queue), victim, addEvent, true},
        {m_metadataDir, victimDir, addEvent, false},
        {m_metadataDir, victimDir, databasePath, true},
        {database, missing, databasePath, true},
        {kStatusLock, missing, statusChange, false},
        {FILEINDEX_FOLDER_LOCK_PATH, victim, folderLock, false},
        {FILEINDEX_FOLDER_LOCK_PATH, missing, folderLock, false},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.link + " -> " + c.target);
        stdfs::remove_all(c.link);
        ASSERT_EQ(symlink(c.target.c_str(), c.link.c_str()), 0);
        const size_t descriptors = OpenDescriptorCount();
        EXPECT_EQ(c.call(), c.result);
        EXPECT_EQ(OpenDescriptorCount(), descriptors);
        EXPECT_EQ(ReadFile(victim), "victim\n");
        EXPECT_FALSE(stdfs::exists(missing));
        EXPECT_TRUE(stdfs::is_empty(victimDir));
        stdfs::remove(c.link);
        stdfs::create_directories(m_metadataDir);
    }
}

// An append cut short (disk full, file-size limit) or a writer killed mid-append must not make the
// next record unreadable: each record ends up whole on its own line, or not in the queue at all.
TEST_F(HardeningTest, CutAppendNeverSpoilsTheNextRecord)
{
    const struct {
        std::string before;
        bool cutByTheSizeLimit;  // else the queue already ends in a torn record
        std::string after;
    } cases[] = {
        {Record(0), true, Record(0) + Record(2)},
        {Record(0) + "{\"data\":{\"seq\":1},\"ev", false, Record(0) + "{\"data\":{\"seq\":1},\"ev\n" + Record(2)},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.after);
        WriteFile(m_queue, c.before);
        stdfs::remove(kStatusConf);
        if (c.cutByTheSizeLimit) {
            const rlim_t limitBytes = c.before.size() + 20;
            Child cut([&](const Child::Ready &) {
                signal(SIGXFSZ, SIG_IGN);
                const rlimit limit = {limitBytes, limitBytes};
                setrlimit(RLIMIT_FSIZE, &limit);
                _exit(AddEvent(1) ? 0 : 1);
            });
            EXPECT_EQ(cut.Wait(), 1);
            EXPECT_EQ(ReadFile(m_queue), c.before) << "the cut record is taken back off";
            EXPECT_TRUE(StatusMgr::ShareIsNeedReindex("photo"));
        }
        ASSERT_TRUE(AddEvent(2));
        EXPECT_EQ(ReadFile(m_queue), c.after);
    }
}

// A temporary file of a saver that died, or that has sat for over an hour (its process number may
// since belong to another program), is swept by the next save; a recent one of a live saver stays.
TEST_F(HardeningTest, SaveSweepsTemporariesOfGoneOrLongStalledSavers)
{
    const pid_t gone = fork();
    if (gone == 0) {
        _exit(0);
    }
    waitpid(gone, nullptr, 0);
    const struct {
        pid_t pid;
        int ageSeconds;
        bool swept;
    } cases[] = {
        {gone, 0, true},
        {getpid(), 7200, true},
        {getpid(), 60, false},
        {1, 3000, false},
    };
    std::vector<std::string> temporaries;
    for (const auto &c : cases) {
        std::string name = TempFileTemplate(kStatusConf, c.pid);
        temporaries.push_back(name.replace(name.size() - 1, 1, std::to_string(temporaries.size())));
        WriteFile(temporaries.back(), "{}");
        const timeval times[2] = {{time(nullptr) - c.ageSeconds, 0}, {time(nullptr) - c.ageSeconds, 0}};
        utimes(temporaries.back().c_str(), times);
    }
    ASSERT_TRUE(StatusMgr::SetUpdated("x"));
    for (size_t i = 0; i < temporaries.size(); ++i) {
        EXPECT_EQ(stdfs::exists(temporaries[i]), !cases[i].swept) << temporaries[i];
    }
}

// Each system call of a save and of an event append, failed on its own: the previous content stays
// (or the change is whole), no temporary file or descriptor is left, the error code and log line are
// the ones the failure calls for, no lock stays held, and the next call succeeds.
TEST_F(HardeningTest, EachFailedCallOfAStatusSaveLeavesTheFileAsItWas)
{
    const Outcome notLoaded = {false, {"Failed to load json from " + kStatusConf}, FILEIDX_ERR_LOAD_CONFIG};
    const Outcome notSaved = {false, {"Failed to save json to " + kStatusConf}, FILEIDX_ERR_SAVE_CONFIG};
    const Outcome saved = {true, {}, FILEIDX_ERR_NONE};
    const std::map<CallSite, Outcome> outcomes = {
        {{Syscall::kOpen, 0}, notLoaded}, {{Syscall::kRead, 0}, notLoaded}, {{Syscall::kRead, 1}, notLoaded},
        {{Syscall::kClose, 0}, saved},  // what was read is whole
        {{Syscall::kMkostemp, 0}, notSaved}, {{Syscall::kFchmod, 0}, notSaved}, {{Syscall::kWrite, 0}, notSaved},
        {{Syscall::kFsync, 0}, notSaved}, {{Syscall::kClose, 1}, notSaved}, {{Syscall::kRename, 0}, notSaved},
        // Syncing the directory comes after the rename: the document is replaced already.
        {{Syscall::kOpen, 1}, saved}, {{Syscall::kFsync, 1}, saved}, {{Syscall::kClose, 2}, saved},
        {{Syscall::kChmod, 0}, {true, {"chmod failed, path=" + kStatusConf}, FILEIDX_ERR_NONE}},
    };
    const auto mark = [](int seq) { return "mark" + std::to_string(seq); };
    ASSERT_TRUE(StatusMgr::SetUpdated("first"));
    RunFaultLoop(
        kConfigDir, kStatusConf, outcomes, [&](int seq) { return StatusMgr::SetUpdated(mark(seq)); },
        [&](bool changed, int seq, const std::string &) {
            EXPECT_EQ(ParseJson(ReadFile(kStatusConf)).isMember(mark(seq)), changed);
            for (const stdfs::directory_entry &entry : stdfs::directory_iterator(kConfigDir)) {
                EXPECT_EQ(entry.path().filename().string().find(".tmp."), std::string::npos) << entry.path();
            }
            EXPECT_FALSE(IsLockHeld(FILEINDEX_STATUS_LOCK_PATH));
        });

    // A device that accepts nothing, without an error, fails the save instead of spinning.
    const std::string before = ReadFile(kStatusConf);
    {
        SyscallFault fault(Syscall::kWrite, SyscallFault::kNothingWritten, kConfigDir, 0);
        EXPECT_FALSE(StatusMgr::SetUpdated("never"));
        EXPECT_EQ(fault.Hits(), 1);
    }
    EXPECT_EQ(ReadFile(kStatusConf), before);
}

TEST_F(HardeningTest, EachFailedCallOfAnAppendLeavesTheQueueWholeOrMarksTheShare)
{
    // Looking for a pending reindex fails: logged, and the event is appended all the same.
    const Outcome scanFailed = {true, {"Failed to open queue=" + m_queue + ", reason=Input/output error"}, FILEIDX_ERR_NONE};
    const Outcome appended = {true, {}, FILEIDX_ERR_NONE};
    const Outcome shareMarked = {false, {}, FILEIDX_ERR_NONE};
    const std::map<CallSite, Outcome> outcomes = {
        {{Syscall::kOpen, 0}, scanFailed}, {{Syscall::kOpenat, 0}, scanFailed}, {{Syscall::kClose, 0}, appended},
        {{Syscall::kFstat, 0}, scanFailed}, {{Syscall::kRead, 0}, scanFailed}, {{Syscall::kRead, 1}, scanFailed},
        {{Syscall::kClose, 1}, appended},
        // Appending.
        {{Syscall::kOpen, 1}, shareMarked}, {{Syscall::kOpenat, 1}, shareMarked}, {{Syscall::kClose, 2}, appended},
        {{Syscall::kFstat, 1}, shareMarked}, {{Syscall::kFlock, 0}, shareMarked}, {{Syscall::kLseek, 0}, shareMarked},
        {{Syscall::kPread, 0}, shareMarked}, {{Syscall::kWrite, 0}, shareMarked}, {{Syscall::kFlock, 1}, appended},
        {{Syscall::kClose, 3}, appended},
    };
    WriteFile(m_queue, Record(-1));
    RunFaultLoop(
        SharePath("photo"), m_queue, outcomes,
        [&](int seq) { return AddEvent(seq); },
        [&](bool changed, int seq, const std::string &before) {
            EXPECT_EQ(ReadFile(m_queue), changed ? before + Record(seq) : before);
            EXPECT_EQ(StatusMgr::ShareIsNeedReindex("photo"), !changed);
            EXPECT_FALSE(IsLockHeld(m_queue));
            ASSERT_TRUE(StatusMgr::ShareSetNeedReindex("photo", false));
        });
}

}  // namespace
}  // namespace fileindex_test
