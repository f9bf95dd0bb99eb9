// Locations derived from a share's event queue file.
#ifndef FILEINDEX_SHARE_STORAGE_PATHS_H
#define FILEINDEX_SHARE_STORAGE_PATHS_H

#include <string>

namespace VEXO {
namespace FILEINDEX {

// The queue's companion file, which the daemon may keep beside the queue: its path plus ".tmp".
inline std::string QueueCompanionPath(const std::string &queuePath)
{
    return queuePath + ".tmp";
}

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
