#include "ea_dir.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

namespace QIRA {
namespace FILEINDEX {
namespace detail {
namespace {

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

}  // namespace

int OpenNoFollow(const std::string& path, int flags, mode_t mode) {
    const int dir = OpenParentNoFollow(path);
    if (dir < 0) return -1;
    const int fd = openat(dir, Leaf(path).c_str(), flags | O_NOFOLLOW | O_CLOEXEC, mode);
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
