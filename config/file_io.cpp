// The file helpers of file_io.h: reads, opening in shared directories, line files, atomic saves.
#include "config/file_io.h"

#include <dirent.h>
#include <fcntl.h>
#include <signal.h>
#include <stdlib.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <ctime>
#include <memory>

namespace VEXO {
namespace FILEINDEX {
namespace {

// Temporary files are named "<name>.tmp.<pid>.<random>" so that a sweep can tell whose they are.
const char kTempInfix[] = ".tmp.";
// No save takes this long: a temporary file this old is an orphan whatever its process number says.
constexpr time_t kOrphanAge = 3600;

// ForEachLine reads this much at a time, and more only for a line that does not fit.
constexpr size_t kLineBlockSize = 256 * 1024;

void SplitPath(const std::string &path, std::string &dir, std::string &name)
{
    const size_t slash = path.rfind('/');
    if (slash == std::string::npos) {
        dir = ".";
        name = path;
    } else {
        dir = slash == 0 ? "/" : path.substr(0, slash);
        name = path.substr(slash + 1);
    }
}

// Writes until all of size is written or a write fails (one writing nothing fails too, as a full
// disk may answer); returns the bytes written.
size_t WriteAll(int fd, const char *data, size_t size)
{
    size_t done = 0;
    while (done < size) {
        const ssize_t written = write(fd, data + done, size - done);
        if (written < 0 && errno == EINTR) {
            continue;
        }
        if (written <= 0) {
            break;
        }
        done += static_cast<size_t>(written);
    }
    return done;
}

void CloseKeepingErrno(int fd)
{
    const int reason = errno;
    close(fd);
    errno = reason;
}

// The directory holding path, opened without following a symbolic link at its last component;
// name receives path's last component.
int OpenParentDirectory(const std::string &path, std::string &name)
{
    std::string dir;
    SplitPath(path, dir, name);
    return open(dir.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
}

bool IsOrphan(int dirFd, const char *entryName, long pid)
{
    if (kill(static_cast<pid_t>(pid), 0) == -1 && errno == ESRCH) {
        return true;
    }
    struct stat st;
    return fstatat(dirFd, entryName, &st, AT_SYMLINK_NOFOLLOW) == 0 && time(nullptr) - st.st_mtime > kOrphanAge;
}

// Removes temporary files of name left by savers that were killed mid-save.
void SweepOrphanedTempFiles(const std::string &dir, const std::string &name)
{
    DIR *d = opendir(dir.c_str());
    if (d == nullptr) {
        return;
    }
    const std::string prefix = name + kTempInfix;
    while (const dirent *entry = readdir(d)) {
        const char *entryName = entry->d_name;
        if (strncmp(entryName, prefix.c_str(), prefix.size()) != 0) {
            continue;
        }
        char *pidEnd = nullptr;
        const long pid = strtol(entryName + prefix.size(), &pidEnd, 10);
        if (pid <= 0 || *pidEnd != '.') {
            continue;
        }
        if (IsOrphan(dirfd(d), entryName, pid)) {
            unlinkat(dirfd(d), entryName, 0);
        }
    }
    closedir(d);
}

void SyncDirectory(const std::string &dir)
{
    const int fd = open(dir.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (fd >= 0) {
        fsync(fd);
        close(fd);
    }
}

}  // namespace

bool ReadWholeFile(const std::string &path, std::string &content)
{
    const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0) {
        return false;
    }
    content.clear();
    char buffer[16384];
    for (;;) {
        const ssize_t got = read(fd, buffer, sizeof(buffer));
        if (got < 0 && errno == EINTR) {
            continue;
        }
        if (got <= 0) {
            close(fd);
            return got == 0;
        }
        content.append(buffer, static_cast<size_t>(got));
    }
}

int OpenRegularFile(const std::string &path, int flags, mode_t mode)
{
    std::string name;
    const int dirFd = OpenParentDirectory(path, name);
    if (dirFd < 0) {
        return -1;
    }
    // Non-blocking, so that a FIFO in the file's place cannot hold the open up.
    const int fd = openat(dirFd, name.c_str(), flags | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC, mode);
    CloseKeepingErrno(dirFd);
    if (fd < 0) {
        return -1;
    }
    struct stat st;
    if (fstat(fd, &st) != 0) {
        CloseKeepingErrno(fd);
        return -1;
    }
    if (!S_ISREG(st.st_mode)) {
        close(fd);
        errno = EINVAL;
        return -1;
    }
    return fd;
}

int MakeDirectory(const std::string &path, mode_t mode)
{
    std::string name;
    const int dirFd = OpenParentDirectory(path, name);
    if (dirFd < 0) {
        return -1;
    }
    int result = mkdirat(dirFd, name.c_str(), mode);
    struct stat st;
    if (result != 0 && errno == EEXIST && fstatat(dirFd, name.c_str(), &st, AT_SYMLINK_NOFOLLOW) == 0) {
        if (S_ISDIR(st.st_mode)) {
            result = 0;
        } else {
            errno = S_ISLNK(st.st_mode) ? ELOOP : ENOTDIR;
        }
    }
    CloseKeepingErrno(dirFd);
    return result;
}

bool AppendLine(int fd, const std::string &line, size_t &written)
{
    written = 0;
    const off_t before = lseek(fd, 0, SEEK_END);
    if (before < 0) {
        return false;
    }
    char last = '\n';
    if (before > 0 && pread(fd, &last, 1, before - 1) != 1) {
        return false;
    }
    const std::string text = last == '\n' ? line : "\n" + line;
    written = WriteAll(fd, text.data(), text.size());
    if (written == text.size()) {
        return true;
    }
    const int reason = errno;
    (void)ftruncate(fd, before);  // should this fail too, the next append still starts a new line
    errno = reason;
    return false;
}

bool ForEachLine(const std::string &path, const std::function<bool(std::string_view line)> &visit)
{
    const int fd = OpenRegularFile(path, O_RDONLY);
    if (fd < 0) {
        return false;
    }
    size_t capacity = kLineBlockSize;
    std::unique_ptr<char[]> block(new char[capacity]);
    size_t kept = 0;  // the start of a line whose end has not been read yet
    for (;;) {
        if (kept == capacity) {
            std::unique_ptr<char[]> larger(new char[capacity * 2]);
            memcpy(larger.get(), block.get(), kept);
            block = std::move(larger);
            capacity *= 2;
        }
        const ssize_t got = read(fd, block.get() + kept, capacity - kept);
        if (got < 0 && errno == EINTR) {
            continue;
        }
        if (got < 0) {
            close(fd);
            return false;
        }
        if (got == 0) {
            break;
        }
        const char *line = block.get();
        const char *const end = line + kept + got;
        const char *search = line + kept;  // the kept start holds no newline
        while (const char *newline = static_cast<const char *>(memchr(search, '\n', end - search))) {
            if (!visit(std::string_view(line, static_cast<size_t>(newline - line)))) {
                close(fd);
                return true;
            }
            line = search = newline + 1;
        }
        kept = static_cast<size_t>(end - line);
        memmove(block.get(), line, kept);
    }
    close(fd);
    if (kept > 0) {
        visit(std::string_view(block.get(), kept));
    }
    return true;
}

bool ReplaceFileAtomically(const std::string &path, const std::string &content)
{
    std::string dir;
    std::string name;
    SplitPath(path, dir, name);
    SweepOrphanedTempFiles(dir, name);

    std::string tempPath = path + kTempInfix + std::to_string(getpid()) + ".XXXXXX";
    const int fd = mkostemp(&tempPath[0], O_CLOEXEC);
    if (fd < 0) {
        return false;
    }
    const bool written =
        fchmod(fd, 0644) == 0 && WriteAll(fd, content.data(), content.size()) == content.size() && fsync(fd) == 0;
    const bool closed = close(fd) == 0;
    if (!written || !closed || rename(tempPath.c_str(), path.c_str()) != 0) {
        unlink(tempPath.c_str());
        return false;
    }
    SyncDirectory(dir);
    return true;
}

}  // namespace FILEINDEX
}  // namespace VEXO
