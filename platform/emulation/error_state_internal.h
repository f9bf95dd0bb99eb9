// The emulation's own way into the per-thread error state behind VLIBCErrGet.
#ifndef VEXOEMU_ERROR_STATE_INTERNAL_H
#define VEXOEMU_ERROR_STATE_INTERNAL_H

namespace VEXO {
namespace EMULATION {

// Stores the error without journaling it (VLIBCErrSetEx is the journaled, public way).
void SetPlatformError(int code, const char *file, int line) noexcept;

}  // namespace EMULATION
}  // namespace VEXO

// Records a natural failure at the emulation's own source position.
#define EMU_SET_ERROR(code) ::VEXO::EMULATION::SetPlatformError((code), __FILE_NAME__, __LINE__)

#endif
