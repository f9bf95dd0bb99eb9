// What every exported function of the emulation shares: its visibility, the error codes it leaves
// behind and the guard that keeps exceptions inside the library.
#ifndef VEXOEMU_API_H
#define VEXOEMU_API_H

#include "error_codes.h"
#include "error_state_internal.h"

// Marks a definition that belongs to the platform interface; everything else stays hidden.
#define VEXOEMU_API __attribute__((visibility("default")))

namespace VEXO {
namespace EMULATION {

// Runs the body of an exported function. An exception (out of memory, a JSON value of an
// unexpected type) becomes the function's failure value with kErrInternal in the error state.
template <typename R, typename Body>
R Guarded(R failure, Body &&body) noexcept
{
    try {
        return body();
    } catch (...) {
        SetPlatformError(kErrInternal, __FILE_NAME__, __LINE__);
        return failure;
    }
}

}  // namespace EMULATION
}  // namespace VEXO

#endif
