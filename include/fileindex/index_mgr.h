// IndexMgr: the operations management programs call on the index.
#ifndef FILEINDEX_INDEX_MGR_H
#define FILEINDEX_INDEX_MGR_H

#include <string>
#include <vector>

#include <json/value.h>

#include "fileindex/export.h"
#include "fileindex/folder.h"

namespace VEXO {
namespace FILEINDEX {

class FILEINDEX_EXPORT IndexMgr {
public:
    // ---- Folder lists and lookup ----

    // All folder settings, in path order, read without the folder lock (a concurrent writer's save
    // is seen either whole or not at all). False with error 6 or 8 when folder.conf is unreadable.
    static bool List(std::vector<Folder> &out);
    // A sorted page of the folder list with computed information, as Folders::List of the same form
    // (see folder.h), read without the folder lock. False, out untouched, with error 6 or 8 when
    // folder.conf is unreadable. "status" costs one progress query per folder on the page.
    static bool List(Json::Value &out, unsigned long offset, unsigned long limit, const std::string &sort_by,
                     const std::string &sort_direction, const Json::Value &additional);
    // One folder's record, read under the folder lock (the one reader that locks). Failures: error 9
    // when another process holds the lock, 6 or 8 when folder.conf is unreadable, 4 when the path
    // is not in the list.
    static bool Get(Json::Value &out, const std::string &path);

    // ---- Indexed-path queries ----
    // A path P lies inside a folder F when P + "/" begins with F + "/", byte for byte. The forms
    // without a folder list read folder.conf afresh (without its lock) and answer false when it
    // cannot be read.

    // path is an indexed folder or lies below one (share-relative paths).
    static bool IsPathIndexed(const std::string &path, const std::vector<Folder> &folders);
    static bool IsPathIndexed(const std::string &path);
    // path is an indexed folder or an ancestor of one: opening it shows indexed content.
    static bool IsPathContainIndexed(const std::string &path, const std::vector<Folder> &folders);
    static bool IsPathContainIndexed(const std::string &path);
    // As IsPathIndexed, for a full path against the folders' full paths.
    static bool IsFullPathIndexed(const std::string &fullPath, const std::vector<Folder> &folders);
    static bool IsFullPathIndexed(const std::string &fullPath);
    // Some folder lies in the share (exact, case-sensitive name). A folder whose share name cannot
    // be cut from its path logs "Failed to get share name from path: <path>" and is passed over.
    static bool IsShareIndexed(const std::string &share);

    // ---- Change-monitor registration ----

    // (Re)registers the share's monitor queue with the notification daemon, owner "fileindex",
    // type 1: {"queue": the share's event queue file, "config": one {"path": full path,
    // "mask": 65486, "ignore": ["@eaDir"]} per indexed folder of the share, in path order}. Reads
    // folder.conf without its lock; a share without folders is registered with an empty "config".
    // Failures, each false with nothing sent when before the registration: queue path unknown
    // ("FILEIDXQueuePathGet failed, share=..."), folder.conf unreadable, a folder that does not
    // resolve ("GetFullPath failed, path=..."), a description the client refuses (no log line),
    // the registration refused ("MonitorQueue::Add failed"). Nothing is rolled back.
    static bool UpsertVNotifydCfg(const std::string &share);
    // Removes the share's registration. Failures: "FILEIDXQueuePathGet failed, share=...",
    // "MonitorQueue::Delete failed".
    static bool DeleteVNotifydCfg(const std::string &share);
};

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
