// The status file "/usr/vexo/etc/fileindex/status.conf" (Status) and the operations that change it
// under its lock and tell the indexing daemon (StatusMgr).
//
// Layout, every member optional: "resume_time" (-1 running, 0 paused without end, otherwise paused
// until that many seconds since the epoch), "no_space" and "need_reindex" (objects whose member
// names are the marked shares), and any other top-level name set to true by SetUpdated.
#ifndef FILEINDEX_STATUS_H
#define FILEINDEX_STATUS_H

#include <string>

#include "fileindex/config.h"
#include "fileindex/export.h"

namespace VEXO {
namespace FILEINDEX {

// The status document in memory. Its operations neither lock, load nor save.
class FILEINDEX_EXPORT Status : public Config {
public:
    // "/usr/vexo/etc/fileindex/status.conf" and "/tmp/fileidx_cfg_status.lock".
    std::string GetPath() const override;
    std::string GetLockPath() const override;
    // Config::LoadJson; a top level that is not an object is refused like an unreadable file: false,
    // error 6 (FILEIDX_ERR_LOAD_CONFIG), "Failed to load json from <path>". Members of other types
    // are loaded as they are: only an operation that cannot read the member it touches fails, with
    // "json exception", error 6, and the document unchanged. Save is Config::SaveJson.
    bool Load() override;
    bool Save() override;

    // Sets the top-level member name to true. There is no way to clear it.
    bool SetUpdated(const std::string &name);
    // True when the member exists and the JSON library reads it as true (true, a number but 0). A
    // member it cannot read as a boolean (a text, an array, an object such as "no_space") fails:
    // false, "json exception", error 6.
    bool IsUpdated(const std::string &name);

    // Adds or removes share in "need_reindex". Removing from an absent object leaves
    // "need_reindex": null in the document, which marks no share. A "need_reindex" that is neither
    // an object nor null fails: false, "json exception", error 6, document unchanged. The reader
    // answers true only for a share in an object.
    bool ShareSetNeedReindex(const std::string &share, bool flag);
    bool ShareIsNeedReindex(const std::string &share);
    // As ShareSetNeedReindex for "no_space"; marking a share that was not marked yet also tells
    // the administrators (NotifyNoSpace; a failure logs "NotifyNoSpace failed" and the mark is set).
    bool ShareSetNoSpace(const std::string &share, bool flag);
    bool ShareIsNoSpace(const std::string &share);

    // Sets "resume_time".
    bool Pause(long long resumeTime);
    // Sets "resume_time" to -1.
    bool Resume();
    // Reads "resume_time" (-1 when absent). A value that is not an integer logs "json exception"
    // and answers false, resumeTime untouched.
    bool GetPauseInfo(long long &resumeTime);
};

// Each changing operation locks the status file (exclusive, never blocking: error 9 after three
// attempts), loads, changes, saves, sends its daemon command while still holding the lock, and
// unlocks on every path. A failed send logs "SendCammandToDaemon failed" and answers false; the
// saved change stays. Reading operations load without the lock and answer false when status.conf
// cannot be read. A member of the wrong type fails only the operations that touch it, as Status
// says, and nothing is saved or sent then; no operation throws.
class FILEINDEX_EXPORT StatusMgr {
public:
    static bool SetUpdated(const std::string &name);
    static bool IsUpdated(const std::string &name);

    static bool ShareSetNoSpace(const std::string &share, bool flag);
    static bool ShareIsNoSpace(const std::string &share);
    static bool ShareSetNeedReindex(const std::string &share, bool flag);
    static bool ShareIsNeedReindex(const std::string &share);

    // Clears the share's no-space mark and sends "revive_share_worker" {"share_name": share}.
    static bool ShareRevive(const std::string &share);

    // Stores "resume_time" -1 and sends "resume" {}.
    static bool Resume();
    // Pauses indexing for hours (0: until Resume) and sends "pause" {"resume_time": t}, where t is
    // 0 or now + hours * 3600 computed in 32-bit signed arithmetic, stored and sent alike.
    // Negative hours: false, error 1 (FILEIDX_ERR_BAD_PARAM), nothing locked, written or sent.
    static bool Pause(const int &hours);
    static bool GetPauseInfo(long long &resumeTime);

    // ---- Progress ----
    // Judged from the shares' event queue files (S/@eaDir/VEXO@file_index_queue and its ".tmp"
    // companion) and the status file, without asking the daemon and without any lock. Pending work
    // reads "processing" while indexing runs, also once a timed pause's time has come (the status
    // file still holds it), and "paused" while a pause lasts. Getting a queue's path makes the
    // share's @eaDir if it is missing.

    // "finished" when no share holding a folder that may be indexed (CanPathBeIndexed) has a queue
    // file; otherwise the pending word. Only the existence of the files counts, shares are looked
    // at in ascending name order up to the first with one, and no-space marks are not considered.
    // Failures, status untouched: folder.conf unreadable (error 6 or 8); a folder path without a
    // share name, "Failed to get share name from path: <path>"; a share's queue unknown,
    // "FILEIDXQueuePathGet failed, share=<share>"; the pause state unreadable with work pending.
    static bool GetStatus(std::string &status);
    // The state of one folder (share-relative path), in this order: "paused" when the folder may
    // not be indexed; "err_no_space" when its share is marked out of space; the pending word when
    // the share's queue file or its ".tmp" companion holds an event on the folder or inside it (a
    // move, 256, counts on its "path_old" too); "finished" otherwise, also after
    // "FILEIDXQueuePathGet failed, share=<share>" or "Cannot get full path: <path>". A queue line
    // that is not a record logs "Malformed command: <line>" and is passed over; an unreadable queue
    // logs "Failed to open queue=<file>, reason=<errno text>". An unreadable pause state counts as
    // running.
    static std::string GetFolderStatus(const std::string &path);
};

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
