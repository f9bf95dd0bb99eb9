#include "daemon/queue_record.h"

#include <cstring>

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
    const auto member = [&value](const char *key) { return value.find(key, key + strlen(key)); };
    const Json::Value *event = member("event");
    const Json::Value *path = member("path");
    if (event == nullptr || path == nullptr || !event->isConvertibleTo(Json::uintValue) || !path->isString()) {
        return false;
    }
    record.event = event->asUInt();
    record.path = path->asString();
    const Json::Value *pathOld = record.event == kEventMove ? member("path_old") : nullptr;
    record.pathOld = pathOld != nullptr && pathOld->isString() ? pathOld->asString() : std::string();
    return true;
}

}  // namespace FILEINDEX
}  // namespace VEXO
