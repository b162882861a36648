#include "ea_dir.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace QIRA {
namespace FILEINDEX {
namespace detail {
namespace {

// Deeper levels of a planted tree are left in place rather than holding a descriptor each.
constexpr int kMaxRemoveDepth = 64;

std::string Parent(const std::string& path) {
    const size_t slash = path.rfind('/');
    if (slash == std::string::npos) return ".";
    return slash == 0 ? "/" : path.substr(0, slash);
}

std::string Leaf(const std::string& path) {
    const size_t slash = path.rfind('/');
    return slash == std::string::npos ? path : path.substr(slash + 1);
}

// The directory holding `path`, itself reached from its parent without following a link.
int OpenParentNoFollow(const std::string& path) {
    const std::string dir = Parent(path);
    const int top = open(Parent(dir).c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC);
    if (top < 0) return -1;
    const int fd = openat(top, Leaf(dir).c_str(), O_PATH | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
    const int saved = errno;
    close(top);
    errno = saved;
    return fd;
}

void RemoveEntries(int dirFd, int depth);

// Removes `name` inside `dirFd` and, when it is a directory, what lies below it. A link is
// removed itself, never followed.
void RemoveTreeAt(int dirFd, const char* name, int depth) {
    if (unlinkat(dirFd, name, 0) == 0 || errno != EISDIR) return;
    if (depth < kMaxRemoveDepth) {
        const int fd = openat(dirFd, name, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC);
        if (fd >= 0) RemoveEntries(fd, depth + 1);
    }
    unlinkat(dirFd, name, AT_REMOVEDIR);
}

// Takes ownership of `fd`.
void RemoveEntries(int fd, int depth) {
    DIR* dir = fdopendir(fd);
    if (dir == nullptr) {
        close(fd);
        return;
    }
    while (const dirent* entry = readdir(dir)) {
        if (std::strcmp(entry->d_name, ".") == 0 || std::strcmp(entry->d_name, "..") == 0) continue;
        RemoveTreeAt(dirfd(dir), entry->d_name, depth);
    }
    closedir(dir);
}

}  // namespace

void RemoveInEaDir(const std::string& path) {
    const int dir = OpenParentNoFollow(path);
    if (dir < 0) return;
    RemoveTreeAt(dir, Leaf(path).c_str(), 0);
    close(dir);
}

int OpenNoFollow(const std::string& path, int flags, mode_t mode) {
    const int dir = OpenParentNoFollow(path);
    if (dir < 0) return -1;
    const int fd = openat(dir, Leaf(path).c_str(), flags | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC, mode);
    const int saved = errno;
    close(dir);
    if (fd < 0) {
        errno = saved;
        return -1;
    }
    struct stat st;
    if (fstat(fd, &st) != 0 || !S_ISREG(st.st_mode) || st.st_nlink > 1) {
        close(fd);
        errno = ELOOP;
        return -1;
    }
    return fd;
}

int MkdirNoFollow(const std::string& path, mode_t mode) {
    const int dir = OpenParentNoFollow(path);
    if (dir < 0) return -1;
    const int rc = mkdirat(dir, Leaf(path).c_str(), mode);
    const int saved = errno;
    close(dir);
    errno = saved;
    return rc;
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
