// fromString, toString, fromFile and toFile: the library's four whole-document JSON operations.
#include "config/json_io.h"

#include <cerrno>
#include <cmath>
#include <memory>
#include <sstream>

#include <json/reader.h>
#include <json/writer.h>

#include "config/file_io.h"
#include "config/json_grammar.h"

namespace VEXO {
namespace FILEINDEX {
namespace {

std::unique_ptr<Json::CharReader> NewStrictReader()
{
    Json::CharReaderBuilder builder;
    Json::CharReaderBuilder::strictMode(&builder.settings_);
    builder["strictRoot"] = false;     // any value may stand at the top level
    builder["rejectDupKeys"] = false;  // a repeated member name is valid JSON text; the last one wins
    builder["stackLimit"] = kMaxJsonDepth + 1;
    return std::unique_ptr<Json::CharReader>(builder.newCharReader());
}

std::unique_ptr<Json::StreamWriter> NewCompactWriter()
{
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["commentStyle"] = "None";
    // Copies string bytes as they are; the default writer would turn bytes that are not valid
    // UTF-8 into U+FFFD and lose them.
    builder["emitUTF8"] = true;
    return std::unique_ptr<Json::StreamWriter>(builder.newStreamWriter());
}

// enclosing: the number of arrays and objects around value.
bool ReadsBackAsWritten(const Json::Value &value, int enclosing)
{
    switch (value.type()) {
    case Json::realValue:
        return std::isfinite(value.asDouble());
    case Json::arrayValue:
    case Json::objectValue:
        if (enclosing == kMaxJsonDepth) {
            return false;
        }
        for (const Json::Value &element : value) {
            if (!ReadsBackAsWritten(element, enclosing + 1)) {
                return false;
            }
        }
        return true;
    default:
        return true;
    }
}

}  // namespace

bool fromString(Json::Value &value, const std::string &text)
{
    const char *begin = text.data();
    const char *end = begin + text.size();
    if (!IsJsonText(begin, text.size())) {
        return false;
    }
    thread_local const std::unique_ptr<Json::CharReader> reader = NewStrictReader();
    return reader->parse(begin, end, &value, nullptr);
}

std::string toString(const Json::Value &value)
{
    thread_local const std::unique_ptr<Json::StreamWriter> writer = NewCompactWriter();
    std::ostringstream out;
    writer->write(value, &out);
    return out.str();
}

bool ReadsBackAsWritten(const Json::Value &value)
{
    return ReadsBackAsWritten(value, 0);
}

bool fromFile(Json::Value &value, const std::string &path)
{
    std::string text;
    return ReadWholeFile(path, text) && fromString(value, text);
}

bool toFile(const Json::Value &value, const std::string &path)
{
    if (!ReadsBackAsWritten(value)) {
        errno = EINVAL;
        return false;
    }
    return ReplaceFileAtomically(path, toString(value));
}

}  // namespace FILEINDEX
}  // namespace VEXO
