// What a share keeps for the index, inside the share's hidden metadata directory S/@eaDir (S being
// the share's path): the event queue file VEXO@file_index_queue, with the ".tmp" companion the
// daemon may keep beside it, and the index database directory VEXO@.fileindexdb.
//
// These names and paths are written here and nowhere else: the storage path functions, the event
// queue, the change-monitor registration, the emulated platform, the tests and the demo all take
// them from this header.
#ifndef FILEINDEX_SHARE_STORAGE_PATHS_H
#define FILEINDEX_SHARE_STORAGE_PATHS_H

#include <string>

namespace VEXO {
namespace FILEINDEX {

constexpr char kMetadataDirName[] = "@eaDir";
constexpr char kQueueFileName[] = "VEXO@file_index_queue";
constexpr char kDatabaseDirName[] = "VEXO@.fileindexdb";

// S/@eaDir.
inline std::string MetadataDirPath(const std::string &sharePath)
{
    return sharePath + "/" + kMetadataDirName;
}

// S/@eaDir/<name>, name being kQueueFileName or kDatabaseDirName.
inline std::string StoragePath(const std::string &sharePath, const char *name)
{
    return MetadataDirPath(sharePath) + "/" + name;
}

// The queue's companion file: its path plus ".tmp".
inline std::string QueueCompanionPath(const std::string &queuePath)
{
    return queuePath + ".tmp";
}

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
