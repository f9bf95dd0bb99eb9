// Registrations with the file-change notification daemon, kept in monitor_queues.json.
#include "platform/monitor_queue.h"

#include <optional>
#include <stdexcept>

#include "api.h"
#include "faults.h"
#include "journal.h"
#include "json_text.h"
#include "state_dir.h"

namespace VEXO {
namespace EMULATION {
namespace {

bool IsInteger(const Json::Value &value)
{
    return value.type() == Json::intValue || value.type() == Json::uintValue;
}

// {"queue": non-empty string, "config": [{"path": string, "mask": integer, "ignore": [string...]}...]}
bool IsValidDescription(const Json::Value &description)
{
    if (!description.isObject() || !description["queue"].isString() || description["queue"].asString().empty() ||
        !description["config"].isArray()) {
        return false;
    }
    for (const Json::Value &entry : description["config"]) {
        if (!entry.isObject() || !entry["path"].isString() || !IsInteger(entry["mask"]) ||
            !entry["ignore"].isArray()) {
            return false;
        }
        for (const Json::Value &pattern : entry["ignore"]) {
            if (!pattern.isString()) {
                return false;
            }
        }
    }
    return true;
}

// The queue path of a description, for matching fault rules; null when it has none.
const char *QueueOf(const Json::Value &description)
{
    const Json::Value &queue = description.isObject() ? description["queue"] : Json::Value::nullSingleton();
    return queue.isString() ? queue.asCString() : nullptr;
}

Json::Value CallArgs(const Json::Value &first, const std::string &owner, int type)
{
    Json::Value args(Json::arrayValue);
    args.append(first);
    args.append(Json::Value(owner.data(), owner.data() + owner.size()));
    args.append(type);
    return args;
}

}  // namespace
}  // namespace EMULATION
}  // namespace VEXO

namespace VEXO {
namespace VNOTIFYD {

using namespace VEXO::EMULATION;

VEXOEMU_API MonitorQueue::MonitorQueue(const Json::Value &description) : m_description(description)
{
    if (ForcedFailure("MonitorQueue::MonitorQueue", QueueOf(description))) {
        throw std::invalid_argument("monitor queue refused by a forced fault");
    }
    if (!IsValidDescription(description)) {
        EMU_SET_ERROR(kErrBadArgument);
        throw std::invalid_argument("malformed monitor queue description");
    }
}

VEXOEMU_API bool MonitorQueue::Upsert(const MonitorQueue &queue, const std::string &owner,
                                      _tag_monitor_queue_type_ type)
{
    return Guarded(false, [&] {
        const Json::Value &description = queue.m_description;
        const Json::Value args = CallArgs(description, owner, type);
        const char *queuePath = QueueOf(description);
        if (const std::optional<int> forced = ForcedResult("MonitorQueue::Upsert", queuePath)) {
            JournalCall("MonitorQueue::Upsert", args, *forced != 0, true);
            return *forced != 0;
        }
        bool result = false;
        if (owner.empty() || queuePath == nullptr) {
            EMU_SET_ERROR(kErrBadArgument);
        } else {
            result = EditStateObject("monitor_queues.json", [&](Json::Value &registrations) {
                Json::Value entry(Json::objectValue);
                entry["type"] = static_cast<int>(type);
                entry["description"] = description;
                Json::Value &ownerQueues = registrations[owner];
                if (!ownerQueues.isObject()) {
                    ownerQueues = Json::Value(Json::objectValue);
                }
                ownerQueues[description["queue"].asString()] = entry;
                return true;
            });
        }
        JournalCall("MonitorQueue::Upsert", args, result, false);
        return result;
    });
}

VEXOEMU_API bool MonitorQueue::Delete(const std::string &queuePath, const std::string &owner,
                                      _tag_monitor_queue_type_ type)
{
    return Guarded(false, [&] {
        const Json::Value args =
            CallArgs(Json::Value(queuePath.data(), queuePath.data() + queuePath.size()), owner, type);
        if (const std::optional<int> forced = ForcedResult("MonitorQueue::Delete", queuePath.c_str())) {
            JournalCall("MonitorQueue::Delete", args, *forced != 0, true);
            return *forced != 0;
        }
        bool result = false;
        if (owner.empty() || queuePath.empty()) {
            EMU_SET_ERROR(kErrBadArgument);
        } else {
            result = EditStateObject("monitor_queues.json", [&](Json::Value &registrations) {
                const Json::Value *queues = registrations.find(owner.data(), owner.data() + owner.size());
                if (queues == nullptr || !queues->isObject() || !queues->isMember(queuePath)) {
                    return false;
                }
                Json::Value &ownerQueues = registrations[owner];
                ownerQueues.removeMember(queuePath);
                if (ownerQueues.empty()) {
                    registrations.removeMember(owner);
                }
                return true;
            });
        }
        JournalCall("MonitorQueue::Delete", args, result, false);
        return result;
    });
}

}  // namespace VNOTIFYD
}  // namespace VEXO
