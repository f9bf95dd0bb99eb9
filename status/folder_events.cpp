// The search of a share's queue files for events on a folder or inside it, one reading per call.
#include "status/folder_events.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <map>
#include <unordered_map>
#include <utility>

#include "config/file_io.h"
#include "daemon/queue_record.h"
#include "fileindex/utils.h"

namespace VEXO {
namespace FILEINDEX {

namespace {

constexpr size_t kNoEvent = static_cast<size_t>(-1);
constexpr size_t kMaxKeptMalformedBytes = 1024 * 1024;

// The last eight bytes (or fewer) of [text, text + length), with the length mixed in. Eight bytes
// are copied as one word, which the hash then reads without waiting for bytes stored one by one.
uint64_t Tail(const char *text, size_t length)
{
    uint64_t word = 0;
    if (length >= sizeof(word)) {
        std::memcpy(&word, text + length - sizeof(word), sizeof(word));
    } else {
        std::memcpy(&word, text, length);
    }
    return word ^ (length * 0x9E3779B97F4A7C15ULL);
}

// Counts of the folders still waiting for their first event, by a hash of the Tail of their text
// into at least sixteen buckets per folder: an event in a folder that has had its first one is
// passed over after one look at its bucket, without hashing the whole path. The look is at one bit
// per bucket (set while its count is not zero), so that it stays in the nearest cache: 2 KiB for
// a thousand folders.
class WaitingTails {
public:
    explicit WaitingTails(const std::vector<std::string> &folders)
    {
        while (m_counts.size() < 16 * folders.size()) {
            m_counts.resize(m_counts.size() * 2);
            --m_shift;
        }
        m_waiting.resize((m_counts.size() + 63) / 64);
        for (const std::string &folder : folders) {
            const size_t bucket = Bucket(Tail(folder.data(), folder.size()));
            ++m_counts[bucket];
            m_waiting[bucket / 64] |= uint64_t{1} << (bucket % 64);
        }
    }

    // False when no waiting folder has this tail; true when one may have.
    bool AnyWaiting(uint64_t tail) const
    {
        const size_t bucket = Bucket(tail);
        return (m_waiting[bucket / 64] >> (bucket % 64) & 1) != 0;
    }
    // A folder with this tail has had its first event.
    void Settle(uint64_t tail)
    {
        const size_t bucket = Bucket(tail);
        if (--m_counts[bucket] == 0) {
            m_waiting[bucket / 64] &= ~(uint64_t{1} << (bucket % 64));
        }
    }

private:
    size_t Bucket(uint64_t tail) const { return static_cast<size_t>((tail * 0x9E3779B97F4A7C15ULL) >> m_shift); }

    std::vector<uint32_t> m_counts = std::vector<uint32_t>(2);
    std::vector<uint64_t> m_waiting;
    int m_shift = 63;
};

// path + "/" begins with folder + "/".
bool IsInside(std::string_view path, std::string_view folder)
{
    return path.size() >= folder.size() && path.compare(0, folder.size(), folder) == 0 &&
           (path.size() == folder.size() || path[folder.size()] == '/');
}

// QueueReadings::FindEventInFolder of a file read for this one folder alone.
bool SearchQueueFile(const std::string &queueFile, const std::string &folder,
                     const std::function<void(std::string_view line)> &malformed, bool &found)
{
    found = false;
    QueueRecord record;
    return ForEachLine(queueFile, [&](std::string_view line) {
        if (!ParseQueueRecord(line, record)) {
            malformed(line);
            return true;
        }
        found = IsInside(record.path, folder) || IsInside(record.pathOld, folder);
        return !found;
    });
}

}  // namespace

// What one reading of a queue file found for the folders of a QueueReadings.
struct FileReading {
    bool usable = false;
    std::vector<size_t> firstEvent;                          // per folder: the line of its first event
    std::vector<std::pair<size_t, std::string>> malformed;  // line and text, in file order
};

class QueueReadings::Readings {
public:
    explicit Readings(std::vector<std::string> folders) : m_folders(std::move(folders)) {}

