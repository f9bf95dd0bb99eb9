// The file helpers of file_io.h: reads, opening in shared directories, line files, atomic saves.
#include "config/file_io.h"

#include <dirent.h>
#include <fcntl.h>
#include <signal.h>
#include <stdlib.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cctype>
#include <cerrno>
#include <cstring>
#include <ctime>
#include <limits>
#include <memory>

namespace VEXO {
namespace FILEINDEX {
namespace {

const char kTempInfix[] = ".tmp.";
// What mkostemp replaces with six random letters and digits.
const char kTempRandom[] = "XXXXXX";
constexpr size_t kTempRandomSize = sizeof(kTempRandom) - 1;
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
// disk may answer, and then sets errno to ENOSPC); returns the bytes written.
size_t WriteAll(int fd, const char *data, size_t size)
{
    size_t done = 0;
    while (done < size) {
        const ssize_t written = write(fd, data + done, size - done);
        if (written < 0 && errno == EINTR) {
            continue;
        }
        if (written <= 0) {
            errno = written == 0 ? ENOSPC : errno;
            break;
        }
        done += static_cast<size_t>(written);
    }
    return done;
}

// The directory holding path, opened without following a symbolic link at its last component;
// name receives path's last component.
OwnedFd OpenParentDirectory(const std::string &path, std::string &name)
{
    std::string dir;
    SplitPath(path, dir, name);
    return OwnedFd(open(dir.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
}

bool IsOrphan(int dirFd, const char *entryName, pid_t pid)
{
    if (kill(pid, 0) == -1 && errno == ESRCH) {
        return true;
    }
    struct stat st;
    return fstatat(dirFd, entryName, &st, AT_SYMLINK_NOFOLLOW) == 0 && time(nullptr) - st.st_mtime > kOrphanAge;
}

// Removes temporary files of name left by savers that were killed mid-save.
void SweepOrphanedTempFiles(const std::string &dir, const std::string &name)
{
    struct CloseDir {
        void operator()(DIR *d) const { closedir(d); }
    };
    const std::unique_ptr<DIR, CloseDir> d(opendir(dir.c_str()));
    if (d == nullptr) {
        return;
    }
    while (const dirent *entry = readdir(d.get())) {
        const char *entryName = entry->d_name;
        pid_t pid = 0;
        if (ParseTempFileName(entryName, name, pid) && IsOrphan(dirfd(d.get()), entryName, pid)) {
            unlinkat(dirfd(d.get()), entryName, 0);
        }
    }
}

void SyncDirectory(const std::string &dir)
{
    const OwnedFd fd(open(dir.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (fd.IsOpen()) {
        fsync(fd.Get());
    }
}

}  // namespace

std::string TempFileTemplate(const std::string &path, pid_t pid)
{
    return path + kTempInfix + std::to_string(pid) + "." + kTempRandom;
}

bool ParseTempFileName(std::string_view entry, const std::string &name, pid_t &pid)
{
    const size_t prefixSize = name.size() + sizeof(kTempInfix) - 1;
    if (entry.size() <= prefixSize + 1 + kTempRandomSize || entry.compare(0, name.size(), name) != 0 ||
        entry.compare(name.size(), prefixSize - name.size(), kTempInfix) != 0) {
        return false;
    }
    // The process number: decimal digits without a sign or a leading zero, within pid_t.
    const std::string_view digits = entry.substr(prefixSize, entry.size() - prefixSize - 1 - kTempRandomSize);
    long long number = 0;
    for (const char c : digits) {
        if (c < '0' || c > '9' || (number == 0 && c == '0') || number > std::numeric_limits<pid_t>::max() / 10) {
            return false;
        }
        number = number * 10 + (c - '0');
    }
    if (number > std::numeric_limits<pid_t>::max() || entry[entry.size() - 1 - kTempRandomSize] != '.') {
        return false;
    }
    for (const char c : entry.substr(entry.size() - kTempRandomSize)) {
        if (!isalnum(static_cast<unsigned char>(c))) {
            return false;
        }
    }
    pid = static_cast<pid_t>(number);
    return true;
}

bool ReadWholeFile(const std::string &path, std::string &content)
{
    const OwnedFd fd(open(path.c_str(), O_RDONLY | O_CLOEXEC));
    if (!fd.IsOpen()) {
        return false;
    }
    content.clear();
    char buffer[16384];
    for (;;) {
        const ssize_t got = read(fd.Get(), buffer, sizeof(buffer));
        if (got < 0 && errno == EINTR) {
            continue;
        }
        if (got <= 0) {
            return got == 0;
        }
        content.append(buffer, static_cast<size_t>(got));
    }
}

bool OpenRegularFile(const std::string &path, int flags, mode_t mode, OwnedFd &fd)
{
    std::string name;
    const OwnedFd dir = OpenParentDirectory(path, name);
    if (!dir.IsOpen()) {
        return false;
    }
    // Non-blocking, so that a FIFO in the file's place cannot hold the open up.
    OwnedFd file(openat(dir.Get(), name.c_str(), flags | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC, mode));
    struct stat st;
    if (!file.IsOpen() || fstat(file.Get(), &st) != 0) {
        return false;
    }
    if (!S_ISREG(st.st_mode)) {
        errno = EINVAL;
        return false;
    }
    fd = std::move(file);
    return true;
}

bool MakeDirectory(const std::string &path, mode_t mode)
{
    std::string name;
    const OwnedFd dir = OpenParentDirectory(path, name);
    if (!dir.IsOpen()) {
        return false;
    }
    if (mkdirat(dir.Get(), name.c_str(), mode) == 0) {
        return true;
    }
    struct stat st;
    if (errno != EEXIST || fstatat(dir.Get(), name.c_str(), &st, AT_SYMLINK_NOFOLLOW) != 0) {
        return false;
    }
    if (S_ISDIR(st.st_mode)) {
        return true;
    }
    errno = S_ISLNK(st.st_mode) ? ELOOP : ENOTDIR;
    return false;
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
    OwnedFd fd;
    if (!OpenRegularFile(path, O_RDONLY, 0, fd)) {
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
        const ssize_t got = read(fd.Get(), block.get() + kept, capacity - kept);
        if (got < 0 && errno == EINTR) {
            continue;
        }
        if (got < 0) {
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
                return true;
            }
            line = search = newline + 1;
        }
        kept = static_cast<size_t>(end - line);
        memmove(block.get(), line, kept);
    }
    fd.Close();
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

    std::string tempPath = TempFileTemplate(path, getpid());
    OwnedFd fd(mkostemp(&tempPath[0], O_CLOEXEC));
    if (!fd.IsOpen()) {
        return false;
    }
    const bool written = fchmod(fd.Get(), 0644) == 0 &&
                         WriteAll(fd.Get(), content.data(), content.size()) == content.size() && fsync(fd.Get()) == 0;
    // Closed before the rename, and its result counts: a file system may report a lost write only here.
    if (!written || !fd.Close() || rename(tempPath.c_str(), path.c_str()) != 0) {
        const int reason = errno;
        unlink(tempPath.c_str());
        errno = reason;
        return false;
    }
    SyncDirectory(dir);
    return true;
}

}  // namespace FILEINDEX
}  // namespace VEXO
