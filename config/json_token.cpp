// String and number tokens of a grammar scan decoded as the JSON library decodes them.
#include "config/json_token.h"

namespace VEXO {
namespace FILEINDEX {

namespace {

unsigned HexQuad(const char *text)
{
    unsigned value = 0;
    for (int i = 0; i < 4; ++i) {
        const char c = text[i];
        value = value << 4 | (c <= '9' ? static_cast<unsigned>(c - '0') : static_cast<unsigned>((c | 0x20) - 'a' + 10));
    }
    return value;
}

void AppendUtf8(std::string &out, unsigned codePoint)
{
    if (codePoint < 0x80) {
        out += static_cast<char>(codePoint);
    } else if (codePoint < 0x800) {
        out += static_cast<char>(0xC0 | (codePoint >> 6));
        out += static_cast<char>(0x80 | (codePoint & 0x3F));
    } else if (codePoint < 0x10000) {
        out += static_cast<char>(0xE0 | (codePoint >> 12));
        out += static_cast<char>(0x80 | ((codePoint >> 6) & 0x3F));
        out += static_cast<char>(0x80 | (codePoint & 0x3F));
    } else {
        out += static_cast<char>(0xF0 | (codePoint >> 18));
        out += static_cast<char>(0x80 | ((codePoint >> 12) & 0x3F));
        out += static_cast<char>(0x80 | ((codePoint >> 6) & 0x3F));
        out += static_cast<char>(0x80 | (codePoint & 0x3F));
    }
}

}  // namespace

void DecodeJsonString(const char *begin, const char *end, std::string &out)
{
    out.clear();
    for (const char *p = begin; p != end;) {
        const char *plain = p;
        while (p != end && *p != '\\') {
            ++p;
        }
        out.append(plain, p);
        if (p == end) {
            break;
        }
        const char escape = p[1];
        p += 2;
        switch (escape) {
        case 'b': out += '\b'; break;
        case 'f': out += '\f'; break;
        case 'n': out += '\n'; break;
        case 'r': out += '\r'; break;
        case 't': out += '\t'; break;
        case 'u': {
            unsigned codePoint = HexQuad(p);
            p += 4;
            if (codePoint >= 0xD800 && codePoint <= 0xDBFF) {  // the grammar lets a high one through paired only
                codePoint = 0x10000 + ((codePoint - 0xD800) << 10) + (HexQuad(p + 2) - 0xDC00);
                p += 6;
            }
            AppendUtf8(out, codePoint);
            break;
        }
        default:  // '"', '\\', '/'
            out += escape;
        }
    }
}

}  // namespace FILEINDEX
}  // namespace VEXO
