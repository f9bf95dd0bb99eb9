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

    static bool IsHexDigit(char c)
    {
        return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f') || (c >= 'A' && c <= 'F');
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
            for (int i = 0; i < 4; ++i) {
                if (AtEnd() || !IsHexDigit(*m_pos++)) {
                    return false;
                }
            }
            return true;
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
