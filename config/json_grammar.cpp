#include "config/json_grammar.h"

namespace VEXO {
namespace FILEINDEX {
namespace {

class GrammarCheck {
public:
    GrammarCheck(const char *text, size_t length) : m_pos(text), m_end(text + length) {}

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
            return Object(depth + 1);
        case '[':
            return Array(depth + 1);
        case '"':
            return String();
        case 't':
            return Literal("true");
        case 'f':
            return Literal("false");
        case 'n':
            return Literal("null");
        default:
            return Number();
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
        if (AtEnd() || Peek() != '"' || !String()) {
            return false;
        }
        SkipWhiteSpace();
        if (!Take(':')) {
            return false;
        }
        SkipWhiteSpace();
        return Value(depth);
    }

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

    bool String()
    {
        ++m_pos;
        while (!AtEnd()) {
            const unsigned char c = static_cast<unsigned char>(*m_pos++);
            if (c == '"') {
                return true;
            }
            if (c < 0x20) {
                return false;
            }
            if (c == '\\' && !Escape()) {
                return false;
            }
        }
        return false;
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

    bool Number()
    {
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
        return true;
    }

    bool Literal(const char *word)
    {
        for (; *word != '\0'; ++word) {
            if (!Take(*word)) {
                return false;
            }
        }
        return true;
    }

    const char *m_pos;
    const char *const m_end;
};

}  // namespace

bool IsJsonText(const char *text, size_t length)
{
    return GrammarCheck(text, length).Text();
}

}  // namespace FILEINDEX
}  // namespace VEXO
