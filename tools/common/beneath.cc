#include "beneath.h"

#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <ctime>

namespace tools {
namespace {

constexpr int kAlways = O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK;

int OpenAt2(int dirFd, const std::string& relative, int flags, mode_t mode) {
    open_how how{};
    how.flags = static_cast<unsigned long long>(flags);
    how.mode = (flags & (O_CREAT | O_TMPFILE)) != 0 ? mode : 0;
    how.resolve = RESOLVE_BENEATH | RESOLVE_NO_SYMLINKS | RESOLVE_NO_MAGICLINKS;
    return static_cast<int>(syscall(SYS_openat2, dirFd, relative.empty() ? "." : relative.c_str(), &how, sizeof how));
}

// The same, one component at a time, for kernels without openat2.
int OpenByComponents(int dirFd, const std::string& relative, int flags, mode_t mode) {
    int fd = openat(dirFd, ".", O_PATH | O_DIRECTORY | O_CLOEXEC);
    size_t begin = 0;
    while (fd >= 0) {
        const size_t end = relative.find('/', begin);
        const std::string component = relative.substr(begin, end == std::string::npos ? std::string::npos : end - begin);
        if (component == "..") {
            close(fd);
            errno = EXDEV;
            return -1;
        }
        const bool last = end == std::string::npos;
        if (component.empty() || component == ".") {
            if (last) break;
            begin = end + 1;
            continue;
        }
        const int next = last ? openat(fd, component.c_str(), flags, mode)
                              : openat(fd, component.c_str(), O_PATH | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
        const int saved = errno;
        close(fd);
        errno = saved;
        if (last) return next;
        fd = next;
        begin = end + 1;
    }
    if (fd < 0) return -1;
    // `relative` named `dirFd` itself: reopen it with the caller's flags.
    const int self = openat(fd, ".", flags & ~O_NOFOLLOW, mode);
    const int saved = errno;
    close(fd);
    errno = saved;
    return self;
}

}  // namespace

int OpenBeneath(int dirFd, const std::string& relative, int flags, mode_t mode) {
    flags |= kAlways;
    const int fd = OpenAt2(dirFd, relative, flags, mode);
    if (fd >= 0 || errno != ENOSYS) return fd;
    return OpenByComponents(dirFd, relative, flags, mode);
}

std::string SetAsideName(const std::string& name) {
    static std::atomic<unsigned> count{0};
    return name + ".set-aside." + std::to_string(time(nullptr)) + "." + std::to_string(getpid()) + "." +
           std::to_string(count++);
}

Fd::~Fd() {
    if (fd_ >= 0) close(fd_);
}

Fd& Fd::operator=(Fd&& other) noexcept {
    if (this != &other) {
        if (fd_ >= 0) close(fd_);
        fd_ = other.Release();
    }
    return *this;
}

int Fd::Release() {
    const int fd = fd_;
    fd_ = -1;
    return fd;
}

}  // namespace tools
