// Program execution: run, wait, and tell whether the program succeeded.
#include <cstdarg>
#include <optional>
#include <string>
#include <vector>

#include "api.h"
#include "faults.h"
#include "journal.h"
#include "json_text.h"
#include "platform/service.h"
#include "process.h"

namespace VEXO {
namespace EMULATION {
namespace {

int Run(const char *path, const std::vector<std::string> &argv)
{
    switch (RunAndWait(path, argv)) {
    case RunOutcome::kSucceeded:
        return 0;
    case RunOutcome::kFailed:
        EMU_SET_ERROR(kErrProgramFailed);
        return -1;
    case RunOutcome::kNotRun:
        break;
    }
    EMU_SET_ERROR(kErrCannotRun);
    return -1;
}

}  // namespace
}  // namespace EMULATION
}  // namespace VEXO

using namespace VEXO::EMULATION;

extern "C" VEXOEMU_API int VLIBCExec(const char *szPath, ...)
{
    // The variable arguments are taken before anything can fail, so that va_end always follows.
    std::vector<const char *> rest;
    va_list ap;
    va_start(ap, szPath);
    if (szPath != nullptr) {
        while (const char *arg = va_arg(ap, const char *)) {
            rest.push_back(arg);
        }
    }
    va_end(ap);

    return Guarded(-1, [&] {
        Json::Value args(Json::arrayValue);
        args.append(TextValue(szPath));
        for (const char *arg : rest) {
            args.append(TextValue(arg));
        }
        if (const std::optional<int> forced = ForcedResult("VLIBCExec", szPath)) {
            JournalCall("VLIBCExec", args, *forced, true);
            return *forced;
        }
        int result = -1;
        if (szPath == nullptr) {
            EMU_SET_ERROR(kErrBadArgument);
        } else {
            std::vector<std::string> argv(1, szPath);
            argv.insert(argv.end(), rest.begin(), rest.end());
            result = Run(szPath, argv);
        }
        JournalCall("VLIBCExec", args, result, false);
        return result;
    });
}

extern "C" VEXOEMU_API int VLIBCExecv(const char *szPath, const char *const argv[], int options)
{
    return Guarded(-1, [&] {
        Json::Value args(Json::arrayValue);
        args.append(TextValue(szPath));
        Json::Value vector(Json::arrayValue);
        std::vector<std::string> strings;
        for (size_t i = 0; argv != nullptr && argv[i] != nullptr; ++i) {
            vector.append(TextValue(argv[i]));
            strings.emplace_back(argv[i]);
        }
        args.append(argv != nullptr ? vector : Json::Value(Json::nullValue));
        args.append(options);
        if (const std::optional<int> forced = ForcedResult("VLIBCExecv", szPath)) {
            JournalCall("VLIBCExecv", args, *forced, true);
            return *forced;
        }
        int result = -1;
        if (szPath == nullptr || strings.empty()) {
            EMU_SET_ERROR(kErrBadArgument);
        } else {
            result = Run(szPath, strings);
        }
        JournalCall("VLIBCExecv", args, result, false);
        return result;
    });
}
