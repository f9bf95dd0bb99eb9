// JSON values made from the C texts the platform interface passes around.
#ifndef VEXOEMU_JSON_TEXT_H
#define VEXOEMU_JSON_TEXT_H

#include <json/value.h>

namespace VEXO {
namespace EMULATION {

// A JSON string holding the bytes of a C text, or null for a null pointer.
Json::Value TextValue(const char *text);

}  // namespace EMULATION
}  // namespace VEXO

#endif
