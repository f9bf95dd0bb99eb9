#include "config/json_token.h"

namespace VEXO {
namespace FILEINDEX {

namespace {

unsigned HexValue(char c)
{
    return c <= '9' ? static_cast<unsigned>(c - '0') : static_cast<unsigned>((c | 0x20) - 'a' + 10);
}

void AppendUtf8(std::string &out, unsigned codePoint)
{
    if (codePoint < 0x80) {
        out += static_cast<char>(codePoint);
    } else if (codePoint < 0x800) {
        out += static_cast<char>(0xC0 | (codePoint >> 6));
        out += static_cast<char>(0x80 | (codePoint & 0x3F));
    } else {
        out += static_cast<char>(0xE0 | (codePoint >> 12));
        out += static_cast<char>(0x80 | ((codePoint >> 6) & 0x3F));
        out += static_cast<char>(0x80 | (codePoint & 0x3F));
    }
}

}  // namespace

bool DecodeJsonString(const char *begin, const char *end, std::string &out)
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
            unsigned codePoint = 0;
            for (int i = 0; i < 4; ++i) {
                codePoint = codePoint << 4 | HexValue(*p++);
            }
            if (codePoint >= 0xD800 && codePoint <= 0xDBFF) {
                return false;
            }
            AppendUtf8(out, codePoint);
            break;
        }
        default:  // '"', '\\', '/'
            out += escape;
        }
    }
    return true;
}

bool LibraryOnlyText::Decodes(const char *begin, const char *end)
{
    return DecodeJsonString(begin, end, m_scratch);
}

}  // namespace FILEINDEX
}  // namespace VEXO
