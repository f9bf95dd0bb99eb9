// Names and phrases of the indexability rules, for programs that say why something is not indexed.
#include <iterator>

#include "fileindex/utils.h"

namespace VEXO {
namespace FILEINDEX {

namespace {

struct RefusalWords {
    const char *name;
    const char *text;
};

// Indexed by the enumerator's value.
constexpr RefusalWords kRefusalWords[] = {
    {"none", "nothing refuses it"},
    {"recycle_bin", "in a share's recycle bin"},
    {"snapshot", "in a snapshot"},
    {"unknown_file_system", "its file-system type cannot be told (a missing path, for one)"},
    {"remote_file_system", "on a remote (network) file system"},
    {"image_file_system", "on a file system mounted from an image"},
    {"file_system_type_12", "on a file system of the platform's type 12"},
    {"no_share", "no share holds it"},
    {"share_lookup_failed", "its share cannot be looked up in the share database"},
    {"excluded_share", "its share is never indexed (surveillance, NetBackup)"},
    {"share_state_unreadable", "its share's encrypted or read-only state cannot be read"},
    {"encrypted_share", "its share is encrypted"},
    {"read_only_share", "its share is read-only"},
    {"mount_point", "a mount point in a share that does not use encryption"},
    {"not_canonical", "not its own canonical path (a symbolic link, \".\", \"..\" or a stray \"/\"), or missing"},
    {"path_unresolved", "its share-relative path does not resolve (no such share)"},
    {"no_directory", "its path has no \"/\""},
    {"reserved_name", "its name is reserved (@eaDir, .DS_Store, the index's own files)"},
};

static_assert(std::size(kRefusalWords) == static_cast<size_t>(IndexRefusal::kReservedName) + 1,
              "one entry per enumerator");

// What a value no enumerator has (a cast from a number) reads as.
constexpr RefusalWords kUnknownRefusal = {"unknown", "a rule this library does not know"};

const RefusalWords &WordsOf(IndexRefusal refusal)
{
    const size_t index = static_cast<size_t>(refusal);
    return index < std::size(kRefusalWords) ? kRefusalWords[index] : kUnknownRefusal;
}

}  // namespace

const char *IndexRefusalName(IndexRefusal refusal)
{
    return WordsOf(refusal).name;
}

const char *IndexRefusalText(IndexRefusal refusal)
{
    return WordsOf(refusal).text;
}

}  // namespace FILEINDEX
}  // namespace VEXO
