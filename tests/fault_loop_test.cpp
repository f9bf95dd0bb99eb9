// Each system call of a save and of an event append, failed on its own: the previous content stays
// (or the change is whole), no temporary file or descriptor is left, the error code and log line are
// the ones the failure calls for, no lock stays held, and the next call succeeds.
#include <cerrno>
#include <map>

#include "daemon/queue_record.h"
#include "fileindex/error.h"
#include "fileindex/status.h"
#include "fileindex/utils.h"
#include "share/storage_paths.h"
#include "tests/support/log_capture.h"
#include "tests/support/sandbox.h"
#include "tests/support/syscall_faults.h"

using namespace VEXO::FILEINDEX;

namespace fileindex_test {
namespace {

const std::string kStatusConf = FILEINDEX_STATUS_CONF_PATH;
const std::string kConfigDir = stdfs::path(kStatusConf).parent_path();

// The n-th call of a kind (counting from 0) within one operation.
using CallSite = std::pair<Syscall, int>;

std::string Name(const CallSite &site)
{
    return std::string(SyscallName(site.first)) + "#" + std::to_string(site.second);
}

// The call sites of one fault-free run of op on files under scope.
template <typename Op>
std::vector<CallSite> TraceOf(const std::string &scope, const Op &op)
{
    std::vector<Syscall> calls;
    {
        SyscallTrace trace(scope);
        EXPECT_TRUE(op());
        calls = trace.Calls();
    }
    std::vector<CallSite> sites;
    std::map<Syscall, int> seen;
    for (const Syscall call : calls) {
        sites.emplace_back(call, seen[call]++);
    }
    return sites;
}

std::vector<std::string> TemporariesBesideStatusFile()
{
    std::vector<std::string> names;
    for (const stdfs::directory_entry &entry : stdfs::directory_iterator(kConfigDir)) {
        if (entry.path().filename().string().rfind("status.conf.", 0) == 0) {
            names.push_back(entry.path().filename());
        }
    }
    return names;
}

class FaultLoopTest : public SandboxTest {
protected:
    void SetUp() override
    {
        SandboxTest::SetUp();
        DeclareShares("volume1/photo");
        stdfs::create_directories(MetadataDirPath(SharePath("photo")));
    }
};

TEST_F(FaultLoopTest, EachFailedCallOfAStatusSaveLeavesTheFileAsItWas)
{
    const std::string loadFailed = "Failed to load json from " + kStatusConf;
    const std::string saveFailed = "Failed to save json to " + kStatusConf;
    struct Outcome {
        bool changed;
        std::string log;
        _tag_fileindex_err_ error;
    };
    const Outcome notLoaded = {false, loadFailed, FILEIDX_ERR_LOAD_CONFIG};
    const Outcome notSaved = {false, saveFailed, FILEIDX_ERR_SAVE_CONFIG};
    const Outcome saved = {true, "", FILEIDX_ERR_NONE};
    const std::map<CallSite, Outcome> outcomes = {
        {{Syscall::kOpen, 0}, notLoaded},       // reading the file
        {{Syscall::kRead, 0}, notLoaded},
        {{Syscall::kRead, 1}, notLoaded},
        {{Syscall::kClose, 0}, saved},          // what was read is whole
        {{Syscall::kMkostemp, 0}, notSaved},    // the temporary file
        {{Syscall::kFchmod, 0}, notSaved},
        {{Syscall::kWrite, 0}, notSaved},
        {{Syscall::kFsync, 0}, notSaved},
        {{Syscall::kClose, 1}, notSaved},
        {{Syscall::kRename, 0}, notSaved},
        {{Syscall::kOpen, 1}, saved},           // syncing the directory, after the rename
        {{Syscall::kFsync, 1}, saved},
        {{Syscall::kClose, 2}, saved},
        {{Syscall::kChmod, 0}, {true, "chmod failed, path=" + kStatusConf, FILEIDX_ERR_NONE}},
    };
    ASSERT_TRUE(StatusMgr::SetUpdated("first"));
    const std::vector<CallSite> sites = TraceOf(kConfigDir, [] { return StatusMgr::SetUpdated("traced"); });
    ASSERT_EQ(sites.size(), outcomes.size()) << "every call of a save needs its row";
    for (size_t i = 0; i < sites.size(); ++i) {
        const std::string mark = "mark" + std::to_string(i);
        SCOPED_TRACE(Name(sites[i]));
        ASSERT_EQ(outcomes.count(sites[i]), 1u) << "a call without a row";
        const Outcome &expected = outcomes.at(sites[i]);
        const std::string before = ReadFile(kStatusConf);
        const size_t descriptors = OpenDescriptorCount();
        LogCapture::Clear();
        ErrorHandler::SetError(FILEIDX_ERR_NONE);
        {
            SyscallFault fault(sites[i].first, EIO, kConfigDir, sites[i].second);
            EXPECT_EQ(StatusMgr::SetUpdated(mark), expected.changed);
            EXPECT_EQ(fault.Hits(), 1);
        }
        if (expected.changed) {
            EXPECT_TRUE(ParseJson(ReadFile(kStatusConf)).isMember(mark));
        } else {
            EXPECT_EQ(ReadFile(kStatusConf), before);
        }
        EXPECT_EQ(LogCapture::Messages(), expected.log.empty() ? std::vector<std::string>{} : std::vector<std::string>{expected.log});
        EXPECT_EQ(ErrorHandler::GetError(), expected.error);
        EXPECT_TRUE(TemporariesBesideStatusFile().empty());
        EXPECT_EQ(OpenDescriptorCount(), descriptors);
        EXPECT_FALSE(IsLockHeld(FILEINDEX_STATUS_LOCK_PATH));
        EXPECT_TRUE(StatusMgr::SetUpdated("next" + std::to_string(i)));
    }
    // A device that accepts nothing, without an error, fails the save instead of spinning.
    const std::string before = ReadFile(kStatusConf);
    {
        SyscallFault fault(Syscall::kWrite, SyscallFault::kNothingWritten, kConfigDir, 0);
        EXPECT_FALSE(StatusMgr::SetUpdated("never"));
        EXPECT_EQ(fault.Hits(), 1);
    }
    EXPECT_EQ(ReadFile(kStatusConf), before);
}

TEST_F(FaultLoopTest, EachFailedCallOfAnAppendLeavesTheQueueWholeOrMarksTheShare)
{
    const std::string queue = StoragePath(SharePath("photo"), kQueueFileName);
    const std::string folder = SharePath("photo") + "/holiday";
    const auto record = [&](int seq) {
        return "{\"data\":{\"seq\":" + std::to_string(seq) + "},\"event\":131072,\"path\":\"" + folder + "\"}\n";
    };
    const auto addEvent = [&](int seq) {
        Json::Value data;
        data["seq"] = seq;
        return AddCustomEvent(kEventFolderSettingChanged, folder, data);
    };
    enum Outcome { kAppended, kScanFailedThenAppended, kShareMarked };
    const std::map<CallSite, Outcome> outcomes = {
        {{Syscall::kOpen, 0}, kScanFailedThenAppended},  // looking for a pending reindex
        {{Syscall::kOpenat, 0}, kScanFailedThenAppended},
        {{Syscall::kClose, 0}, kAppended},
        {{Syscall::kFstat, 0}, kScanFailedThenAppended},
        {{Syscall::kRead, 0}, kScanFailedThenAppended},
        {{Syscall::kRead, 1}, kScanFailedThenAppended},
        {{Syscall::kClose, 1}, kAppended},
        {{Syscall::kOpen, 1}, kShareMarked},             // appending
        {{Syscall::kOpenat, 1}, kShareMarked},
        {{Syscall::kClose, 2}, kAppended},
        {{Syscall::kFstat, 1}, kShareMarked},
        {{Syscall::kFlock, 0}, kShareMarked},
        {{Syscall::kLseek, 0}, kShareMarked},
        {{Syscall::kPread, 0}, kShareMarked},
        {{Syscall::kWrite, 0}, kShareMarked},
        {{Syscall::kFlock, 1}, kAppended},
        {{Syscall::kClose, 3}, kAppended},
    };
    WriteFile(queue, record(0));
    const std::vector<CallSite> sites = TraceOf(SharePath("photo"), [&] { return addEvent(1); });
    ASSERT_EQ(sites.size(), outcomes.size()) << "every call of an append needs its row";
    for (size_t i = 0; i < sites.size(); ++i) {
        const int seq = 100 + static_cast<int>(i);
        SCOPED_TRACE(Name(sites[i]));
        ASSERT_EQ(outcomes.count(sites[i]), 1u) << "a call without a row";
        const Outcome expected = outcomes.at(sites[i]);
        const std::string before = ReadFile(queue);
        const size_t descriptors = OpenDescriptorCount();
        LogCapture::Clear();
        {
            SyscallFault fault(sites[i].first, EIO, SharePath("photo"), sites[i].second);
            EXPECT_EQ(addEvent(seq), expected != kShareMarked);
            EXPECT_EQ(fault.Hits(), 1);
        }
        EXPECT_EQ(ReadFile(queue), expected == kShareMarked ? before : before + record(seq));
        EXPECT_EQ(StatusMgr::ShareIsNeedReindex("photo"), expected == kShareMarked);
        EXPECT_EQ(LogCapture::Messages(),
                  expected == kScanFailedThenAppended
                      ? std::vector<std::string>{"Failed to open queue=" + queue + ", reason=Input/output error"}
                      : std::vector<std::string>{});
        EXPECT_EQ(OpenDescriptorCount(), descriptors);
        EXPECT_FALSE(IsLockHeld(queue));
        ASSERT_TRUE(StatusMgr::ShareSetNeedReindex("photo", false));
        EXPECT_TRUE(addEvent(seq + 1000));
    }
}

}  // namespace
}  // namespace fileindex_test
