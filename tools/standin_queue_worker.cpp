// The stand-in daemon's worker that takes each share's event queue and works through its records.
#include "standin_queue_worker.h"

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <ctime>
#include <vector>

#include "fileindex/fileidx.h"
#include "fileindex/index_mgr.h"
#include "fileindex/status.h"
#include "fileindex/utils.h"
#include "share/storage_paths.h"

namespace fileindex_standin {

using namespace VEXO::FILEINDEX;

namespace {

constexpr char kIndexFileName[] = "index.jsonl";

// The complete lines of path from offset on, read under an exclusive flock so that an append in
// progress finishes first; offset moves past them. With remove, the file is unlinked while the
// lock is still held, unless new lines were found.
std::vector<std::string> ReadNewLines(const std::string &path, off_t &offset, bool remove)
{
    std::vector<std::string> lines;
    const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0) {
        return lines;
    }
    flock(fd, LOCK_EX);
    std::string text;
    char buffer[65536];
    ssize_t got;
    while ((got = pread(fd, buffer, sizeof(buffer), offset + static_cast<off_t>(text.size()))) > 0) {
        text.append(buffer, static_cast<size_t>(got));
    }
    size_t start = 0;
    for (size_t end; (end = text.find('\n', start)) != std::string::npos; start = end + 1) {
        lines.push_back(text.substr(start, end - start));
    }
    offset += static_cast<off_t>(start);
    if (remove && lines.empty()) {
        unlink(path.c_str());
    }
    flock(fd, LOCK_UN);
    close(fd);
    return lines;
}

void AppendLine(const std::string &path, const std::string &line)
{
    const int fd = open(path.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644);
    if (fd >= 0) {
        const std::string text = line + "\n";
        (void)!write(fd, text.data(), text.size());
        close(fd);
    }
}

}  // namespace

QueueWorker::QueueWorker(std::chrono::milliseconds recordTime)
    : m_recordTime(recordTime), m_nextRecord(std::chrono::steady_clock::now())
{
}

void QueueWorker::OnCommand(const Json::Value &command)
{
    if (!command.isObject() || !command["data"].isObject() || !command["data"]["share_name"].isString()) {
        return;
    }
    const std::string type = command["type"].asString();
    const std::string share = command["data"]["share_name"].asString();
    if (type == "delete_share_worker") {
        m_deletedWorkers.insert(share);
    } else if (type == "revive_share_worker") {
        m_deletedWorkers.erase(share);
    }
}

// Paused as the progress report judges it: without end, or until a time not yet reached.
bool QueueWorker::Paused() const
{
    long long resumeTime = -1;
    return StatusMgr::GetPauseInfo(resumeTime) && (resumeTime == 0 || time(nullptr) < resumeTime);
}

bool QueueWorker::Locate(const std::string &name, Share &share) const
{
    char queue[4096];
    char database[4096];
    if (FILEIDXQueuePathGet(name.c_str(), queue, sizeof(queue)) < 0 ||
        FILEIDXDBPathGet(name.c_str(), database, sizeof(database)) < 0) {
        return false;
    }
    share.queue = queue;
    share.database = database;
    return true;
}

// A taken file left by an earlier run is finished first; otherwise the queue is renamed to it.
void QueueWorker::Take(Share &share) const
{
    const std::string taken = QueueCompanionPath(share.queue);
    if (!IsFileExist(taken) && (!IsFileExist(share.queue) || rename(share.queue.c_str(), taken.c_str()) != 0)) {
        return;
    }
    share.offset = 0;
    for (std::string &line : ReadNewLines(taken, share.offset, false)) {
        share.records.push_back(std::move(line));
    }
    share.taken = true;
}

// Writes one record into the index; after the last one, removes the taken file unless records
// were appended to it meanwhile.
void QueueWorker::Finish(Share &share)
{
    if (!share.records.empty()) {
        AppendLine(share.database + "/" + kIndexFileName, share.records.front());
        share.records.pop_front();
    }
    if (share.records.empty()) {
        for (std::string &line : ReadNewLines(QueueCompanionPath(share.queue), share.offset, true)) {
            share.records.push_back(std::move(line));
        }
        share.taken = !share.records.empty();
    }
}

void QueueWorker::Step()
{
    if (std::chrono::steady_clock::now() < m_nextRecord || Paused()) {
        return;
    }
    std::vector<Folder> folders;
    if (!IndexMgr::List(folders)) {
        return;
    }
    std::set<std::string> names;
    for (const Folder &folder : folders) {
        std::string name;
        if (GetShareNameByPath(name, folder.m_path)) {
            names.insert(name);
        }
    }
    for (const std::string &name : names) {
        Share &share = m_shares[name];
        if (m_deletedWorkers.count(name) != 0 || StatusMgr::ShareIsNoSpace(name) ||
            (share.queue.empty() && !Locate(name, share))) {
            continue;
        }
        // Taking a queue starts its first record, which is done one record time later.
        if (!share.taken) {
            Take(share);
            if (share.taken) {
                m_nextRecord = std::chrono::steady_clock::now() + m_recordTime;
                return;
            }
            continue;
        }
        if (!IsShareSpaceEnough(name)) {
            StatusMgr::ShareSetNoSpace(name, true);
            continue;
        }
        Finish(share);
        m_nextRecord = std::chrono::steady_clock::now() + m_recordTime;
        return;
    }
}

}  // namespace fileindex_standin
