#include "fileindex/config.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>

#include "fileindex/json.h"
#include "fileindex/utils.h"
#include "log.h"
#include "strict_json.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

constexpr int kLockAttempts = 3;

// The lock file must be a regular file reached without a symbolic link.
int OpenLockFile(const std::string& path) {
    const int fd = open(path.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, 0644);
    if (fd < 0) return fd;
    struct stat st;
    if (fstat(fd, &st) != 0 || !S_ISREG(st.st_mode)) {
        close(fd);
        return -1;
    }
    return fd;
}

void CloseFailedAttempt(int& fd) {
    close(fd);
    fd = -1;
}

}  // namespace

Config::Config() : body(Json::objectValue), lock_fd(-1) {}

Config::~Config() = default;

bool Config::LoadJson() {
    const std::string path = GetPath();
    if (!IsFileExist(path)) return true;
    if (fromFile(body, path)) return true;
    FILEIDX_LOG("Failed to load json from %s", path.c_str());
    ErrorHandler::SetError(FILEINDEX_ERR_LOAD_JSON);
    return false;
}

bool Config::SaveJson() {
    const std::string path = GetPath();
    detail::RemoveSaveTemporaries(path);
    if (!toFile(body, path)) {
        FILEIDX_LOG("Failed to save json to %s", path.c_str());
        ErrorHandler::SetError(FILEINDEX_ERR_SAVE_JSON);
        return false;
    }
    if (chmod(path.c_str(), 0644) == -1) FILEIDX_LOG("chmod failed, path=%s", path.c_str());
    return true;
}

bool Config::Lock(bool exclusive) {
    for (int attempt = 0; attempt < kLockAttempts; ++attempt) {
        lock_fd = OpenLockFile(GetLockPath());
        if (lock_fd < 0) break;
        if (flock(lock_fd, (exclusive ? LOCK_EX : LOCK_SH) | LOCK_NB) == 0) return true;
        const int reason = errno;
        CloseFailedAttempt(lock_fd);
        if (reason != EINTR && reason != EWOULDBLOCK) break;
        usleep(static_cast<useconds_t>((rand() % 10) * 1000));
    }
    FILEIDX_LOG("Failed to lock folder");
    ErrorHandler::SetError(FILEINDEX_ERR_LOCK);
    return false;
}

void Config::Unlock() {
    if (lock_fd < 0) return;
    flock(lock_fd, LOCK_UN);
    close(lock_fd);
}

}  // namespace FILEINDEX
}  // namespace QIRA
