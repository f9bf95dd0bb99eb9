// The frame that carries one command to fileindexd: the 4-byte length in host byte order (the
// text's length plus one), the compact JSON text of {"type": type, "data": data}, and one NUL.
#ifndef FILEINDEX_DAEMON_COMMAND_FRAME_H
#define FILEINDEX_DAEMON_COMMAND_FRAME_H

#include <cstddef>
#include <cstdint>
#include <string>

#include <json/value.h>

namespace VEXO {
namespace FILEINDEX {

// Bytes of the length that opens every frame.
constexpr size_t kFrameLengthSize = sizeof(uint32_t);

// The whole frame of one command, length first. String bytes are copied raw, valid UTF-8 or not;
// the JSON text itself never holds a NUL, so the frame's only NUL is its last byte.
std::string EncodeCommandFrame(const std::string &type, const Json::Value &data);

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
