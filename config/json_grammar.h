// Checks text against the JSON grammar of RFC 8259 before it is handed to the JSON library, which
// on its own also accepts "01", "1.", a lone "-", raw control characters inside strings and
// unpaired UTF-16 surrogate escapes ("\ud800\u0041" would lose its "A").
#ifndef FILEINDEX_CONFIG_JSON_GRAMMAR_H
#define FILEINDEX_CONFIG_JSON_GRAMMAR_H

#include <cstddef>

namespace VEXO {
namespace FILEINDEX {

// Deepest nesting of arrays and objects accepted; deeper texts are refused rather than recursed into.
constexpr int kMaxJsonDepth = 512;

// True when [text, text + length) is exactly one JSON value with optional surrounding white space.
// Bytes of 0x80 and above inside strings are accepted as they are, whatever their encoding.
bool IsJsonText(const char *text, size_t length);

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
