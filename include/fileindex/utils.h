// Free functions of libfileindex: paths, shares and JSON members.
//
// A share-relative path is "/" + share name + path inside the share (/photo/holiday); a full path is
// the file-system path, volume first (/volume1/photo/holiday). Strings are byte strings: nothing
// here folds case or normalises Unicode.
#ifndef FILEINDEX_UTILS_H
#define FILEINDEX_UTILS_H

#include <cstdint>
#include <string>

#include <json/value.h>

#include "fileindex/export.h"

// The platform's share record (platform/share_db.h), as VEXOShareGet returns it.
struct _tag_VEXOSHARE;

namespace VEXO {
namespace FILEINDEX {

// Cuts the share name out of a share-relative path: the text after the first character up to the
// next "/". The first character is skipped unexamined, so "photo/x" gives "hoto" and "/" gives "".
// False only for an empty path; share is written only on success.
FILEINDEX_EXPORT bool GetShareNameByPath(std::string &share, const std::string &path);

// Resolves a share-relative path through the share database: the volume holding the share followed
// by the path exactly as given (letter case and slashes kept).
// Failures: empty path logs "GetShareNameByPath failed, path=<path>" and sets no error code;
// unknown share sets error 2 (FILEIDX_ERR_PATH) and logs nothing.
FILEINDEX_EXPORT bool GetFullPath(std::string &fullPath, const std::string &path);

// Finds the share holding a full path. Failure: false, error 2 (FILEIDX_ERR_PATH),
// "VEXOShareNamePathGet failed, path=<path>"; the outputs are untouched.
FILEINDEX_EXPORT bool GetShareNamePathByFullPath(std::string &share, std::string &sharePath,
                                                 const std::string &fullPath);

// Replaces the first component of a share-relative path: ("/old/a", "new") gives "/new/a". The
// result always begins with "/"; an empty path gives "".
FILEINDEX_EXPORT std::string ReplaceShareName(const std::string &path, const std::string &share);

// Plain byte-wise prefix test; callers that need component boundaries append "/" to both sides.
FILEINDEX_EXPORT bool StringStartWith(const std::string &text, const std::string &prefix);

// True when lstat succeeds and the entry is a directory (respectively a regular file); a symbolic
// link is neither.
FILEINDEX_EXPORT bool IsDirExist(const std::string &path);
FILEINDEX_EXPORT bool IsFileExist(const std::string &path);

// Copy object[key] into value when object is an object whose member key is exactly a string
// (respectively a boolean); otherwise false and value untouched. No conversions.
FILEINDEX_EXPORT bool RetrieveStringFromJsonObj(std::string &value, const std::string &key, const Json::Value &object);
FILEINDEX_EXPORT bool RetrieveBoolFromJsonObj(bool &value, const std::string &key, const Json::Value &object);

// ---- What may be indexed ----
// Only the lines named below are logged; every other refusal is a silent false and sets no error
// code. Nothing here takes a lock or talks to the daemon.

// True for the platform's hidden metadata directory names (VEXOEAIsHiddenDir) and for
// ".TemporaryItems", "VEXO@.fileindexdb", "VEXO@file_index_queue", ".VEXOPPSDB", ".DS_Store"
// (exact bytes: ".ds_store" is an ordinary name). name is one entry name, without its directory.
FILEINDEX_EXPORT bool IsSystemPreservedFileName(const std::string &name);

// The rule that refuses a share, a folder or a crawled entry; kNone when none does. The Can...
// and IsSkipIndex functions below answer from the same code as the Get...Refusal functions, so the
// answer and the reason never disagree.
enum class IndexRefusal : int32_t {
    kNone = 0,
    kRecycleBin = 1,            // in a share's recycle bin
    kSnapshot = 2,              // in a snapshot
    kUnknownFileSystem = 3,     // the file-system type cannot be told
    kRemoteFileSystem = 4,      // a network file system
    kImageFileSystem = 5,       // a file system mounted from an image
    kFileSystemType12 = 6,      // the platform's file-system type 12
    kNoShare = 7,               // no share holds the path
    kShareLookupFailed = 8,     // the share cannot be looked up (or no share record was given)
    kExcludedShare = 9,         // "surveillance" or "NetBackup"
    kShareStateUnreadable = 10, // the share's encrypted or read-only state cannot be read
    kEncryptedShare = 11,       // the share is in the encrypted state
    kReadOnlyShare = 12,        // the share is read-only
    kMountPoint = 13,           // a mount point in a share that does not use encryption
    kNotCanonical = 14,         // not its own canonical path (link, ".", "..", "//", trailing "/"), or missing
    kPathUnresolved = 15,       // the share-relative path does not resolve to a full path
    kNoDirectory = 16,          // a crawled entry's path without any "/"
    kReservedName = 17,         // a crawled entry's name is reserved (IsSystemPreservedFileName)
};

// A stable lower-case name of the refusal for scripts ("recycle_bin", "none", ...), and a phrase
// for people ("in a share's recycle bin"). Never null.
FILEINDEX_EXPORT const char *IndexRefusalName(IndexRefusal refusal);
FILEINDEX_EXPORT const char *IndexRefusalText(IndexRefusal refusal);

// False for a null record, for the shares "surveillance" and "NetBackup" (exact names), for a
// share in the encrypted state or read-only, and when either state cannot be read. Logs nothing.
FILEINDEX_EXPORT bool CanShareBeIndexed(_tag_VEXOSHARE *share);
// The rule behind CanShareBeIndexed: kShareLookupFailed for a null record, kExcludedShare,
// kShareStateUnreadable, kEncryptedShare, kReadOnlyShare, or kNone.
FILEINDEX_EXPORT IndexRefusal GetShareIndexRefusal(_tag_VEXOSHARE *share);

// Whether the folder at fullPath may be indexed. The tests run in this order; the first refusal
// decides:
//  1. in a share's recycle bin ("#recycle" in the path, confirmed by the platform);
//  2. in a snapshot ("#snapshot" in the path, confirmed by the platform);
//  3. file-system type unknown (-1); 4. a remote or image file system, or type 12;
//  5. no share holds the path: "VEXOShareNamePathGet failed, path=..." then
//     "GetShareNamePathByFullPath failed, path=<fullPath>", error 2 (FILEIDX_ERR_PATH);
//  6. the share cannot be looked up: "VEXOShareGet failed, share=<name>";
//  7. CanShareBeIndexed refuses the share;
//  8. a mount point on a share that does not use encryption:
//     "Mount point[<fullPath>] is not allowed to be indexed";
//  9. fullPath is not its own canonical form (a symbolic link on the way, "." or "..", a doubled or
//     trailing "/"), or does not exist: "check realpath failed, path=<fullPath>".
// The share record is released on every path.
FILEINDEX_EXPORT bool CanFullPathBeIndexed(const std::string &fullPath);
// The rule behind CanFullPathBeIndexed, with the same platform calls, log lines and error code.
FILEINDEX_EXPORT IndexRefusal GetFullPathIndexRefusal(const std::string &fullPath);

// CanFullPathBeIndexed of the share-relative path's full path. When the path does not resolve:
// false, "GetFullPath failed, path=<path>", error 2 (FILEIDX_ERR_PATH).
FILEINDEX_EXPORT bool CanPathBeIndexed(const std::string &path);
// The rule behind CanPathBeIndexed: kPathUnresolved, or GetFullPathIndexRefusal of the full path.
FILEINDEX_EXPORT IndexRefusal GetPathIndexRefusal(const std::string &path);

// Whether the crawler skips the entry at fullPath: true for a text without "/", a reserved last
// component (IsSystemPreservedFileName; entries below a reserved directory are not caught here),
// a recycle bin or snapshot, and a remote, image or type-12 file system. An entry whose
// file-system type cannot be told is kept, unlike in CanFullPathBeIndexed. Asks the platform for
// the type first, whatever decides. Logs nothing.
FILEINDEX_EXPORT bool IsSkipIndex(const std::string &fullPath);
// The rule behind IsSkipIndex: kNoDirectory, kReservedName, kRecycleBin, kSnapshot,
// kRemoteFileSystem, kImageFileSystem, kFileSystemType12, or kNone for an entry the crawler keeps.
FILEINDEX_EXPORT IndexRefusal GetSkipIndexRefusal(const std::string &fullPath);

// ---- Telling the indexing daemon ----

// Sends {"type": type, "data": data} to fileindexd over "/var/run/fileindexd.sock": one connection,
// one frame (4-byte length in host byte order counting the terminating NUL, the compact JSON text,
// the NUL), never answered. True when the whole frame was written; the daemon never receives a
// damaged frame, only a whole one or one cut short. No listener is false at once. Every wait is
// bounded by a 1 s send time-out: a daemon whose backlog is full, or that stops reading, costs
// about 1 s and gives false. The worst case is a daemon that keeps reading just slowly enough: 1 s
// to connect plus 1 s for each 1024-byte piece of the frame (and three interrupted writes).
// Ignores SIGPIPE process-wide from the first call on. Logs nothing and sets no error code.
FILEINDEX_EXPORT bool SendCammandToDaemon(const std::string &type, const Json::Value &data);

// Appends {"event": event, "path": path, "data": data} as one line to the event queue of the
// share holding the full path, under the queue's flock, whole or not at all: a queue that does not
// end in a newline (a torn record) gets one first, and an append cut short (disk full, file-size
// limit) is cut back off. True also when nothing needed writing (the queue or its ".tmp" companion
// holds a pending reindex, 65536, of exactly this path) and when another process kept the queue
// locked through three attempts (the event is then dropped). When the event cannot be written
// (path outside any share, queue unknown, not openable or a symbolic link, "@eaDir" a symbolic
// link, flock error, append cut short) the share ("" when unknown) is marked as needing a reindex
// instead, and the result is false. The library never appends a record its own queue readers would
// skip or read as something else: a negative event, or data holding an infinite or NaN number or
// nested deeper than 511 levels, is such an event that cannot be written ("Refused a record its
// readers would skip, event=<event>, path=<path>", the share marked, false).
// Debug lines at LOG_LEVEL 7 only: "flock fail, ...", "try lock too many times, ...",
// "write fail, (<written>, <length>)". A queue file it creates gets mode 0644 (less the umask).
FILEINDEX_EXPORT bool AddCustomEvent(const int &event, const std::string &path, const Json::Value &data);

// ---- Space ----

// False when the share is unknown ("VEXOShareGet failed, share=...") or its volume has less than
// 10 MiB left (the platform's quota test reporting 0x2900 or 0x2400); true otherwise, also when the
// quota cannot be read for another reason.
FILEINDEX_EXPORT bool IsShareSpaceEnough(const std::string &share);
// Posts the "no space" desktop notification to the administrators through
// "/usr/vexo/bin/vexohvxnotify". True when the tool ran successfully. Logs nothing.
FILEINDEX_EXPORT bool NotifyNoSpace();

// ---- Upgrade ----

// Brings the indexing service in line with folder.conf after a system upgrade; reads it without the
// folder lock and changes nothing in it. With no folder, fileindexd is stopped (a failure logs
// "VLIBServiceStart failed: err=[...]", the start's text, and answers false). Otherwise, stopping
// at the first failure and undoing nothing: fileindexd started ("VLIBServiceStart failed:
// err=[...]"); SMB Spotlight switched on, without a "samba" restart ("VEXOSMBSetSpotlight failed:
// err=[...]"); every share holding folders registered for change monitoring, once, in ascending
// order ("GetShareNameByPath failed, path=<path>" for an empty path, before any registration;
// "UpsertVNotifydCfg failed, share=<share>"); IndexMgr::Reindex of every folder in path order
// ("Reindex failed"). The platform's last error fills "err=[0x<code> <file>:<line>]".
FILEINDEX_EXPORT bool Updater_hvx60_beta2();

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
