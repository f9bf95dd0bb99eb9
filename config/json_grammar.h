// Checks text against the JSON grammar of RFC 8259 before it is handed to the JSON library, which
// on its own also accepts "01", "1.", a lone "-", raw control characters inside strings and
// unpaired UTF-16 surrogate escapes ("\ud800\u0041" would lose its "A").
//
// The same check can report what it passes over to an observer, so that a reader that needs only a
// few members takes them straight from the text instead of building a Json::Value.
#ifndef FILEINDEX_CONFIG_JSON_GRAMMAR_H
#define FILEINDEX_CONFIG_JSON_GRAMMAR_H

#include <cstddef>
#include <cstdint>
#include <cstring>

#if defined(__SSE2__)
#include <emmintrin.h>
#endif

namespace VEXO {
namespace FILEINDEX {

// Deepest nesting of arrays and objects accepted; deeper texts are refused rather than recursed into.
constexpr int kMaxJsonDepth = 512;

// True when [text, text + length) is exactly one JSON value with optional surrounding white space.
// Bytes of 0x80 and above inside strings are accepted as they are, whatever their encoding.
bool IsJsonText(const char *text, size_t length);

enum class JsonToken { kString, kNumber, kTrue, kFalse, kNull, kObject, kArray };

// IsJsonText, telling observer what it meets in text order. Depth counts the arrays and objects
// around a value: the top-level value is at depth 0, the members of a top-level object at depth 1.
//   observer.Key(depth, begin, end, escaped): a member name; [begin, end) lies between its quotes
//     and escaped tells whether it holds a backslash.
//   observer.Value(depth, token, begin, end, escaped): a value. Strings as for names; numbers and
//     literals: their text; objects and arrays: reported as they open, before their members, with
//     [begin, end) the opening bracket.
// A text that fails the grammar may have been reported in part before the scan returns false.
template <typename Observer>
bool ScanJsonText(const char *text, size_t length, Observer &observer);

// The first byte in [p, end) that ends the plain run of a string's bytes, a quote, a backslash or a
// control character; end when there is none. Sixteen or eight bytes are looked at at a time.
inline const char *SkipPlainStringBytes(const char *p, const char *end);

// ---- Implementation ----

namespace json_grammar_detail {

// Bytes that end the plain run of a string: the closing quote, a backslash, control characters.
struct StringStops {
    bool stop[256];
    constexpr StringStops() : stop()
    {
        for (int c = 0; c < 0x20; ++c) {
            stop[c] = true;
        }
        stop[static_cast<unsigned char>('"')] = true;
        stop[static_cast<unsigned char>('\\')] = true;
    }
};
constexpr StringStops kStringStops;

// The high bit of each byte of word that is a quote, a backslash or a control character (the usual
// test for a zero byte, made on the byte xor '"', on it xor '\\', and on it less 0x20). Bytes above
// the first such byte may be marked wrongly; the first one never is.
inline uint64_t StringStopBytes(uint64_t word)
{
    constexpr uint64_t kOnes = 0x0101010101010101ULL;
    constexpr uint64_t kHighs = 0x8080808080808080ULL;
    const uint64_t quote = word ^ (kOnes * '"');
    const uint64_t backslash = word ^ (kOnes * '\\');
    const uint64_t zeroQuote = (quote - kOnes) & ~quote;
    const uint64_t zeroBackslash = (backslash - kOnes) & ~backslash;
    const uint64_t control = (word - kOnes * 0x20) & ~word;
    return (zeroQuote | zeroBackslash | control) & kHighs;
}

}  // namespace json_grammar_detail

inline const char *SkipPlainStringBytes(const char *p, const char *end)
{
#if defined(__SSE2__)
    const __m128i quote = _mm_set1_epi8('"');
    const __m128i backslash = _mm_set1_epi8('\\');
    const __m128i lastControl = _mm_set1_epi8(0x1F);
    for (; end - p >= 16; p += 16) {
        const __m128i bytes = _mm_loadu_si128(reinterpret_cast<const __m128i *>(p));
        const __m128i control = _mm_cmpeq_epi8(_mm_max_epu8(bytes, lastControl), lastControl);
        const __m128i stops = _mm_or_si128(_mm_or_si128(_mm_cmpeq_epi8(bytes, quote), _mm_cmpeq_epi8(bytes, backslash)), control);
        const int mask = _mm_movemask_epi8(stops);
        if (mask != 0) {
            return p + __builtin_ctz(static_cast<unsigned>(mask));
        }
    }
#endif
    for (; end - p >= 8; p += 8) {
        uint64_t word;
        std::memcpy(&word, p, sizeof(word));
        const uint64_t stops = json_grammar_detail::StringStopBytes(word);
        if (stops != 0) {
#if defined(__BYTE_ORDER__) && __BYTE_ORDER__ == __ORDER_LITTLE_ENDIAN__
            return p + (__builtin_ctzll(stops) >> 3);  // the first byte of the word in memory
#else
            break;
#endif
        }
    }
    while (p != end && !json_grammar_detail::kStringStops.stop[static_cast<unsigned char>(*p)]) {
        ++p;
    }
    return p;
}

namespace json_grammar_detail {

template <typename Observer>
class Scan {
public:
    Scan(const char *text, size_t length, Observer &observer) : m_pos(text), m_end(text + length), m_observer(observer)
    {
    }