    // The answer of the file's one reading for folder; false when there is none to give.
    bool Answer(const std::string &queueFile, const std::string &folder,
                const std::function<void(std::string_view line)> &malformed, bool &found)
    {
        if (!m_indexed) {
            Index();
        }
        const auto entry = m_index.find(folder);
        if (entry == m_index.end()) {
            return false;
        }
        auto reading = m_files.find(queueFile);
        if (reading == m_files.end()) {
            reading = m_files.emplace(queueFile, Read(queueFile)).first;
        }
        if (!reading->second.usable) {
            return false;
        }
        const size_t first = reading->second.firstEvent[entry->second];
        for (const auto &line : reading->second.malformed) {
            if (line.first >= first) {
                break;
            }
            malformed(line.second);
        }
        found = first != kNoEvent;
        return true;
    }

private:
    // Indexes the folders by their text, once a question is asked: most listings ask none.
    void Index()
    {
        m_folders.erase(std::remove(m_folders.begin(), m_folders.end(), std::string()), m_folders.end());
        std::sort(m_folders.begin(), m_folders.end());
        m_folders.erase(std::unique(m_folders.begin(), m_folders.end()), m_folders.end());
        for (size_t i = 0; i < m_folders.size(); ++i) {
            m_index.emplace(m_folders[i], i);
            m_lengths.push_back(m_folders[i].size());
        }
        std::sort(m_lengths.begin(), m_lengths.end());
        m_lengths.erase(std::unique(m_lengths.begin(), m_lengths.end()), m_lengths.end());
        m_indexed = true;
    }

    // Reads the file until every folder has its first event: a malformed line after all of them
    // concerns none.
    FileReading Read(const std::string &queueFile) const
    {
        FileReading reading;
        reading.firstEvent.assign(m_folders.size(), kNoEvent);
        size_t waiting = m_folders.size();
        size_t number = 0;
        size_t keptBytes = 0;
        // The folders still waiting for their first event, counted by the tail of their text: most
        // events lie in folders that have had theirs, and are passed over without hashing a path.
        WaitingTails waitingTails(m_folders);
        QueueRecord record;
        const auto mark = [&](std::string_view path) {
            for (const size_t length : m_lengths) {
                if (length > path.size()) {
                    break;
                }
                if (length < path.size() && path[length] != '/') {
                    continue;
                }
                const uint64_t tail = Tail(path.data(), length);
                if (!waitingTails.AnyWaiting(tail)) {
                    continue;
                }
                const auto folder = m_index.find(std::string_view(path.data(), length));
                if (folder != m_index.end() && reading.firstEvent[folder->second] == kNoEvent) {
                    reading.firstEvent[folder->second] = number;
                    --waiting;
                    waitingTails.Settle(tail);
                }
            }
        };
        const bool read = ForEachLine(queueFile, [&](std::string_view line) {
            if (!ParseQueueRecord(line, record)) {
                keptBytes += line.size() + 1;
                if (keptBytes > kMaxKeptMalformedBytes) {
                    return false;
                }
                reading.malformed.emplace_back(number++, std::string(line));
                return true;
            }
            mark(record.path);
            mark(record.pathOld);
            ++number;
            return waiting > 0;
        });
        reading.usable = read && keptBytes <= kMaxKeptMalformedBytes;
        if (!reading.usable) {
            reading.malformed.clear();
        }
        return reading;
    }

    std::vector<std::string> m_folders;
    bool m_indexed = false;
    std::unordered_map<std::string_view, size_t> m_index;  // views of m_folders, which no longer changes
    std::vector<size_t> m_lengths;                         // the distinct lengths of the folders
    std::map<std::string, FileReading> m_files;
};

QueueReadings::QueueReadings(Reuse reuse) : m_reuse(reuse) {}

void QueueReadings::ReadOnceFor(std::vector<std::string> folders)
{
    m_readings.reset(new Readings(std::move(folders)));
}

QueueReadings::~QueueReadings() = default;

bool QueueReadings::Exists(const std::string &queueFile)
{
    if (m_reuse == Reuse::kAskEveryTime) {
        return IsFileExist(queueFile);
    }
    const auto kept = m_exists.find(queueFile);
    return kept != m_exists.end() ? kept->second : m_exists.emplace(queueFile, IsFileExist(queueFile)).first->second;
}

bool QueueReadings::FindEventInFolder(const std::string &queueFile, const std::string &folder,
                                      const std::function<void(std::string_view line)> &malformed, bool &found)
{
    const bool kept = m_reuse == Reuse::kOncePerCall && m_readings != nullptr;
    if (kept && m_readings->Answer(queueFile, folder, malformed, found)) {
        return true;
    }
    return SearchQueueFile(queueFile, folder, malformed, found);
}

}  // namespace FILEINDEX
}  // namespace VEXO
