// The one mutex of every library call, and retries of a step whose lock is busy.
#include "library_calls.h"

#include <mutex>

#include "busy.h"

namespace fileindex_panel {

using fileindex_tool::Failure;

namespace {

std::mutex g_library;

}  // namespace

bool CallLibrary(const LibraryStep &step, Failure &failure)
{
    std::lock_guard<std::mutex> hold(g_library);
    fileindex_tool::ClearLastError();
    return step(failure);
}

bool CallLibraryRetryingBusy(const LibraryStep &step, Failure &failure)
{
    return fileindex_tool::RetryWhileBusy(kBusyWaitSeconds, [&](bool &busy) {
        const bool done = CallLibrary(step, failure);
        busy = !done && failure.kind == fileindex_tool::FailureKind::kBusy;
        return done;
    });
}

}  // namespace fileindex_panel