    bool Text()
    {
        SkipWhiteSpace();
        if (!Value(0)) {
            return false;
        }
        SkipWhiteSpace();
        return m_pos == m_end;
    }

private:
    bool AtEnd() const { return m_pos == m_end; }
    char Peek() const { return *m_pos; }

    bool Take(char c)
    {
        if (AtEnd() || Peek() != c) {
            return false;
        }
        ++m_pos;
        return true;
    }

    void SkipWhiteSpace()
    {
        while (!AtEnd() && (Peek() == ' ' || Peek() == '\t' || Peek() == '\n' || Peek() == '\r')) {
            ++m_pos;
        }
    }

    bool Value(int depth)
    {
        if (AtEnd()) {
            return false;
        }
        switch (Peek()) {
        case '{':
            m_observer.Value(depth, JsonToken::kObject, m_pos, m_pos + 1, false);
            return Object(depth + 1);
        case '[':
            m_observer.Value(depth, JsonToken::kArray, m_pos, m_pos + 1, false);
            return Array(depth + 1);
        case '"':
            return String(depth, false);
        case 't':
            return Literal(depth, "true", JsonToken::kTrue);
        case 'f':
            return Literal(depth, "false", JsonToken::kFalse);
        case 'n':
            return Literal(depth, "null", JsonToken::kNull);
        default:
            return Number(depth);
        }
    }

    bool Object(int depth)
    {
        return Elements(depth, '}', [this, depth] { return Member(depth); });
    }

    bool Array(int depth)
    {
        return Elements(depth, ']', [this, depth] { return Value(depth); });
    }

    // The opening bracket, then elements separated by commas (none at all is allowed), then close.
    template <typename Element>
    bool Elements(int depth, char close, const Element &element)
    {
        if (depth > kMaxJsonDepth) {
            return false;
        }
        ++m_pos;
        SkipWhiteSpace();
        if (Take(close)) {
            return true;
        }
        do {
            SkipWhiteSpace();
            if (!element()) {
                return false;
            }
            SkipWhiteSpace();
        } while (Take(','));
        return Take(close);
    }

    // "name" : value
    bool Member(int depth)
    {
        if (AtEnd() || Peek() != '"' || !String(depth, true)) {
            return false;
        }
        SkipWhiteSpace();
        if (!Take(':')) {
            return false;
        }
        SkipWhiteSpace();
        return Value(depth);
    }

