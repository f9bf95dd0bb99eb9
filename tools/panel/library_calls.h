// The one way the panel calls libfileindex. The library keeps its last error process-wide and works
// on its caller's thread, so every call made while answering requests runs under one mutex, with
// the last error cleared first and read (into the failure) before the mutex is let go: two requests
// never mix their codes.
#ifndef FILEINDEX_PANEL_LIBRARY_CALLS_H
#define FILEINDEX_PANEL_LIBRARY_CALLS_H

#include <functional>

#include "failure.h"

namespace fileindex_panel {

// Library calls as one step: true when they succeeded; otherwise false with failure filled
// (LibraryFailure reads the last error, which is the step's own here).
using LibraryStep = std::function<bool(fileindex_tool::Failure &failure)>;

// Runs step under the mutex.
bool CallLibrary(const LibraryStep &step, fileindex_tool::Failure &failure);

// As CallLibrary, but a step that fails on a lock another process holds (a failure of kind kBusy)
// runs again after jittered pauses, in which the mutex is free, for up to kBusyWaitSeconds. Only for
// steps whose lock failure leaves nothing behind: the writers of folder.conf and status.conf take
// their lock before any effect.
bool CallLibraryRetryingBusy(const LibraryStep &step, fileindex_tool::Failure &failure);

constexpr double kBusyWaitSeconds = 2;
// What Retry-After says to a client once a lock stayed busy.
constexpr int kBusyRetryAfterSeconds = 1;

}  // namespace fileindex_panel

#endif
