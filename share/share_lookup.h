// Share look-ups that other rooms make too, with the buffer sizes the platform's calls are given:
// 492 bytes for a share name, 4096 for a path, each zero-filled.
#ifndef FILEINDEX_SHARE_SHARE_LOOKUP_H
#define FILEINDEX_SHARE_SHARE_LOOKUP_H

#include <string>

namespace VEXO {
namespace FILEINDEX {

// The share holding a full path and the share's own path (VEXOShareNamePathGet). Failure: false,
// outputs untouched, "VEXOShareNamePathGet failed, path=<path>"; no error code is set.
bool FindShareOfFullPath(std::string &share, std::string &sharePath, const std::string &fullPath);

// The share's event queue path, from FILEIDXQueuePathGet (which logs its own failures). False when
// that fails; the caller logs what the failure means to it.
bool GetQueuePath(std::string &queuePath, const std::string &share);

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
