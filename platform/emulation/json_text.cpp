#include "json_text.h"

#include <cstring>
#include <memory>
#include <sstream>

#include <json/reader.h>
#include <json/writer.h>

namespace VEXO {
namespace EMULATION {
namespace {

std::unique_ptr<Json::CharReader> NewReader()
{
    Json::CharReaderBuilder builder;
    builder["failIfExtra"] = true;
    return std::unique_ptr<Json::CharReader>(builder.newCharReader());
}

std::unique_ptr<Json::StreamWriter> NewCompactWriter()
{
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["commentStyle"] = "None";
    // Without this the writer escapes non-ASCII text and turns bytes that are not UTF-8 into
    // U+FFFD; paths on the appliance are arbitrary bytes and must come out as they went in.
    builder["emitUTF8"] = true;
    return std::unique_ptr<Json::StreamWriter>(builder.newStreamWriter());
}

}  // namespace

bool ParseJson(const std::string &text, Json::Value &value)
{
    thread_local const std::unique_ptr<Json::CharReader> reader = NewReader();
    return reader->parse(text.data(), text.data() + text.size(), &value, nullptr);
}

std::string CompactJson(const Json::Value &value)
{
    thread_local const std::unique_ptr<Json::StreamWriter> writer = NewCompactWriter();
    std::ostringstream out;
    writer->write(value, &out);
    return out.str();
}

Json::Value TextValue(const char *text)
{
    if (text == nullptr) {
        return Json::Value(Json::nullValue);
    }
    return Json::Value(text, text + std::strlen(text));
}

}  // namespace EMULATION
}  // namespace VEXO
