#include "queue_writer.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <thread>

namespace qiranotifyd_sim {
namespace {

constexpr std::chrono::milliseconds kLockPatience{1000};

bool IsStillTheQueue(int fd, int dirFd, const std::string& name) {
    struct stat held, named;
    return fstat(fd, &held) == 0 && fstatat(dirFd, name.c_str(), &named, AT_SYMLINK_NOFOLLOW) == 0 &&
           held.st_dev == named.st_dev && held.st_ino == named.st_ino;
}

// The queue's directory ("<share>/@eaDir"), itself reached without following a link: a share's
// users can put a link to another share's "@eaDir" in its place.
int OpenQueueDir(const std::string& queuePath) {
    const std::string dir = queuePath.substr(0, queuePath.rfind('/'));
    const size_t slash = dir.rfind('/');
    const int parent = open(slash == 0 ? "/" : dir.substr(0, slash).c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC);
    if (parent < 0) return -1;
    const int fd = openat(parent, dir.substr(slash + 1).c_str(), O_PATH | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
    close(parent);
    return fd;
}

bool WriteLines(int fd, const std::vector<std::string>& lines) {
    struct stat before;
    if (fstat(fd, &before) != 0 || !S_ISREG(before.st_mode)) return false;
    for (const auto& line : lines) {
        if (write(fd, line.data(), line.size()) != static_cast<ssize_t>(line.size())) {
            if (ftruncate(fd, before.st_size) != 0) return false;
            return false;
        }
    }
    return true;
}

bool AppendLinesIn(int dirFd, const std::string& name, const std::vector<std::string>& lines) {
    const auto deadline = std::chrono::steady_clock::now() + kLockPatience;
    auto delay = std::chrono::milliseconds(1);
    while (std::chrono::steady_clock::now() < deadline) {
        const int fd = openat(dirFd, name.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC, 0644);
        if (fd < 0) return false;
        if (flock(fd, LOCK_EX | LOCK_NB) != 0) {
            const int reason = errno;
            close(fd);
            if (reason != EWOULDBLOCK && reason != EINTR) return false;
            std::this_thread::sleep_for(delay);
            delay = std::min(delay * 2, std::chrono::milliseconds(32));
            continue;
        }
        if (!IsStillTheQueue(fd, dirFd, name)) {  // taken while we waited: open the new queue
            flock(fd, LOCK_UN);
            close(fd);
            continue;
        }
        const bool written = WriteLines(fd, lines);
        flock(fd, LOCK_UN);
        close(fd);
        return written;
    }
    return false;
}

}  // namespace

bool AppendLines(const std::string& queuePath, const std::vector<std::string>& lines) {
    const int dirFd = OpenQueueDir(queuePath);
    if (dirFd < 0) return false;
    const bool written = AppendLinesIn(dirFd, queuePath.substr(queuePath.rfind('/') + 1), lines);
    close(dirFd);
    return written;
}

}  // namespace qiranotifyd_sim