    bool String(int depth, bool isKey)
    {
        const char *const begin = ++m_pos;
        bool escaped = false;
        for (;;) {
            SkipPlainBytes();
            if (AtEnd() || static_cast<unsigned char>(*m_pos) < 0x20) {
                return false;
            }
            if (*m_pos == '"') {
                break;
            }
            ++m_pos;
            escaped = true;
            if (!Escape()) {
                return false;
            }
        }
        if (isKey) {
            m_observer.Key(depth, begin, m_pos, escaped);
        } else {
            m_observer.Value(depth, JsonToken::kString, begin, m_pos, escaped);
        }
        ++m_pos;
        return true;
    }

    void SkipPlainBytes() { m_pos = SkipPlainStringBytes(m_pos, m_end); }

    // Reads the four hex digits of a \u escape into unit.
    bool HexQuad(unsigned &unit)
    {
        unit = 0;
        for (int i = 0; i < 4; ++i) {
            if (AtEnd()) {
                return false;
            }
            const char c = *m_pos++;
            const unsigned digit = c >= '0' && c <= '9'   ? static_cast<unsigned>(c - '0')
                                   : c >= 'a' && c <= 'f' ? static_cast<unsigned>(c - 'a' + 10)
                                   : c >= 'A' && c <= 'F' ? static_cast<unsigned>(c - 'A' + 10)
                                                          : 16u;
            if (digit == 16u) {
                return false;
            }
            unit = unit * 16 + digit;
        }
        return true;
    }

    // A \u escape names one UTF-16 unit: a high surrogate must be followed by an escaped low one,
    // and a low surrogate never stands alone. The JSON library would otherwise decode an unpaired
    // one into a wrong character and swallow the text after it.
    bool UnicodeEscape()
    {
        unsigned unit;
        if (!HexQuad(unit) || (unit >= 0xDC00 && unit <= 0xDFFF)) {
            return false;
        }
        if (unit < 0xD800 || unit > 0xDBFF) {
            return true;
        }
        return Take('\\') && Take('u') && HexQuad(unit) && unit >= 0xDC00 && unit <= 0xDFFF;
    }

    bool Escape()
    {
        if (AtEnd()) {
            return false;
        }
        const char c = *m_pos++;
        switch (c) {
        case '"': case '\\': case '/': case 'b': case 'f': case 'n': case 'r': case 't':
            return true;
        case 'u':
            return UnicodeEscape();
        default:
            return false;
        }
    }

    bool Digits()
    {
        const char *start = m_pos;
        while (!AtEnd() && Peek() >= '0' && Peek() <= '9') {
            ++m_pos;
        }
        return m_pos != start;
    }

    bool Number(int depth)
    {
        const char *const begin = m_pos;
        Take('-');
        // A leading zero stands alone: the digit that would follow it fails the enclosing rule.
        if (!Take('0') && !Digits()) {
            return false;
        }
        if (Take('.') && !Digits()) {
            return false;
        }
        if (!AtEnd() && (Peek() == 'e' || Peek() == 'E')) {
            ++m_pos;
            if (!Take('+')) {
                Take('-');
            }
            if (!Digits()) {
                return false;
            }
        }
        m_observer.Value(depth, JsonToken::kNumber, begin, m_pos, false);
        return true;
    }

    bool Literal(int depth, const char *word, JsonToken token)
    {
        const char *const begin = m_pos;
        for (; *word != '\0'; ++word) {
            if (!Take(*word)) {
                return false;
            }
        }
        m_observer.Value(depth, token, begin, m_pos, false);
        return true;
    }

    const char *m_pos;
    const char *const m_end;
    Observer &m_observer;
};

}  // namespace json_grammar_detail

template <typename Observer>
bool ScanJsonText(const char *text, size_t length, Observer &observer)
{
    return json_grammar_detail::Scan<Observer>(text, length, observer).Text();
}

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
