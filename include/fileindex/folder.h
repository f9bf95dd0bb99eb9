// Folder settings: one indexed folder (Folder) and the folder list file (Folders).
#ifndef FILEINDEX_FOLDER_H
#define FILEINDEX_FOLDER_H

#include <map>
#include <string>
#include <vector>

#include <json/value.h>

#include "fileindex/config.h"
#include "fileindex/export.h"

namespace VEXO {
namespace FILEINDEX {

// One indexed-folder setting: which folder of a share is indexed, and for which media. A plain
// value, copied freely. Its JSON record is {"path", "name", "document", "audio", "video", "photo"}.
class FILEINDEX_EXPORT Folder {
public:
    Folder();

    // Overlays a record: the path is taken from the argument (the record's own "path" is ignored);
    // "name" and the four flags are taken only when present with exactly the right type, so keys the
    // record leaves out keep their values. True when the path resolves to a full path.
    bool Load(const std::string &path, const Json::Value &record);
    // Like Load, but from defaults: empty name, all flags false.
    bool Reload(const std::string &path, const Json::Value &record);
    // Changes the path and resolves it again; name and flags stay. True when the path resolves.
    bool SetPath(const std::string &path);

    // The full path resolved by the last load; resolved afresh (and not kept) when that failed,
    // logging "Failed to get full path from <path>" and returning "" if it fails again.
    std::string GetFullPath() const;

    // The JSON record; the full path is never part of it.
    Json::Value asJson() const;
    // The record with "additional": GetAdditional(record["additional"], additional). When that
    // fails, logs "GetAdditional failed" and returns the record with what it left there ({} for a
    // key list that is not an array).
    Json::Value asJson(const Json::Value &additional) const;

    // Computed information about the folder: "status", its indexing state
    // (StatusMgr::GetFolderStatus), or "is_valid", whether it may still be indexed
    // (CanPathBeIndexed). Any other key: false, out untouched, error 1 (FILEIDX_ERR_BAD_PARAM),
    // "Unknown additional: <key>". Pass a std::string: a bare literal also converts to Json::Value.
    bool GetAdditional(Json::Value &out, const std::string &key) const;
    // out = {key: value} for each key of the array keys, in order; an unknown key becomes null,
    // logs "Failed to get additional: <key>" after the line above, and does not fail the call.
    // keys not an array, or an element not a string: false, error 1, "Bad param: <that value>"; the
    // members added before a bad element stay.
    bool GetAdditional(Json::Value &out, const Json::Value &keys) const;
    // Sets object[path] to the record. False, object untouched, when object is not a JSON object.
    bool AddToJson(Json::Value &object) const;

    std::string m_fullPath;  // resolved from m_path on every load, never stored
    std::string m_path;      // share-relative path, the record's identity
    std::string m_name;      // display name
    bool m_bDocument;
    bool m_bAudio;
    bool m_bVideo;
    bool m_bPhoto;
};

// The folder list "/usr/vexo/etc/fileindex/folder.conf": at most 1000 settings keyed by
// share-relative path, guarded by "/tmp/fileidx_cfg_folder.lock". Upsert and Delete change only the
// table in memory; nothing reaches the file before Save. Writers hold Lock(true) from Load to Save.
//
// A change report is {"document", "audio", "video", "photo"}, each true when that medium changes
// its effective indexing for the folder's full path.
class FILEINDEX_EXPORT Folders : public Config {
public:
    // Loads the file into the table; a missing file is an empty list. Entries already in the table
    // are kept (a second Load does not overwrite them), and folders whose share is gone still load.
    // Failures: error 6 (unreadable), or error 8 (FILEIDX_ERR_MALFORMED_CONFIG) with
    // "Malformed folders: <document>" when the top level is not an object.
    bool Load() override;
    // Writes the whole table, in path order, atomically.
    bool Save() override;
    std::string GetLockPath() const override;
    std::string GetPath() const override;

    // The record stored under exactly this path (no normalisation). Failure: false, out untouched,
    // error 4 (FILEIDX_ERR_NO_SUCH_FOLDER), "No such folder: <path>".
    bool Get(Json::Value &out, const std::string &path);

    // Adds the setting request (a record holding at least a string "path") or merges it into the
    // stored one, and sets out to the change report against the setting that governed the path
    // before. A new path starts from defaults; an existing one keeps what the request leaves out.
    // Failures: error 1 with "Bad param: <request>" (no string path, or it does not resolve; table
    // unchanged); error 5 with "Exceed max folder size" when a new path makes 1001 entries: the
    // record then stays in the table, so the caller must not Save.
    bool Upsert(Json::Value &out, const Json::Value &request);

    // Erases the setting of path (absent is no error) and sets out to {path: change report}. When
    // the path no longer resolves, the entry is still erased and out is left untouched.
    bool Delete(Json::Value &out, const std::string &path);

    // All folders in path order.
    bool List(std::vector<Folder> &out);
    // The folders of one share (exact, case-sensitive name); with "" all folders. Folders whose
    // share name cannot be cut from their path are left out of a per-share list.
    bool List(std::vector<Folder> &out, const std::string &share);

    // A page of the table: out = {"total": all folders, "offset": offset, "folder": [records]},
    // each record being asJson(additional). Sorted ascending by sort_by: "name" (display name),
    // "document", "audio", "video" or "photo" (false before true), anything else by path; names
    // and paths are compared ignoring letter case (VLIBCUnicodeUTF8StrCaseCmp), and folders the
    // key does not tell apart stay in path order. The page holds the folders from offset on, at
    // most limit of them (0 gives none, an offset at or past the end gives none). With
    // sort_direction exactly "DESC" the page is instead the first min(total - offset, limit)
    // folders of the ascending order, reversed: the offset only shortens it. The records' "status"
    // and "is_valid" are those of asJson, with each share's facts, each queue file and status.conf
    // read once for the whole page: the same answers, log lines and error codes on a quiet
    // appliance, fewer platform calls. Always true.
    bool List(Json::Value &out, unsigned long offset, unsigned long limit, const std::string &sort_by,
              const std::string &sort_direction, const Json::Value &additional);

private:
    std::map<std::string, Folder> m_folders;
};

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
