// The stand-in daemon's work on the event queues, done as the indexing daemon does it: for each share
// with indexed folders it takes the share's queue (renames it to its ".tmp" companion, where the
// library still sees it as pending), works through the records one at a time, writing each into the
// share's index database directory, and removes the taken file when the last record is done.
//
// No work is done while indexing is paused (status.conf), for a share marked out of space, or for a
// share whose worker fileindexd was told to delete, until "revive_share_worker" for it arrives. A
// share whose volume has less than the 10 MiB indexing needs is marked out of space (which tells the
// administrators) and its worker stops.
#ifndef FILEINDEX_TOOLS_STANDIN_QUEUE_WORKER_H
#define FILEINDEX_TOOLS_STANDIN_QUEUE_WORKER_H

#include <sys/types.h>

#include <chrono>
#include <deque>
#include <map>
#include <set>
#include <string>

#include <json/value.h>

namespace fileindex_standin {

class QueueWorker {
public:
    // recordTime: how long one record takes, so that progress can be watched.
    explicit QueueWorker(std::chrono::milliseconds recordTime);

    // Follows the daemon commands that start and stop a share's worker.
    void OnCommand(const Json::Value &command);
    // Does at most one step: takes a queue, or finishes one record.
    void Step();

private:
    struct Share {
        std::string queue;               // the queue file; empty until looked up
        std::string database;            // the index database directory
        std::deque<std::string> records; // records of the taken queue still to do
        off_t offset = 0;                // how far the taken queue has been read
        bool taken = false;              // the ".tmp" companion is ours to finish
    };

    bool Paused() const;
    bool Locate(const std::string &name, Share &share) const;
    void Take(Share &share) const;
    void Finish(Share &share);

    std::chrono::milliseconds m_recordTime;
    std::chrono::steady_clock::time_point m_nextRecord;
    std::map<std::string, Share> m_shares;
    std::set<std::string> m_deletedWorkers;
};

}  // namespace fileindex_standin

#endif
