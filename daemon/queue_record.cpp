#include "daemon/queue_record.h"

#include <json/value.h>

#include "config/json_io.h"

namespace VEXO {
namespace FILEINDEX {

bool ParseQueueRecord(const std::string &line, QueueRecord &record)
{
    Json::Value value;
    if (!fromString(value, line) || !value.isObject()) {
        return false;
    }
    const Json::Value *event = value.find("event", "event" + 5);
    const Json::Value *path = value.find("path", "path" + 4);
    if (event == nullptr || path == nullptr || !event->isConvertibleTo(Json::uintValue) || !path->isString()) {
        return false;
    }
    record.event = event->asUInt();
    record.path = path->asString();
    const Json::Value *pathOld = record.event == kEventMove ? value.find("path_old", "path_old" + 8) : nullptr;
    record.pathOld = pathOld != nullptr && pathOld->isString() ? pathOld->asString() : std::string();
    return true;
}

}  // namespace FILEINDEX
}  // namespace VEXO
