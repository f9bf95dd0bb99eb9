// Services and the SMB Spotlight switch: services.json records what runs, service_commands.json
// what to launch, smb.json the switch.
#include "platform/service.h"

#include <optional>
#include <string>
#include <vector>

#include "api.h"
#include "faults.h"
#include "journal.h"
#include "json_text.h"
#include "process.h"
#include "state_dir.h"

namespace VEXO {
namespace EMULATION {
namespace {

using CommandTable = Json::Value;

// How long a start waits at most for a launched program to get ready.
constexpr int kReadySeconds = 5;

bool ParseCommands(const Json::Value &json, CommandTable &commands)
{
    if (!json.isObject() && !json.isNull()) {
        return false;
    }
    commands = json;
    return true;
}

bool ParseSpotlight(const Json::Value &json, bool &spotlight)
{
    if (json.isNull()) {
        spotlight = false;
        return true;
    }
    if (!json.isObject() || (json.isMember("spotlight") && !json["spotlight"].isBool())) {
        return false;
    }
    spotlight = json.get("spotlight", false).asBool();
    return true;
}

// What starting a service launches: nothing (an empty command), or a program with its arguments,
// and optionally a path whose appearance means the program is ready.
struct ServiceCommand {
    std::vector<std::string> command;
    std::string ready;
};

// The command of a service: absent, an array of strings with the program's path first, or an
// object {"command": that array, "ready": path}. False when service_commands.json or the service's
// entry is malformed.
bool CommandOf(const std::string &service, ServiceCommand &launch)
{
    static CachedStateFile<CommandTable> commands("service_commands.json", ParseCommands);
    const std::shared_ptr<const CommandTable> table = commands.Get();
    if (table == nullptr) {
        return false;
    }
    if (!table->isMember(service)) {
        return true;
    }
    const Json::Value &entry = (*table)[service];
    const Json::Value &command = entry.isObject() ? entry["command"] : entry;
    if (!command.isArray() || command.empty() || (entry.isObject() && !entry.get("ready", "").isString())) {
        return false;
    }
    for (const Json::Value &arg : command) {
        if (!arg.isString()) {
            return false;
        }
        launch.command.push_back(arg.asString());
    }
    if (entry.isObject()) {
        launch.ready = entry.get("ready", "").asString();
    }
    return true;
}

LaunchedProcess ProcessOf(const Json::Value &entry)
{
    LaunchedProcess process;
    if (entry["pid"].isInt()) {
        process.pid = entry["pid"].asInt();
    }
    if (entry["started"].isUInt64()) {
        process.startTime = entry["started"].asUInt64();
    }
    return process;
}

bool RecordedRunning(const Json::Value &entry)
{
    return entry.isObject() && entry["running"].isBool() && entry["running"].asBool();
}

// A service runs while its entry says so and, when it has a process, that process is alive.
bool IsRunning(const Json::Value &entry)
{
    return RecordedRunning(entry) && (!entry.isMember("pid") || ProcessAlive(ProcessOf(entry)));
}

int StopLocked(Json::Value &services, const std::string &name)
{
    const Json::Value &entry = services[name];
    if (entry.isMember("pid") && !TerminateProcess(ProcessOf(entry))) {
        EMU_SET_ERROR(kErrCannotRun);
        return -1;
    }
    Json::Value stopped(Json::objectValue);
    stopped["running"] = false;
    services[name] = stopped;
    return 0;
}

int StartLocked(Json::Value &services, const std::string &name, std::string &ready)
{
    ServiceCommand launch;
    if (!CommandOf(name, launch)) {
        EMU_SET_ERROR(kErrStateFile);
        return -1;
    }
    ready = launch.ready;
    Json::Value entry(Json::objectValue);
    entry["running"] = true;
    if (!launch.command.empty()) {
        LaunchedProcess process;
        if (!LaunchDetached(launch.command, process)) {
            EMU_SET_ERROR(kErrCannotRun);
            return -1;
        }
        entry["pid"] = process.pid;
        if (process.startTime != 0) {
            entry["started"] = Json::UInt64(process.startTime);
        }
    }
    services[name] = entry;
    return 0;
}

enum class ServiceAction { kStart, kStop, kRestart };

int ChangeService(const char *op, ServiceAction action, const char *service, std::optional<int> flags)
{
    Json::Value args(Json::arrayValue);
    args.append(TextValue(service));
    if (flags) {
        args.append(*flags);
    }
    if (const std::optional<int> forced = ForcedResult(op, service)) {
        JournalCall(op, args, *forced, true);
        return *forced;
    }
    const int result = [&] {
        if (service == nullptr || *service == '\0') {
            EMU_SET_ERROR(kErrBadArgument);
            return -1;
        }
        const std::string name = service;
        int outcome = 0;
        std::optional<LaunchedProcess> launched;
        std::string ready;
        const bool recorded = EditStateObject("services.json", [&](Json::Value &services) {
            const Json::Value entry = services.get(name, Json::Value());
            const bool running = IsRunning(entry);
            bool changed = false;
            // A record that says running with its process gone is stopped too: only the record changes.
            if (action != ServiceAction::kStart && RecordedRunning(entry)) {
                outcome = StopLocked(services, name);
                changed = outcome == 0;
            }
            const bool starts = action == ServiceAction::kRestart || (action == ServiceAction::kStart && !running);
            if (outcome == 0 && starts) {
                outcome = StartLocked(services, name, ready);
                if (outcome == 0) {
                    launched = ProcessOf(services[name]);
                    changed = true;
                }
            }
            return changed;
        });
        if (!recorded) {
            if (launched) {
                TerminateProcess(*launched);  // unrecorded, it could never be stopped
            }
            return -1;
        }
        // Outside the state lock: the program may use the platform while it gets ready.
        if (launched && launched->pid > 0 && !ready.empty()) {
            WaitForPath(ready, *launched, kReadySeconds);
        }
        return outcome;
    }();
    JournalCall(op, args, result, false);
    return result;
}

}  // namespace
}  // namespace EMULATION
}  // namespace VEXO

