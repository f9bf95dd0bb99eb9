// JSON text as the emulation reads and writes it.
#ifndef VEXOEMU_JSON_TEXT_H
#define VEXOEMU_JSON_TEXT_H

#include <string>

#include <json/value.h>

namespace VEXO {
namespace EMULATION {

// Parses a whole text; comments are allowed, anything after the value is not.
bool ParseJson(const std::string &text, Json::Value &value);
// One line of compact JSON. String bytes are copied as they are, also when they are not UTF-8.
std::string CompactJson(const Json::Value &value);
// A JSON string holding the bytes of a C text, or null for a null pointer.
Json::Value TextValue(const char *text);

}  // namespace EMULATION
}  // namespace VEXO

#endif
