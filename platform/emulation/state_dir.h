// The emulation's state directory: where its files are, the read-modify-write cycle of the files the
// emulation changes, and a parse cache for the files tests write, which reads a file again only when
// it changed.
#ifndef VEXOEMU_STATE_DIR_H
#define VEXOEMU_STATE_DIR_H

#include <sys/stat.h>

#include <ctime>
#include <functional>
#include <memory>
#include <mutex>
#include <string>

#include <json/value.h>

namespace VEXO {
namespace EMULATION {

// "<state directory>/<fileName>".
std::string StatePath(const char *fileName);

// Reads the state file fileName, a JSON object (a missing or empty file is {}), while holding an
// exclusive flock on state.lock, and hands it to edit; when edit returns true, replaces the file with
// the edited object through a temporary file and a rename, so that readers see the old or the new
// content and nothing in between. False, with kErrStateFile in the error state, when the lock cannot
// be taken (the emulation never creates the state directory), or the file is unreadable, not an
// object, or cannot be replaced.
bool EditStateObject(const char *fileName, const std::function<bool(Json::Value &object)> &edit);

enum class ReadStatus { kRead, kMissing, kBad };

// The raw text of a state file, and its parse (a blank text is kMissing and leaves a null value).
bool ReadStateText(const std::string &path, std::string &text);
ReadStatus ParseStateText(const std::string &text, Json::Value &value);

// Identity of a file's content as far as stat tells it.
struct FileStamp {
    bool exists = false;
    dev_t device = 0;
    ino_t inode = 0;
    off_t size = 0;
    timespec modified = {0, 0};

    bool operator==(const FileStamp &other) const;
};

// Reads the stamp of a file; false when stat fails for another reason than the file's absence.
bool StampOf(const std::string &path, FileStamp &stamp);
// True when a file with this stamp, read at readAt, could still change without its stamp changing
// (time stamps are coarse: a rewrite of the same size in the same tick keeps the old time).
bool StampIsRacy(const FileStamp &stamp, const timespec &readAt);

// A state file parsed into T, read again only when its stamp changes. T comes from a parser that is
// handed the file's JSON, null when the file is missing, and answers false when it is malformed.
template <typename T>
class CachedStateFile {
public:
    using Parser = bool (*)(const Json::Value &json, T &out);

    CachedStateFile(const char *fileName, Parser parse) : m_fileName(fileName), m_parse(parse) {}

    // The current content; null when the file cannot be read or is malformed.
    std::shared_ptr<const T> Get()
    {
        const std::string path = StatePath(m_fileName);
        FileStamp stamp;
        if (!StampOf(path, stamp)) {
            return nullptr;
        }
        std::lock_guard<std::mutex> guard(m_mutex);
        if (m_loaded && stamp == m_stamp && !m_racy) {
            return m_value;
        }
        timespec readAt = {0, 0};
        clock_gettime(CLOCK_REALTIME, &readAt);
        std::string text;
        if (stamp.exists && !ReadStateText(path, text)) {
            m_loaded = false;
            return nullptr;
        }
        // A racy stamp forces a read, but an unchanged text needs no new parse.
        if (!(m_loaded && stamp == m_stamp && text == m_text)) {
            Json::Value json;
            auto parsed = std::make_shared<T>();
            if (ParseStateText(text, json) == ReadStatus::kBad || !m_parse(json, *parsed)) {
                m_loaded = false;
                return nullptr;
            }
            m_value = std::move(parsed);
            m_text = std::move(text);
        }
        // The stamp taken before the read: a change during the read shows as a new stamp next time.
        m_stamp = stamp;
        m_racy = StampIsRacy(stamp, readAt);
        m_loaded = true;
        return m_value;
    }

private:
    const char *m_fileName;
    Parser m_parse;
    std::mutex m_mutex;
    bool m_loaded = false;
    bool m_racy = false;
    FileStamp m_stamp;
    std::string m_text;
    std::shared_ptr<const T> m_value;
};

}  // namespace EMULATION
}  // namespace VEXO

#endif
