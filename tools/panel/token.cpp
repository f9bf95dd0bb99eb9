// The token file: made from kernel randomness, checked when read, and compared in constant time.
#include "token.h"

#include <fcntl.h>
#include <sys/random.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace fileindex_panel {

namespace {

constexpr size_t kTokenBytes = 32;
constexpr size_t kTokenDigits = 2 * kTokenBytes;

bool IsToken(const std::string &text)
{
    return text.size() == kTokenDigits &&
           text.find_first_not_of("0123456789abcdef") == std::string::npos;
}

std::string ErrnoText(const std::string &what, const std::string &path)
{
    return what + " " + path + ": " + strerror(errno);
}

bool CreateToken(const std::string &path, std::string &token, std::string &problem)
{
    unsigned char bytes[kTokenBytes];
    if (getrandom(bytes, sizeof(bytes), 0) != static_cast<ssize_t>(sizeof(bytes))) {
        problem = "the kernel's random source gave no token: " + std::string(strerror(errno));
        return false;
    }
    static const char kDigits[] = "0123456789abcdef";
    token.clear();
    for (unsigned char byte : bytes) {
        token += kDigits[byte >> 4];
        token += kDigits[byte & 0x0F];
    }
    const int fd = open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600);
    if (fd < 0) {
        problem = ErrnoText("cannot create the token file", path);
        return false;
    }
    const std::string line = token + "\n";
    const bool written = write(fd, line.data(), line.size()) == static_cast<ssize_t>(line.size()) && fsync(fd) == 0;
    close(fd);
    if (!written) {
        unlink(path.c_str());
        problem = ErrnoText("cannot write the token file", path);
    }
    return written;
}

}  // namespace

bool LoadOrCreateToken(const std::string &path, std::string &token, std::string &problem)
{
    struct stat status;
    if (lstat(path.c_str(), &status) != 0) {
        if (errno == ENOENT) {
            return CreateToken(path, token, problem);
        }
        problem = ErrnoText("cannot read the token file", path);
        return false;
    }
    if (S_ISLNK(status.st_mode)) {
        problem = "the token file " + path + " is a symbolic link; give the path of the file itself";
        return false;
    }
    const int fd = open(path.c_str(), O_RDONLY | O_NOFOLLOW | O_CLOEXEC);
    if (fd < 0) {
        problem = ErrnoText("cannot open the token file", path);
        return false;
    }
    char text[kTokenDigits + 2];
    const ssize_t length = fstat(fd, &status) == 0 ? read(fd, text, sizeof(text)) : -1;
    close(fd);
    if (!S_ISREG(status.st_mode)) {
        problem = "the token file " + path + " is not a regular file";
    } else if (status.st_uid != geteuid()) {
        problem = "the token file " + path + " belongs to another user; remove it, and a new token is made";
    } else if ((status.st_mode & 077) != 0) {
        problem = "others may read the token file " + path + "; 'chmod 600' it, or remove it for a new token";
    } else if (length < 0) {
        problem = ErrnoText("cannot read the token file", path);
    } else {
        token.assign(text, static_cast<size_t>(length));
        if (!token.empty() && token.back() == '\n') {
            token.pop_back();
        }
        if (IsToken(token)) {
            return true;
        }
        problem = "the token file " + path + " does not hold a token (64 hex digits); remove it, and a new one is made";
    }
    return false;
}

bool TokenMatches(const std::string &presented, const std::string &token)
{
    if (presented.size() != token.size()) {
        return false;
    }
    volatile unsigned char difference = 0;
    for (size_t i = 0; i < token.size(); ++i) {
        difference = difference | (presented[i] ^ token[i]);
    }
    return difference == 0;
}

}  // namespace fileindex_panel
