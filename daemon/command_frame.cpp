// The bytes of one command frame to fileindexd.
#include "daemon/command_frame.h"

#include <cstring>

#include "config/json_io.h"

namespace VEXO {
namespace FILEINDEX {

std::string EncodeCommandFrame(const std::string &type, const Json::Value &data)
{
    Json::Value command(Json::objectValue);
    command["type"] = Json::Value(type);
    command["data"] = data;
    const std::string text = toString(command);
    const uint32_t length = static_cast<uint32_t>(text.size() + 1);

    std::string frame(kFrameLengthSize, '\0');
    memcpy(&frame[0], &length, kFrameLengthSize);
    frame += text;
    frame += '\0';
    return frame;
}

}  // namespace FILEINDEX
}  // namespace VEXO
