// The appliance services the index management operations start, stop and restart.
#ifndef FILEINDEX_INDEX_MGR_SERVICES_H
#define FILEINDEX_INDEX_MGR_SERVICES_H

namespace VEXO {
namespace FILEINDEX {

// The indexing daemon's service, and the flag its start and stop are always given.
constexpr char kIndexService[] = "fileindexd";
constexpr int kIndexServiceFlags = 1;
// The SMB service, restarted after its Spotlight switch changed.
constexpr char kSmbService[] = "samba";

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
