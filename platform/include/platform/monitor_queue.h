// Client side of the file-change notification daemon: monitor queues registered per owner, as the
// emulated platform declares it. The library uses the constructor and the two static operations,
// which the appliance's own client provides too; the data member is the emulation's. An appliance
// build takes the appliance's header in place of this one, so the library is always compiled
// against the layout of the client it links.
#ifndef PLATFORM_MONITOR_QUEUE_H
#define PLATFORM_MONITOR_QUEUE_H

#include <string>

#include <json/value.h>

namespace VEXO {
namespace VNOTIFYD {

// Kind of a monitor queue; the notification daemon gives the values their meaning.
enum _tag_monitor_queue_type_ {
    MONITOR_QUEUE_TYPE_0 = 0,
    MONITOR_QUEUE_TYPE_1 = 1,
};

class MonitorQueue {
public:
    // Builds a queue from its description {"queue": path, "config": [{"path", "mask", "ignore"}...]}.
    // Throws std::invalid_argument when the description is malformed.
    explicit MonitorQueue(const Json::Value &description);

    // Creates or replaces the registration of the queue for the owner. False on failure.
    static bool Upsert(const MonitorQueue &queue, const std::string &owner, _tag_monitor_queue_type_ type);
    // Removes the registration of a queue path for the owner. False on failure.
    static bool Delete(const std::string &queuePath, const std::string &owner, _tag_monitor_queue_type_ type);

private:
    Json::Value m_description;  // what Upsert registers
};

}  // namespace VNOTIFYD
}  // namespace VEXO

#endif