using namespace VEXO::EMULATION;

extern "C" VEXOEMU_API int VLIBServiceStart(const char *szService, int flags)
{
    return Guarded(-1, [&] { return ChangeService("VLIBServiceStart", ServiceAction::kStart, szService, flags); });
}

extern "C" VEXOEMU_API int VLIBServiceStop(const char *szService, int flags)
{
    return Guarded(-1, [&] { return ChangeService("VLIBServiceStop", ServiceAction::kStop, szService, flags); });
}

extern "C" VEXOEMU_API int VLIBServiceRestart(const char *szService)
{
    return Guarded(-1, [&] {
        return ChangeService("VLIBServiceRestart", ServiceAction::kRestart, szService, std::nullopt);
    });
}

extern "C" VEXOEMU_API int VEXOSMBIsEnableSpotlight(void)
{
    return Guarded(0, [&] {
        if (const std::optional<int> forced = ForcedResult("VEXOSMBIsEnableSpotlight", nullptr)) {
            return *forced;
        }
        static CachedStateFile<bool> smb("smb.json", ParseSpotlight);
        const std::shared_ptr<const bool> spotlight = smb.Get();
        if (spotlight == nullptr) {
            EMU_SET_ERROR(kErrStateFile);
            return 0;
        }
        return *spotlight ? 1 : 0;
    });
}

extern "C" VEXOEMU_API int VEXOSMBSetSpotlight(int enable)
{
    return Guarded(-1, [&] {
        Json::Value args(Json::arrayValue);
        args.append(enable);
        if (const std::optional<int> forced = ForcedResult("VEXOSMBSetSpotlight", nullptr)) {
            JournalCall("VEXOSMBSetSpotlight", args, *forced, true);
            return *forced;
        }
        const bool set = EditStateObject("smb.json", [&](Json::Value &smb) {
            smb["spotlight"] = enable != 0;  // other members stay as they are
            return true;
        });
        const int result = set ? 0 : -1;
        JournalCall("VEXOSMBSetSpotlight", args, result, false);
        return result;
    });
}
