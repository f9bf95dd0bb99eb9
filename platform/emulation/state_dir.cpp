// The emulation's state directory: file paths, read-modify-write of its files, the parse cache.
#include "state_dir.h"

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>

#include "appliance_paths.h"
#include "config/file_io.h"
#include "config/json_io.h"
#include "error_codes.h"
#include "error_state_internal.h"

namespace VEXO {
namespace EMULATION {
namespace {

// A file modified this close to the moment it was read is read again on its next use.
constexpr time_t kRacySeconds = 2;

// Exclusive hold of state.lock for the lifetime of the object.
class StateLock {
public:
    StateLock() : m_fd(open(StatePath("state.lock").c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0644))
    {
        while (m_fd >= 0 && flock(m_fd, LOCK_EX) != 0) {
            if (errno != EINTR) {
                close(m_fd);
                m_fd = -1;
            }
        }
    }
    ~StateLock()
    {
        if (m_fd >= 0) {
            close(m_fd);  // releases the lock
        }
    }
    StateLock(const StateLock &) = delete;
    StateLock &operator=(const StateLock &) = delete;

    bool Held() const { return m_fd >= 0; }

private:
    int m_fd;
};

}  // namespace

std::string StatePath(const char *fileName)
{
    return std::string(FILEINDEX_EMULATION_STATE_DIR "/") + fileName;
}

bool ReadStateText(const std::string &path, std::string &text)
{
    return FILEINDEX::ReadWholeFile(path, text);
}

ReadStatus ParseStateText(const std::string &text, Json::Value &value)
{
    value = Json::Value(Json::nullValue);
    if (text.find_first_not_of(" \t\r\n") == std::string::npos) {
        return ReadStatus::kMissing;
    }
    return FILEINDEX::fromString(value, text) ? ReadStatus::kRead : ReadStatus::kBad;
}

bool EditStateObject(const char *fileName, const std::function<bool(Json::Value &object)> &edit)
{
    StateLock lock;
    if (!lock.Held()) {
        EMU_SET_ERROR(kErrStateFile);
        return false;
    }
    const std::string path = StatePath(fileName);
    std::string text;
    Json::Value object;
    ReadStatus status = ReadStatus::kMissing;
    if (ReadStateText(path, text)) {
        status = ParseStateText(text, object);
    } else if (errno != ENOENT) {
        status = ReadStatus::kBad;
    }
    if (status == ReadStatus::kMissing) {
        object = Json::Value(Json::objectValue);
    } else if (status == ReadStatus::kBad || !object.isObject()) {
        EMU_SET_ERROR(kErrStateFile);
        return false;
    }
    if (edit(object) && !FILEINDEX::ReplaceFileAtomically(path, FILEINDEX::toString(object) + "\n")) {
        EMU_SET_ERROR(kErrStateFile);
        return false;
    }
    return true;
}

bool FileStamp::operator==(const FileStamp &other) const
{
    if (exists != other.exists) {
        return false;
    }
    return !exists || (device == other.device && inode == other.inode && size == other.size &&
                       modified.tv_sec == other.modified.tv_sec && modified.tv_nsec == other.modified.tv_nsec);
}

bool StampOf(const std::string &path, FileStamp &stamp)
{
    struct stat st;
    if (stat(path.c_str(), &st) != 0) {
        stamp = FileStamp();
        return errno == ENOENT;
    }
    stamp.exists = true;
    stamp.device = st.st_dev;
    stamp.inode = st.st_ino;
    stamp.size = st.st_size;
    stamp.modified = st.st_mtim;
    return true;
}

bool StampIsRacy(const FileStamp &stamp, const timespec &readAt)
{
    return stamp.exists && readAt.tv_sec - stamp.modified.tv_sec < kRacySeconds;
}

}  // namespace EMULATION
}  // namespace VEXO
