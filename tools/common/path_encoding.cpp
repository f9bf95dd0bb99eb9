// The tools' encodings of byte strings: JSON "path"/"path_bytes", percent-encoding, terminal quoting.
#include "path_encoding.h"

namespace fileindex_tool {

namespace {

// Length of the valid UTF-8 sequence that starts at bytes[at], or 0 when that byte does not start
// one (RFC 3629: no overlong forms, no surrogates, nothing above U+10FFFF).
size_t SequenceLength(const std::string &bytes, size_t at)
{
    const auto byte = [&bytes](size_t i) { return static_cast<unsigned char>(bytes[i]); };
    const unsigned char lead = byte(at);
    if (lead < 0x80) {
        return 1;
    }
    size_t length = 0;
    unsigned char low = 0x80;
    unsigned char high = 0xBF;  // the range of the first continuation byte
    if (lead >= 0xC2 && lead <= 0xDF) {
        length = 2;
    } else if (lead >= 0xE0 && lead <= 0xEF) {
        length = 3;
        low = lead == 0xE0 ? 0xA0 : 0x80;
        high = lead == 0xED ? 0x9F : 0xBF;
    } else if (lead >= 0xF0 && lead <= 0xF4) {
        length = 4;
        low = lead == 0xF0 ? 0x90 : 0x80;
        high = lead == 0xF4 ? 0x8F : 0xBF;
    } else {
        return 0;
    }
    if (at + length > bytes.size() || byte(at + 1) < low || byte(at + 1) > high) {
        return 0;
    }
    for (size_t i = 2; i < length; ++i) {
        if ((byte(at + i) & 0xC0) != 0x80) {
            return 0;
        }
    }
    return length;
}

// Appends the byte as prefix and two hex digits (upper or lower case), without formatting calls:
// every folder record of a page encodes two paths this way.
void AppendHexByte(std::string &text, const char *prefix, unsigned char byte, bool upper)
{
    const char *digits = upper ? "0123456789ABCDEF" : "0123456789abcdef";
    text += prefix;
    text += digits[byte >> 4];
    text += digits[byte & 0x0F];
}

bool IsUnreserved(unsigned char byte)
{
    return (byte >= 'A' && byte <= 'Z') || (byte >= 'a' && byte <= 'z') || (byte >= '0' && byte <= '9') ||
           byte == '-' || byte == '.' || byte == '_' || byte == '~' || byte == '/';
}

int HexValue(char digit)
{
    if (digit >= '0' && digit <= '9') {
        return digit - '0';
    }
    if (digit >= 'a' && digit <= 'f') {
        return digit - 'a' + 10;
    }
    if (digit >= 'A' && digit <= 'F') {
        return digit - 'A' + 10;
    }
    return -1;
}

// A control character that the terminal acts upon: C0, DEL, or C1 (U+0080..U+009F, which UTF-8
// writes as 0xC2 0x80..0x9F) starting at bytes[at].
bool IsControlAt(const std::string &bytes, size_t at)
{
    const auto lead = static_cast<unsigned char>(bytes[at]);
    return lead < 0x20 || lead == 0x7F ||
           (lead == 0xC2 && at + 1 < bytes.size() && static_cast<unsigned char>(bytes[at + 1]) < 0xA0);
}

// Appends the shell escape of one control byte inside $'...'.
void AppendControlEscape(std::string &text, unsigned char byte)
{
    switch (byte) {
    case '\a': text += "\\a"; break;
    case '\b': text += "\\b"; break;
    case '\t': text += "\\t"; break;
    case '\n': text += "\\n"; break;
    case '\v': text += "\\v"; break;
    case '\f': text += "\\f"; break;
    case '\r': text += "\\r"; break;
    case 0x1B: text += "\\e"; break;
    default: AppendHexByte(text, "\\x", byte, false);
    }
}

}  // namespace

bool IsValidUtf8(const std::string &bytes)
{
    for (size_t at = 0; at < bytes.size();) {
        const size_t length = SequenceLength(bytes, at);
        if (length == 0) {
            return false;
        }
        at += length;
    }
    return true;
}

std::string DisplayText(const std::string &bytes)
{
    std::string text;
    text.reserve(bytes.size());
    size_t copied = 0;  // bytes before this are in text already
    for (size_t at = 0; at < bytes.size();) {
        const size_t length = SequenceLength(bytes, at);
        if (length != 0) {
            at += length;
            continue;
        }
        text.append(bytes, copied, at - copied);
        AppendHexByte(text, "\\x", static_cast<unsigned char>(bytes[at]), false);
        copied = ++at;
    }
    text.append(bytes, copied, std::string::npos);
    return text;
}

std::string PercentEncode(const std::string &bytes)
{
    std::string text;
    text.reserve(bytes.size());
    for (const char c : bytes) {
        const auto byte = static_cast<unsigned char>(c);
        if (IsUnreserved(byte)) {
            text += c;
        } else {
            AppendHexByte(text, "%", byte, true);
        }
    }
    return text;
}

bool PercentDecode(const std::string &text, std::string &bytes)
{
    std::string decoded;
    decoded.reserve(text.size());
    for (size_t at = 0; at < text.size(); ++at) {
        if (text[at] != '%') {
            decoded += text[at];
            continue;
        }
        if (at + 2 >= text.size()) {
            return false;
        }
        const int high = HexValue(text[at + 1]);
        const int low = HexValue(text[at + 2]);
        if (high < 0 || low < 0) {
            return false;
        }
        decoded += static_cast<char>(high * 16 + low);
        at += 2;
    }
    bytes = std::move(decoded);
    return true;
}

std::string TerminalText(const std::string &bytes)
{
    bool plain = true;
    for (size_t at = 0; at < bytes.size() && plain;) {
        const size_t length = SequenceLength(bytes, at);
        plain = length != 0 && !IsControlAt(bytes, at);
        at += length;
    }
    if (plain) {
        return bytes;
    }
    std::string text = "$'";
    for (size_t at = 0; at < bytes.size();) {
        const size_t length = SequenceLength(bytes, at);
        const auto byte = static_cast<unsigned char>(bytes[at]);
        if (length == 0) {
            AppendHexByte(text, "\\x", byte, false);
            ++at;
        } else if (IsControlAt(bytes, at)) {
            for (size_t i = 0; i < length; ++i) {
                AppendControlEscape(text, static_cast<unsigned char>(bytes[at + i]));
            }
            at += length;
        } else if (byte == '\\' || byte == '\'') {
            text += '\\';
            text += bytes[at++];
        } else {
            text.append(bytes, at, length);
            at += length;
        }
    }
    return text + "'";
}

void SetBytesMember(Json::Value &object, const std::string &name, const std::string &bytes)
{
    object[name] = DisplayText(bytes);
    object[name + "_bytes"] = PercentEncode(bytes);
}

}  // namespace fileindex_tool
