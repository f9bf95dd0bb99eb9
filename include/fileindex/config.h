// Config: a JSON document kept in one file and guarded by an advisory lock on a second file.
//
// A Config lives for one call: construct it on the stack, optionally Lock(true), Load(), change,
// Save(), Unlock(). Destructors never unlock; a caller that locked calls Unlock itself (the system
// drops the lock when the process closes the descriptor or exits).
#ifndef FILEINDEX_CONFIG_H
#define FILEINDEX_CONFIG_H

#include <string>

#include <json/value.h>

#include "fileindex/export.h"

namespace VEXO {
namespace FILEINDEX {

class FILEINDEX_EXPORT Config {
public:
    Config();
    virtual ~Config();

    // Reads the document file and builds the subclass's view of it.
    virtual bool Load() = 0;
    // Rebuilds the document from the subclass's view and writes it.
    virtual bool Save() = 0;
    // Absolute path of the lock file.
    virtual std::string GetLockPath() const = 0;
    // Absolute path of the document file.
    virtual std::string GetPath() const = 0;

    // Takes the flock lock on GetLockPath(), exclusive or shared, creating the lock file (mode 0644)
    // on first use. Never blocks: up to three attempts with a random 0-9 ms sleep after each, a retry
    // closing the descriptor of the attempt before it. Fails at once when the lock file cannot be
    // opened (a symbolic link in its place included) or flock fails otherwise.
    // Failure: false, error 9 (FILEIDX_ERR_LOCK), "Failed to lock folder" (for either document);
    // the last attempt's descriptor stays open until Unlock, which every caller calls in any case.
    bool Lock(bool exclusive);
    // Releases the lock and closes its descriptor, which it then forgets: a second Unlock, or one on
    // an object that never opened the lock file, does nothing.
    void Unlock();

    // Reads GetPath() into the document. A missing file (or anything but a regular file) is the
    // first-run state: true, document unchanged. An unreadable or unparsable file: false, error 6
    // (FILEIDX_ERR_LOAD_CONFIG), "Failed to load json from <path>".
    bool LoadJson();
    // Replaces GetPath() with the document atomically, then sets mode 0644. A write failure leaves
    // the previous file: false, error 7 (FILEIDX_ERR_SAVE_CONFIG), "Failed to save json to <path>".
    // A document that LoadJson would not read back as it is (an infinite or NaN number, nesting
    // deeper than 512 levels) is such a failure: it is never written.
    // A failed chmod only logs "chmod failed, path=<path>" and still counts as saved.
    // Does not check that the lock is held.
    bool SaveJson();

protected:
    Json::Value m_jsConfig;
    int m_fdLock;
};

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
