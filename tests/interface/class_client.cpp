// A C++ management program on libfileindex.so: the classes and free functions of the exported
// headers, used in the appliance that run_in_appliance.cmake makes under the root given as the
// only argument. A writer's cycle goes through Config's virtual interface, as in the library.
#include <cstdio>
#include <string>
#include <vector>

#include "fileindex/config.h"
#include "fileindex/error.h"
#include "fileindex/folder.h"
#include "fileindex/index_mgr.h"
#include "fileindex/status.h"
#include "fileindex/utils.h"

using namespace VEXO::FILEINDEX;

namespace {

int g_failed = 0;

void Check(bool holds, const char *what)
{
    if (!holds) {
        fprintf(stderr, "failed: %s\n", what);
        ++g_failed;
    }
}

#define CHECK(condition) Check((condition), #condition)

}  // namespace

int main(int argc, char **argv)
{
    if (argc != 2) {
        fprintf(stderr, "usage: %s ROOT\n", argv[0]);
        return 2;
    }
    const std::string share = std::string(argv[1]) + "/volume1/photo";

    Folders folders;
    Config &config = folders;
    Json::Value request;
    request["path"] = "/photo/holiday/best";
    request["document"] = true;
    request["photo"] = true;
    Json::Value report;
    CHECK(config.Lock(true) && config.Load() && folders.Upsert(report, request) && config.Save());
    config.Unlock();
    CHECK(report["document"].asBool() && !report["photo"].asBool());

    std::vector<Folder> list;
    CHECK(IndexMgr::List(list) && list.size() == 2 && list[1].m_path == "/photo/holiday/best" && list[1].m_bDocument);
    CHECK(list[0].GetFullPath() == share + "/holiday" && list[0].asJson()["name"].asString() == "Holiday");
    Json::Value record;
    CHECK(IndexMgr::Get(record, "/photo/holiday") && record["photo"].asBool());
    ErrorHandler::SetError(FILEIDX_ERR_NONE);
    CHECK(!IndexMgr::Get(record, "/photo/none") && ErrorHandler::GetError() == FILEIDX_ERR_NO_SUCH_FOLDER &&
          ErrorHandler::g_error_code == FILEIDX_ERR_NO_SUCH_FOLDER);
    CHECK(IndexMgr::IsPathIndexed("/photo/holiday/a") && IndexMgr::IsPathContainIndexed("/photo") &&
          IndexMgr::IsFullPathIndexed(share + "/holiday/a") && IndexMgr::IsShareIndexed("photo"));

    long long resumeTime = 0;
    CHECK(StatusMgr::SetUpdated("interface") && StatusMgr::IsUpdated("interface"));
    CHECK(StatusMgr::ShareSetNeedReindex("photo", true) && StatusMgr::ShareIsNeedReindex("photo"));
    CHECK(StatusMgr::GetPauseInfo(resumeTime) && resumeTime == -1);
    Status status;
    CHECK(status.Load() && status.ShareIsNeedReindex("photo") && !status.ShareIsNoSpace("photo"));

    std::string name;
    std::string fullPath;
    std::string sharePath;
    CHECK(GetShareNameByPath(name, "/photo/a") && name == "photo");
    CHECK(GetFullPath(fullPath, "/photo/a") && fullPath == share + "/a");
    CHECK(GetShareNamePathByFullPath(name, sharePath, share + "/a") && sharePath == share);
    CHECK(ReplaceShareName("/photo/a", "video") == "/video/a" && StringStartWith("/photo/a", "/photo"));
    CHECK(IsDirExist(share) && !IsFileExist(share) && LOG_LEVEL == 3);
    return g_failed == 0 ? 0 : 1;
}
