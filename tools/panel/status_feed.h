// One status reading per interval, however many pages poll: the first request after the interval
// takes a new reading under the library mutex, every other one gets the reading already taken.
#ifndef FILEINDEX_PANEL_STATUS_FEED_H
#define FILEINDEX_PANEL_STATUS_FEED_H

#include <chrono>
#include <functional>
#include <mutex>

#include <json/value.h>

#include "failure.h"

namespace fileindex_panel {

// A reading: its document, or why it failed.
struct Reply {
    bool ok = false;
    fileindex_tool::Failure failure;
    Json::Value body;
};

class StatusFeed {
public:
    // read takes one reading (it calls the library itself, through CallLibrary).
    StatusFeed(std::chrono::milliseconds interval, std::function<Reply()> read);

    // The latest reading, taken afresh when it is older than the interval or was invalidated.
    Reply Current();
    // A change made through the panel: the next request gets a fresh reading.
    void Invalidate();

private:
    const std::chrono::milliseconds m_interval;
    const std::function<Reply()> m_read;
    std::mutex m_mutex;
    Reply m_reply;
    std::chrono::steady_clock::time_point m_taken;
    bool m_fresh = false;
};

}  // namespace fileindex_panel

#endif
