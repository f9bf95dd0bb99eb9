#include "state_dir.h"

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>

#include "appliance_paths.h"
#include "json_text.h"

namespace VEXO {
namespace EMULATION {
namespace {

// A file modified this close to the moment it was read is read again on its next use.
constexpr time_t kRacySeconds = 2;

bool WriteAll(int fd, const std::string &text)
{
    const char *data = text.data();
    size_t left = text.size();
    while (left > 0) {
        const ssize_t written = write(fd, data, left);
        if (written < 0) {
            if (errno == EINTR) {
                continue;
            }
            return false;
        }
        data += written;
        left -= static_cast<size_t>(written);
    }
    return true;
}

bool ReadAll(int fd, std::string &text)
{
    char buffer[16384];
    for (;;) {
        const ssize_t got = read(fd, buffer, sizeof(buffer));
        if (got < 0 && errno == EINTR) {
            continue;
        }
        if (got <= 0) {
            return got == 0;
        }
        text.append(buffer, static_cast<size_t>(got));
    }
}

}  // namespace

std::string StatePath(const char *fileName)
{
    return std::string(FILEINDEX_EMULATION_STATE_DIR "/") + fileName;
}

StateLock::StateLock() : m_fd(open(StatePath("state.lock").c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0644))
{
    if (m_fd < 0) {
        return;
    }
    while (flock(m_fd, LOCK_EX) != 0) {
        if (errno != EINTR) {
            close(m_fd);
            m_fd = -1;
            return;
        }
    }
}

StateLock::~StateLock()
{
    if (m_fd >= 0) {
        close(m_fd);  // releases the lock
    }
}

ReadStatus ReadJsonFile(const std::string &path, Json::Value &value)
{
    value = Json::Value(Json::nullValue);
    const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0) {
        return errno == ENOENT ? ReadStatus::kMissing : ReadStatus::kBad;
    }
    std::string text;
    const bool read = ReadAll(fd, text);
    close(fd);
    if (!read) {
        return ReadStatus::kBad;
    }
    if (text.find_first_not_of(" \t\r\n") == std::string::npos) {
        return ReadStatus::kMissing;
    }
    return ParseJson(text, value) ? ReadStatus::kRead : ReadStatus::kBad;
}

bool ReplaceJsonFile(const std::string &path, const Json::Value &value)
{
    const std::string text = CompactJson(value) + "\n";
    std::string tempPath = path + ".tmp." + std::to_string(getpid()) + ".XXXXXX";
    const int fd = mkostemp(&tempPath[0], O_CLOEXEC);
    if (fd < 0) {
        return false;
    }
    const bool written = fchmod(fd, 0644) == 0 && WriteAll(fd, text);
    const bool closed = close(fd) == 0;
    if (!written || !closed || rename(tempPath.c_str(), path.c_str()) != 0) {
        unlink(tempPath.c_str());
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
