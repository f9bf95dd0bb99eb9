// journal.jsonl: one compact JSON line per side-effecting call, appended in the order of the calls.
#ifndef VEXOEMU_JOURNAL_H
#define VEXOEMU_JOURNAL_H

#include <json/value.h>

namespace VEXO {
namespace EMULATION {

// Appends {"op","args","result","pid"[,"forced":true]}. A journal that cannot be written loses the
// line; the call itself is not affected.
void JournalCall(const char *op, const Json::Value &args, const Json::Value &result, bool forced);

}  // namespace EMULATION
}  // namespace VEXO

#endif
