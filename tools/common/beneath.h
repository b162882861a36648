// Opening what lies beneath a directory that strangers can write in (a share, its "@eaDir")
// without ever leaving it: no "..", no symbolic link on the way or at the end, no magic link.
#pragma once

#include <sys/types.h>

#include <string>

namespace tools {

// Opens `relative` ("a/b/c", or "" for `dirFd` itself) beneath `dirFd`, resolved by the kernel
// with RESOLVE_BENEATH | RESOLVE_NO_SYMLINKS | RESOLVE_NO_MAGICLINKS, or where openat2 is missing
// one component at a time with O_NOFOLLOW, ".." refused. O_CLOEXEC, O_NOFOLLOW and O_NONBLOCK are
// always added: a FIFO never holds the caller. -1 with errno otherwise.
int OpenBeneath(int dirFd, const std::string& relative, int flags, mode_t mode = 0);

// A new name for `name` set aside in the same directory: "<name>.set-aside.<time>.<pid>.<n>",
// never the same twice in a process.
std::string SetAsideName(const std::string& name);

// A descriptor closed when it goes out of scope.
class Fd {
public:
    explicit Fd(int fd = -1) : fd_(fd) {}
    ~Fd();
    Fd(Fd&& other) noexcept : fd_(other.Release()) {}
    Fd& operator=(Fd&& other) noexcept;
    Fd(const Fd&) = delete;
    Fd& operator=(const Fd&) = delete;

    int Get() const { return fd_; }
    bool Valid() const { return fd_ >= 0; }
    int Release();

private:
    int fd_;
};

}  // namespace tools
