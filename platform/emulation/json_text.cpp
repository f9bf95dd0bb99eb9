// JSON values made from the platform interface's C texts.
#include "json_text.h"

#include <cstring>

namespace VEXO {
namespace EMULATION {

Json::Value TextValue(const char *text)
{
    if (text == nullptr) {
        return Json::Value(Json::nullValue);
    }
    return Json::Value(text, text + std::strlen(text));
}

}  // namespace EMULATION
}  // namespace VEXO
