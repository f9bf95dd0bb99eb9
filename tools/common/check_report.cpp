// The report of what the index makes of a path, for fileindexctl check and the panel.
#include "check_report.h"

#include "fileindex/index_mgr.h"
#include "fileindex/utils.h"
#include "path_encoding.h"

namespace fileindex_tool {

using namespace VEXO::FILEINDEX;

Json::Value CheckReport(const std::string &path)
{
    Json::Value check;
    SetBytesMember(check, "path", path);
    std::string fullPath;
    const bool resolved = GetFullPath(fullPath, path);
    if (resolved) {
        SetBytesMember(check, "full_path", fullPath);
    } else {
        check["full_path"] = Json::Value();
        check["full_path_bytes"] = Json::Value();
    }
    check["indexed"] = IndexMgr::IsPathIndexed(path);
    check["contains_indexed"] = IndexMgr::IsPathContainIndexed(path);
    const IndexRefusal refusal = GetPathIndexRefusal(path);
    check["may_be_indexed"] = refusal == IndexRefusal::kNone;
    check["refusal"] = IndexRefusalName(refusal);
    check["refusal_text"] = IndexRefusalText(refusal);
    check["crawler_skips"] = Json::Value();
    check["skip_refusal"] = Json::Value();
    check["skip_refusal_text"] = Json::Value();
    if (resolved) {
        const IndexRefusal skip = GetSkipIndexRefusal(fullPath);
        check["crawler_skips"] = skip != IndexRefusal::kNone;
        check["skip_refusal"] = IndexRefusalName(skip);
        check["skip_refusal_text"] = IndexRefusalText(skip);
    }
    return check;
}

}  // namespace fileindex_tool
