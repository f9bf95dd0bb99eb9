// status.conf as the status file reads and answers it. Whatever the file holds, loading and every
// question asked of it answer without crashing or throwing, and the status manager's readers, which
// load the file themselves, give the same answers as the loaded document.
#include <cstdlib>
#include <string>
#include <vector>

#include "appliance_paths.h"
#include "config/json_io.h"
#include "fileindex/status.h"
#include "fuzz/fuzz_sandbox.h"

using namespace VEXO::FILEINDEX;

namespace {

// Names worth asking about: fixed ones, and the member names the input mentions at its top level
// and inside its mark objects.
std::vector<std::string> NamesIn(const uint8_t *data, size_t size)
{
    std::vector<std::string> names = {"", "photo", "resume_time", "no_space", "need_reindex"};
    Json::Value document;
    if (!fromString(document, std::string(reinterpret_cast<const char *>(data), size)) || !document.isObject()) {
        return names;
    }
    for (const std::string &name : document.getMemberNames()) {
        names.push_back(name);
        if (document[name].isObject()) {
            const std::vector<std::string> marked = document[name].getMemberNames();
            names.insert(names.end(), marked.begin(), marked.end());
        }
    }
    return names;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    fileindex_fuzz::WriteInput(FILEINDEX_STATUS_CONF_PATH, data, size);
    Status status;
    const bool loaded = status.Load();
    for (const std::string &name : NamesIn(data, size)) {
        const bool updated = loaded && status.IsUpdated(name);
        const bool noSpace = loaded && status.ShareIsNoSpace(name);
        const bool needReindex = loaded && status.ShareIsNeedReindex(name);
        if (StatusMgr::IsUpdated(name) != updated || StatusMgr::ShareIsNoSpace(name) != noSpace ||
            StatusMgr::ShareIsNeedReindex(name) != needReindex) {
            abort();
        }
    }
    long long fromDocument = 0;
    long long fromManager = 0;
    const bool paused = loaded && status.GetPauseInfo(fromDocument);
    if (StatusMgr::GetPauseInfo(fromManager) != paused || (paused && fromManager != fromDocument)) {
        abort();
    }
    return 0;
}
