#include "folder/change_report.h"

#include "fileindex/utils.h"

namespace VEXO {
namespace FILEINDEX {

Json::Value GetMostSuitableCfg(const std::vector<Folder> &folders, const std::string &fullPath)
{
    const std::string inside = fullPath + "/";
    const Folder *governing = nullptr;
    for (const Folder &folder : folders) {
        const std::string folderPath = folder.GetFullPath();
        if (!folderPath.empty() && StringStartWith(inside, folderPath + "/")) {
            governing = &folder;
        }
    }
    return governing != nullptr ? governing->asJson() : Json::Value(Json::objectValue);
}

Json::Value DiffMediaTypes(const Json::Value &a, const Json::Value &b)
{
    Json::Value report(Json::objectValue);
    for (const char *medium : {"document", "audio", "video", "photo"}) {
        report[medium] = a.isMember(medium) && b.isMember(medium) ? a[medium].asBool() != b[medium].asBool() : true;
    }
    return report;
}

}  // namespace FILEINDEX
}  // namespace VEXO
