// Which folder setting governs a full path, and how two settings differ per medium.
#ifndef FILEINDEX_FOLDER_CHANGE_REPORT_H
#define FILEINDEX_FOLDER_CHANGE_REPORT_H

#include <string>
#include <vector>

#include <json/value.h>

#include "fileindex/folder.h"

namespace VEXO {
namespace FILEINDEX {

// The record of the folder that governs fullPath: of the folders whose full path holds it by whole
// components, the LAST in list order, which need not be the innermost. An empty object when none.
Json::Value GetMostSuitableCfg(const std::vector<Folder> &folders, const std::string &fullPath);

// GetMostSuitableCfg for folders that are not in one vector: Consider each in list order (each
// folder's full path is taken as Folder::GetFullPath gives it, resolved afresh only when the folder
// has none), then Record. The folders must outlive the object.
class GoverningSetting {
public:
    explicit GoverningSetting(const std::string &fullPath) : m_fullPath(fullPath) {}
    void Consider(const Folder &folder);
    Json::Value Record() const;

private:
    const std::string &m_fullPath;
    const Folder *m_governing = nullptr;
};

// The change report of two settings: per medium "document", "audio", "video", "photo", true when
// the flags differ or when either setting lacks the member (no setting governed the path).
Json::Value DiffMediaTypes(const Json::Value &a, const Json::Value &b);

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
