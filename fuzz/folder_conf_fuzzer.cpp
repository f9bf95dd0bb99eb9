// folder.conf as the folder list reads it. Whatever the file holds, Load answers without crashing
// or throwing, and the list the queries read straight from the text is the one Load gives; a list
// it accepts holds one folder per member, each found again by its own path, and saving that list
// and loading it afresh gives the same folders byte for byte.
#include <algorithm>
#include <cstdlib>
#include <vector>

#include "appliance_paths.h"
#include "config/json_io.h"
#include "fileindex/folder.h"
#include "fileindex/index_mgr.h"
#include "fuzz/fuzz_sandbox.h"

using namespace VEXO::FILEINDEX;

namespace {

bool SameFolders(const std::vector<Folder> &a, const std::vector<Folder> &b)
{
    const auto same = [](const Folder &x, const Folder &y) {
        return x.m_path == y.m_path && x.m_fullPath == y.m_fullPath && x.m_name == y.m_name &&
               x.m_bDocument == y.m_bDocument && x.m_bAudio == y.m_bAudio && x.m_bVideo == y.m_bVideo &&
               x.m_bPhoto == y.m_bPhoto;
    };
    return a.size() == b.size() && std::equal(a.begin(), a.end(), b.begin(), same);
}

std::vector<Json::Value> Records(Folders &folders)
{
    std::vector<Folder> list;
    folders.List(list);
    std::vector<Json::Value> records;
    for (const Folder &folder : list) {
        Json::Value stored;
        if (!folders.Get(stored, folder.m_path) || stored != folder.asJson() ||
            !IndexMgr::IsPathIndexed(folder.m_path, list)) {
            abort();
        }
        records.push_back(stored);
    }
    return records;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    fileindex_fuzz::WriteInput(FILEINDEX_FOLDER_CONF_PATH, data, size);
    std::vector<Folder> fromText;
    const bool listed = IndexMgr::List(fromText);
    Folders folders;
    std::vector<Folder> loaded;
    if (listed != (folders.Load() && folders.List(loaded)) || (listed && !SameFolders(fromText, loaded))) {
        abort();
    }
    if (!listed) {
        return 0;
    }
    Json::Value document;
    const std::vector<Json::Value> records = Records(folders);
    if (!fromString(document, std::string(reinterpret_cast<const char *>(data), size)) ||
        records.size() != document.size()) {
        abort();
    }

    if (!folders.Save()) {
        abort();
    }
    Folders reloaded;
    if (!reloaded.Load() || Records(reloaded) != records) {
        abort();
    }
    return 0;
}
