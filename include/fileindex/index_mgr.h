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
    // Each share is looked up in the share database once per call, not once per folder.
    static bool List(std::vector<Folder> &out);
    // A sorted page of the folder list with computed information, as Folders::List of the same form
    // (see folder.h), read without the folder lock. False, out untouched, with error 6 or 8 when
    // folder.conf is unreadable. Each share is looked up once per call; "status" and "is_valid" are
    // each folder's own answers (StatusMgr::GetFolderStatus, CanPathBeIndexed) with each share's
    // facts, each queue file and status.conf read once for the whole page.
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

    // ---- Folder settings, end to end ----
    // The writers below hold the folder lock (exclusive, never waited for: a held lock fails them
    // with error 9 and "Failed to lock folder") from loading folder.conf to their return, across
    // the monitor registration, the service control, the daemon commands and the events that follow
    // the save; it is released on every path. folder.conf is saved once, before anything else is
    // done, and nothing done is rolled back when a later step fails. "Best effort" steps log their
    // failure and the operation goes on. Logged platform failures end in "err=[0x<code> <file>:<line>]",
    // the platform's last error.

    // Adds or changes the folder settings of request (an array of records as Folders::Upsert takes
    // them), in this order: each merged into folder.conf, which is saved; each share of the request
    // registered for change monitoring, once, in ascending name order; fileindexd started; SMB
    // Spotlight switched on when off, then "samba" restarted (best effort); one
    // "upsert_folder_setting" {"folder_path"} command per element, in request order; one event
    // 131072 per distinct path, in ascending path order, carrying the path's change report (the last
    // element's for a path given twice). An empty array saves, starts and switches all the same.
    // Failures (false): not an array, "Bad param: <request>", error 1; an element refused,
    // "Upsert failed, folder=<element>", nothing saved; an empty path, "GetShareNameByPath failed,
    // path=", nothing saved; a registration, "UpsertVNtifydCfg failed, share=<share>"; the start,
    // "VLIBServiceStart failed: err=[...]"; a command, "SendCammandToDaemon failed"; an event, as
    // Update. Lock, load and save failures are logged by Folders.
    static bool Upsert(const Json::Value &request);
    // The same as Upsert.
    static bool Add(const Json::Value &request);
    static bool Set(const Json::Value &request);
    // Queues event 131072 with data for the folder at path; no lock, no file, no command. Failures:
    // the path does not resolve, "GetFullPath failed, path=<path>", error 2; the event is not
    // written, "AddCustomEvent failed" (the share is then marked as needing a reindex).
    static bool Update(const std::string &path, const Json::Value &data);

    // Removes the folder settings of request (an array of paths) from folder.conf and saves it. While
    // folders remain: one "delete_folder_setting" {"folder_path"} command per element in request
    // order, then per path, in ascending order, Update with {path: change report}. When none remain:
    // fileindexd stopped and SMB Spotlight switched off when on, then "samba" restarted (all best
    // effort), no command, no event. Then each share of the request, in ascending order, is
    // registered again while it still has folders, or else has its index data wiped
    // (CleanShareIndexData) and its registration removed. A path not in the list is no error.
    // Failures (false): not an array of strings, "Bad param: <request>", error 1; "Delete failed,
    // path=" or "GetShareNameByPath failed, path=" (empty path), nothing saved; "SendCammandToDaemon
    // failed"; "Update failed" after Update's own line (a path whose share is gone: error 2, no share
    // handled); "UpsertVNotifydCfg failed, share=", "CleanShareIndexData failed, share=",
    // "DeleteVNtifydCfg failed, share=", the shares before it handled.
    static bool Delete(const Json::Value &request);

    // ---- Reindex ----

    // Asks for the folders at paths (an array of strings) to be indexed again: every share of the
    // request marked out of space is revived first (StatusMgr::ShareRevive, once per share, in
    // ascending order; best effort, "ShareRevice failed, share=<share>"), then one event 65536 with
    // null data is queued per path, in request order. Takes no lock of its own; every element is
    // checked before anything is done. Failures (false, nothing done): not an array or an element
    // not a string, "Malformed jsArrPath: <value>", error 1; an empty path, "Failed to get share
    // name from path: "; a share without indexed folders, no line. After reviving: "GetFullPath
    // failed, path=<path>", error 2; "AddCustomEvent failed, path=<path>"; earlier events stay queued.
    static bool Reindex(const Json::Value &paths);

    // ---- Shares ----

    // The share is gone: removes its folder settings and saves folder.conf under the folder lock.
    // When no folder is left anywhere, fileindexd is stopped and SMB Spotlight switched off when on,
    // then "samba" restarted (best effort). No command, no event, monitoring and index data left as
    // they are. Fails only when the folder list cannot be locked, loaded or saved (Folders logs).
    static bool ShareRemove(const std::string &share);
    // The share was renamed: its folder settings move to paths under the new name, each keeping its
    // name and media, and folder.conf is saved under the folder lock; the result is the save's.
    // Nothing else is told. While the new name does not resolve yet, Folders::Upsert refuses the
    // moved setting ("Bad param: ...", error 1) and folder.conf keeps the old paths.
    static bool ShareRename(const std::string &oldShare, const std::string &newShare);
    // Suspends the share's indexing: "delete_share_worker" {"share_name"} to the daemon, then its
    // monitoring removed. No lock. Failures: the command (no line, monitoring kept);
    // "DeleteVNotifydCfg failed, share=<share>".
    static bool SharePause(const std::string &share);
    // Ends the suspension: monitoring registered again, then "revive_share_worker" {"share_name"},
    // whose result is returned (no line). No lock. A failed registration, "UpsertVNotifydCfg failed,
    // share=<share>", sends nothing.
    static bool ShareResume(const std::string &share);
    // Wipes the share's event queue, its ".tmp" companion and its index database by running
    // "/bin/rm -rf" on each (missing ones are fine, the removals' results are not checked). No lock
    // of its own. Failures: "FILEIDXQueuePathGet failed, share=<share>", nothing removed;
    // "FILEIDXDBPathGet failed, share=<share>", the queue already removed.
    static bool CleanShareIndexData(const std::string &share);
};

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
