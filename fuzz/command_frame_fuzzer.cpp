// The frame of one daemon command. Whatever the command's type and data hold (bytes that are not
// UTF-8, NULs, quotes, deep nesting), the frame is its length, one JSON text without a NUL, and a
// NUL; the text reads back as exactly {"type", "data"}, and framing what was read back gives the
// same bytes again.
#include <fuzzer/FuzzedDataProvider.h>

#include <cstdlib>
#include <cstring>
#include <string>

#include "config/json_io.h"
#include "daemon/command_frame.h"

using namespace VEXO::FILEINDEX;

namespace {

// The command a daemon reads from a frame; aborts on a frame that is not well formed.
Json::Value Decode(const std::string &frame)
{
    uint32_t length = 0;
    if (frame.size() <= kFrameLengthSize) {
        abort();
    }
    memcpy(&length, frame.data(), kFrameLengthSize);
    const std::string text = frame.substr(kFrameLengthSize, frame.size() - kFrameLengthSize - 1);
    Json::Value command;
    if (length != frame.size() - kFrameLengthSize || frame.back() != '\0' || text.find('\0') != std::string::npos ||
        !fromString(command, text) || !command.isObject() || command.size() != 2 || !command["type"].isString()) {
        abort();
    }
    return command;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *bytes, size_t size)
{
    FuzzedDataProvider input(bytes, size);
    const std::string type = input.ConsumeRandomLengthString();
    const std::string rest = input.ConsumeRemainingBytesAsString();
    // The data is the rest of the input read as JSON, or as one string when it is not JSON.
    Json::Value data;
    if (!fromString(data, rest)) {
        data = Json::Value(rest);
    }

    const std::string frame = EncodeCommandFrame(type, data);
    const Json::Value command = Decode(frame);
    if (command["type"].asString() != type || command["data"] != data ||
        EncodeCommandFrame(command["type"].asString(), command["data"]) != frame) {
        abort();
    }
    return 0;
}
