// One status reading per interval, shared by every request in it.
#include "status_feed.h"

#include <utility>

namespace fileindex_panel {

StatusFeed::StatusFeed(std::chrono::milliseconds interval, std::function<Reply()> read)
    : m_interval(interval), m_read(std::move(read))
{
}

Reply StatusFeed::Current()
{
    std::lock_guard<std::mutex> hold(m_mutex);
    const auto now = std::chrono::steady_clock::now();
    if (!m_fresh || now - m_taken >= m_interval) {
        m_reply = m_read();
        m_taken = now;
        m_fresh = true;
    }
    return m_reply;
}

void StatusFeed::Invalidate()
{
    std::lock_guard<std::mutex> hold(m_mutex);
    m_fresh = false;
}

}  // namespace fileindex_panel
