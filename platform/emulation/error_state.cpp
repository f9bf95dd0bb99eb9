// The platform's last error, kept per thread like the appliance's.
#include "platform/error_state.h"

#include <string>

#include "api.h"
#include "journal.h"
#include "json_text.h"

namespace VEXO {
namespace EMULATION {
namespace {

struct ErrorState {
    int code = 0;
    std::string file;
    int line = 0;
};

thread_local ErrorState t_error;

}  // namespace

void SetPlatformError(int code, const char *file, int line) noexcept
{
    t_error.code = code;
    t_error.line = line;
    try {
        t_error.file = file != nullptr ? file : "";
    } catch (...) {
        t_error.file.clear();
    }
}

}  // namespace EMULATION
}  // namespace VEXO

using namespace VEXO::EMULATION;

extern "C" VEXOEMU_API int VLIBCErrGet(void)
{
    return t_error.code;
}

extern "C" VEXOEMU_API const char *VLIBCErrorGetFile(void)
{
    return t_error.file.c_str();
}

extern "C" VEXOEMU_API int VLIBCErrorGetLine(void)
{
    return t_error.line;
}

extern "C" VEXOEMU_API void VLIBCErrSetEx(int code, const char *szFile, int line)
{
    SetPlatformError(code, szFile, line);
    try {
        Json::Value args(Json::arrayValue);
        args.append(code);
        args.append(TextValue(szFile));
        args.append(line);
        JournalCall("VLIBCErrSetEx", args, Json::Value(Json::nullValue), false);
    } catch (...) {
        // The error is recorded; only its journal line is lost.
    }
}
