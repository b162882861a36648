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

bool IsStillTheQueue(int fd, const std::string& path) {
    struct stat held, named;
    return fstat(fd, &held) == 0 && lstat(path.c_str(), &named) == 0 && held.st_dev == named.st_dev &&
           held.st_ino == named.st_ino;
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

}  // namespace

bool AppendLines(const std::string& queuePath, const std::vector<std::string>& lines) {
    const auto deadline = std::chrono::steady_clock::now() + kLockPatience;
    auto delay = std::chrono::milliseconds(1);
    while (std::chrono::steady_clock::now() < deadline) {
        const int fd = open(queuePath.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC, 0644);
        if (fd < 0) return false;
        if (flock(fd, LOCK_EX | LOCK_NB) != 0) {
            const int reason = errno;
            close(fd);
            if (reason != EWOULDBLOCK && reason != EINTR) return false;
            std::this_thread::sleep_for(delay);
            delay = std::min(delay * 2, std::chrono::milliseconds(32));
            continue;
        }
        if (!IsStillTheQueue(fd, queuePath)) {  // taken while we waited: open the new queue
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

}  // namespace qiranotifyd_sim
