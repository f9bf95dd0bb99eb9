// Platform error codes the emulation leaves in VLIBCErrGet when a call fails by itself (a forced
// call leaves whatever its rule names). docs/emulation.md lists them for the programs that test
// against the emulation.
#ifndef VEXOEMU_ERROR_CODES_H
#define VEXOEMU_ERROR_CODES_H

namespace VEXO {
namespace EMULATION {

constexpr int kErrBadArgument = 0x0D00;    // null pointer, empty name, buffer size below 1, bad argv
constexpr int kErrStateFile = 0x0E00;      // a state file is unreadable or malformed, or cannot be written
constexpr int kErrInternal = 0x0F00;       // out of memory or another failure inside the emulation
constexpr int kErrNoSuchShare = 0x1400;    // no share has the name, or no share holds the path
constexpr int kErrQuotaShort = 0x2400;     // quota too small (the emulation has no quotas: forced only)
constexpr int kErrSpaceShort = 0x2900;     // not enough free space on the file system
constexpr int kErrFileSystem = 0x2A00;     // stat, statfs, statvfs or mkdir failed on the host
constexpr int kErrCannotRun = 0x3300;      // a program could not be started, or a process not stopped
constexpr int kErrProgramFailed = 0x3301;  // a program exited with a non-zero status or by a signal

}  // namespace EMULATION
}  // namespace VEXO

#endif
