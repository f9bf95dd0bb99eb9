// Tokens that ScanJsonText (json_grammar.h) reports, read as the JSON library reads them, for
// readers that take members straight from the text. The library reads one kind of token by rules
// of its own, numbers that are not plain integers (it refuses 1e400, for one): a reader that meets
// one leaves the whole text to the library.
#ifndef FILEINDEX_CONFIG_JSON_TOKEN_H
#define FILEINDEX_CONFIG_JSON_TOKEN_H

#include <cstdint>
#include <string>

#include "config/json_grammar.h"

namespace VEXO {
namespace FILEINDEX {

// The bytes a string stands for, from the text between its quotes as ScanJsonText accepted it:
// escapes resolved (a surrogate pair into its one character), every other byte kept as it is.
void DecodeJsonString(const char *begin, const char *end, std::string &out);

// The value of a number written as an integer of at most 18 digits, which the library reads
// exactly. False for every other form (a fraction, an exponent, more digits).
inline bool ReadPlainJsonInteger(const char *begin, const char *end, int64_t &value)
{
    const bool negative = begin != end && *begin == '-';
    const char *digits = negative ? begin + 1 : begin;
    if (end - digits > 18) {
        return false;
    }
    int64_t magnitude = 0;
    for (const char *p = digits; p != end; ++p) {
        if (*p < '0' || *p > '9') {
            return false;
        }
        magnitude = magnitude * 10 + (*p - '0');
    }
    value = negative ? -magnitude : magnitude;
    return true;
}

// True for a token the library reads by rules of its own: a number other than a plain integer.
inline bool NeedsJsonLibrary(JsonToken token, const char *begin, const char *end)
{
    int64_t plain = 0;
    return token == JsonToken::kNumber && !ReadPlainJsonInteger(begin, end, plain);
}

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
