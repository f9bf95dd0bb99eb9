// The folder setting that governs a full path, and the per-medium difference of two settings.
#include "folder/change_report.h"

#include "fileindex/utils.h"

namespace VEXO {
namespace FILEINDEX {

Json::Value GetMostSuitableCfg(const std::vector<Folder> &folders, const std::string &fullPath)
{
    GoverningSetting governing(fullPath);
    for (const Folder &folder : folders) {
        governing.Consider(folder);
    }
    return governing.Record();
}

void GoverningSetting::Consider(const Folder &folder)
{
    const std::string resolved = folder.m_fullPath.empty() ? folder.GetFullPath() : std::string();
    const std::string &folderPath = folder.m_fullPath.empty() ? resolved : folder.m_fullPath;
    // fullPath + "/" begins with folderPath + "/".
    if (!folderPath.empty() && StringStartWith(m_fullPath, folderPath) &&
        (m_fullPath.size() == folderPath.size() || m_fullPath[folderPath.size()] == '/')) {
        m_governing = &folder;
    }
}

Json::Value GoverningSetting::Record() const
{
    return m_governing != nullptr ? m_governing->asJson() : Json::Value(Json::objectValue);
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
