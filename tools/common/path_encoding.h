// How fileindexctl and the panel carry byte strings (paths, folder and share names) where the text
// must be UTF-8 (JSON for other programs, a web page) or must not drive a terminal. Paths are bytes:
// nothing here folds case or normalises Unicode.
//
// In JSON every such member comes as a pair:
//   "<name>":       UTF-8 for display; the exact text when its bytes are valid UTF-8, otherwise each
//                   byte that is not part of a valid UTF-8 sequence written as the four characters
//                   \xNN (lower-case hex). Not reversible in general.
//   "<name>_bytes": the exact bytes, percent-encoded as RFC 3986 does: A-Z a-z 0-9 - . _ ~ and "/"
//                   stay, every other byte is %XX (upper-case hex). Lossless, pure ASCII, and safe
//                   to pass through xargs and shells.
#ifndef FILEINDEX_TOOL_PATH_ENCODING_H
#define FILEINDEX_TOOL_PATH_ENCODING_H

#include <string>

#include <json/value.h>

namespace fileindex_tool {

// True when every byte is part of a valid UTF-8 sequence (no overlong forms, no surrogates, nothing
// above U+10FFFF).
bool IsValidUtf8(const std::string &bytes);

// The "<name>" form: bytes unchanged when valid UTF-8, otherwise each stray byte as \xNN.
std::string DisplayText(const std::string &bytes);

// The "<name>_bytes" form.
std::string PercentEncode(const std::string &bytes);
// Reads the "<name>_bytes" form back: each %XX (either case of hex) is that byte, every other
// character stands for itself, so a plain path is its own encoding. False, bytes untouched, when a
// "%" is not followed by two hex digits.
bool PercentDecode(const std::string &text, std::string &bytes);

// For a terminal: unchanged when the bytes are valid UTF-8 without control characters (C0, DEL and
// the C1 range U+0080..U+009F); otherwise quoted as a shell reads it back, $'...', with \n, \t,
// \r, \e, \a, \b, \f, \v for those controls, \\ and \' for the quoting characters and \xNN for every
// other control or stray byte. No byte of the result can move the cursor or change the terminal.
std::string TerminalText(const std::string &bytes);

// Sets object[name] to DisplayText(bytes) and object[name + "_bytes"] to PercentEncode(bytes).
void SetBytesMember(Json::Value &object, const std::string &name, const std::string &bytes);

}  // namespace fileindex_tool

#endif
