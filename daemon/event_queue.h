// Reading a share's event queue file.
#ifndef FILEINDEX_DAEMON_EVENT_QUEUE_H
#define FILEINDEX_DAEMON_EVENT_QUEUE_H

#include <string>

namespace VEXO {
namespace FILEINDEX {

// True when queueFile holds a pending reindex record ({"event": 65536, "path": path}) for exactly
// path. Lines that are not such records are skipped; a missing file holds none. A file that exists
// but cannot be read logs "Failed to open queue=<file>, reason=<errno text>" and holds none.
bool HasQueuedReindexEvent(const std::string &path, const std::string &queueFile);

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
