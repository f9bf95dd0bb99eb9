// Whole-document operations on Json::Value, used for every file, frame, record and log argument.
//
// Reading is strict JSON text (RFC 8259): any value at the top level, no comments, nothing but
// white space after the value, surrogate escapes only in pairs. Bytes inside strings are kept as they are, valid UTF-8 or not.
// Writing is compact, on one line, with string bytes copied raw, so a value read back from what
// toString wrote equals the original byte for byte, unless ReadsBackAsWritten says it cannot.
//
// The library never saves a document, nor appends a queue record, that its own readers would
// refuse or read as something else: toFile and the queue's record writer refuse such a value, and
// their callers fail as they do when the file cannot be written.
#ifndef FILEINDEX_CONFIG_JSON_IO_H
#define FILEINDEX_CONFIG_JSON_IO_H

#include <string>

#include <json/value.h>

namespace VEXO {
namespace FILEINDEX {

// Parses text into value. False on anything but one strict JSON text; value is then unspecified.
bool fromString(Json::Value &value, const std::string &text);
// Compact one-line text of value, without a trailing newline.
std::string toString(const Json::Value &value);

// True when fromString reads toString(value) back as value. False for what JSON text cannot carry:
// an infinite number (toString writes 1e+9999, which no reader takes), NaN (written as null), and
// arrays and objects nested deeper than kMaxJsonDepth, which the readers refuse.
bool ReadsBackAsWritten(const Json::Value &value);

// Reads and parses a whole file. False when it cannot be read or does not parse.
bool fromFile(Json::Value &value, const std::string &path);
// Replaces the file with toString(value) atomically (ReplaceFileAtomically of file_io.h). False when
// it cannot be written, or when value does not read back as written (ReadsBackAsWritten; errno
// EINVAL); the previous file is then left as it was.
bool toFile(const Json::Value &value, const std::string &path);

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
