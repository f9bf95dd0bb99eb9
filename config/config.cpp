// Config: the lock on the lock file, and the document loaded and saved through json_io.
#include "fileindex/config.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>

#include "config/json_io.h"
#include "config/log.h"
#include "config/owned_fd.h"
#include "fileindex/error.h"
#include "fileindex/utils.h"

FILEIDX_LOG_UNIT("config.cpp");

namespace VEXO {
namespace FILEINDEX {

namespace {
constexpr int kLockAttempts = 3;
}

Config::Config() : m_jsConfig(Json::objectValue), m_fdLock(-1) {}

Config::~Config() = default;

bool Config::Lock(bool exclusive)
{
    const int operation = (exclusive ? LOCK_EX : LOCK_SH) | LOCK_NB;
    for (int attempt = 1;; ++attempt) {
        // The lock file sits in a directory every account may write: a symbolic link planted in its
        // place is refused, never followed.
        OwnedFd fd(open(GetLockPath().c_str(), O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, 0644));
        if (fd.IsOpen() && flock(fd.Get(), operation) == 0) {
            m_fdLock = fd.Release();
            return true;
        }
        const bool contended = fd.IsOpen() && (errno == EINTR || errno == EAGAIN);
        if (contended) {
            usleep(static_cast<useconds_t>((rand() % 10) * 1000));
        }
        if (!contended || attempt == kLockAttempts) {
            // What the last attempt opened (-1 when the open failed) stays in m_fdLock until Unlock,
            // which every caller calls.
            m_fdLock = fd.Release();
            break;
        }
        // A retry opens the file afresh; this attempt's descriptor is closed here.
    }
    FILEIDX_LOG("%s:%d Failed to lock folder");
    ErrorHandler::SetError(FILEIDX_ERR_LOCK);
    return false;
}

void Config::Unlock()
{
    if (m_fdLock < 0) {
        return;
    }
    flock(m_fdLock, LOCK_UN);
    close(m_fdLock);
    m_fdLock = -1;  // a second Unlock must not close a descriptor that has since reused the number
}

bool Config::LoadJson()
{
    if (!IsFileExist(GetPath())) {
        return true;
    }
    if (fromFile(m_jsConfig, GetPath())) {
        return true;
    }
    FILEIDX_LOG("%s:%d Failed to load json from %s", GetPath().c_str());
    ErrorHandler::SetError(FILEIDX_ERR_LOAD_CONFIG);
    return false;
}

bool Config::SaveJson()
{
    if (!toFile(m_jsConfig, GetPath())) {
        FILEIDX_LOG("%s:%d Failed to save json to %s", GetPath().c_str());
        ErrorHandler::SetError(FILEIDX_ERR_SAVE_CONFIG);
        return false;
    }
    if (chmod(GetPath().c_str(), 0644) == -1) {
        FILEIDX_LOG("%s:%d chmod failed, path=%s", GetPath().c_str());
    }
    return true;
}

}  // namespace FILEINDEX
}  // namespace VEXO
