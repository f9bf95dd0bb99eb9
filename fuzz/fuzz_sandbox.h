// What the targets that read the appliance's documents share. Linking fuzz_sandbox.cpp makes a
// sandbox appliance under the build's root before the first input (it defines LLVMFuzzerInitialize):
// the directories of the fixed files and of the emulated platform's state, and one share, "photo",
// at <root>/volume1/photo, so that share-relative paths under /photo resolve. It also keeps the
// library's log lines out of the host's log.
#ifndef FILEINDEX_FUZZ_FUZZ_SANDBOX_H
#define FILEINDEX_FUZZ_FUZZ_SANDBOX_H

#include <cstddef>

namespace fileindex_fuzz {

// Replaces the content of path with the input bytes. Aborts when it cannot.
void WriteInput(const char *path, const void *data, size_t size);

}  // namespace fileindex_fuzz

#endif
