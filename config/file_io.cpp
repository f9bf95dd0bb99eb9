#include "config/file_io.h"

#include <dirent.h>
#include <fcntl.h>
#include <signal.h>
#include <stdlib.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace VEXO {
namespace FILEINDEX {
namespace {

// Temporary files are named "<name>.tmp.<pid>.<random>" so that a sweep can tell whose they are.
const char kTempInfix[] = ".tmp.";

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

bool WriteAll(int fd, const char *data, size_t size)
{
    while (size > 0) {
        const ssize_t written = write(fd, data, size);
        if (written < 0) {
            if (errno == EINTR) {
                continue;
            }
            return false;
        }
        data += written;
        size -= static_cast<size_t>(written);
    }
    return true;
}

// Removes temporary files of name whose writing process no longer exists (killed mid-save).
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
        if (kill(static_cast<pid_t>(pid), 0) == -1 && errno == ESRCH) {
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

bool ForEachLine(const std::string &path, const std::function<bool(const std::string &line)> &visit)
{
    const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0) {
        return false;
    }
    std::string pending;
    char buffer[65536];
    for (;;) {
        const ssize_t got = read(fd, buffer, sizeof(buffer));
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
        pending.append(buffer, static_cast<size_t>(got));
        size_t start = 0;
        for (size_t newline; (newline = pending.find('\n', start)) != std::string::npos; start = newline + 1) {
            if (!visit(pending.substr(start, newline - start))) {
                close(fd);
                return true;
            }
        }
        pending.erase(0, start);
    }
    close(fd);
    if (!pending.empty()) {
        visit(pending);
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
    const bool written = fchmod(fd, 0644) == 0 && WriteAll(fd, content.data(), content.size()) && fsync(fd) == 0;
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
