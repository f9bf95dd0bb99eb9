// Tokens that ScanJsonText (json_grammar.h) reports, read as the JSON library reads them, for
// readers that take members straight from the text. Where the library follows rules of its own,
// these functions decline, and the reader leaves that text to the library.
#ifndef FILEINDEX_CONFIG_JSON_TOKEN_H
#define FILEINDEX_CONFIG_JSON_TOKEN_H

#include <cstdint>
#include <string>

#include "config/json_grammar.h"

namespace VEXO {
namespace FILEINDEX {

// The bytes a string stands for, from the text between its quotes: escapes resolved, every other
// byte kept as it is. False for a \u escape of a high surrogate (\uD800 to \uDBFF), which the
// library combines with the escape after it by rules of its own.
bool DecodeJsonString(const char *begin, const char *end, std::string &out);

// The value of a number written as an integer of at most 18 digits, which the library reads
// exactly. False for every other form (a fraction, an exponent, more digits), including some the
// library refuses (1e400).
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

// Watches the tokens of one scan for text that only the library can judge: a number other than a
// plain integer, a string with a high-surrogate escape. A reader whose scan met such text hands
// the whole text to the library instead.
class LibraryOnlyText {
public:
    void See(JsonToken token, const char *begin, const char *end, bool escaped)
    {
        int64_t plain = 0;
        if (token == JsonToken::kNumber ? !ReadPlainJsonInteger(begin, end, plain) : escaped && !Decodes(begin, end)) {
            m_seen = true;
        }
    }
    bool Seen() const { return m_seen; }

private:
    bool Decodes(const char *begin, const char *end);

    bool m_seen = false;
    std::string m_scratch;
};

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
