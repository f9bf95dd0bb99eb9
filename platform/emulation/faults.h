// faults.json: rules that force an operation's result and error code.
#ifndef VEXOEMU_FAULTS_H
#define VEXOEMU_FAULTS_H

#include <optional>

namespace VEXO {
namespace EMULATION {

// The result a rule forces on the operation, called with matchText as its first text argument
// (null when the operation has none). When a rule applies, the error state it names is set.
std::optional<int> ForcedResult(const char *op, const char *matchText);

// True when any rule for the operation applies, whether it names a result or not (for operations
// that have nothing to return, such as a constructor that can only throw).
bool ForcedFailure(const char *op, const char *matchText);

}  // namespace EMULATION
}  // namespace VEXO

#endif
