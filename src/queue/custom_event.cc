// Appending custom events to a share's event queue; a lost event marks the share for reindex.
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <vector>

#include "custom_event.h"
#include "ea_dir.h"
#include "fileindex/fileidx.h"
#include "fileindex/json.h"
#include "fileindex/status_mgr.h"
#include "fileindex/utils.h"
#include "log.h"
#include "path_rules.h"
#include "qira/qira_share.h"
#include "queue_file.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

// How long an append waits in all for a queue whose lock another writer, or the daemon taking
// the queue, holds; then the event is given up and the share marked for a full reindex.
constexpr std::chrono::milliseconds kLockPatience{1000};
constexpr useconds_t kFirstBackOffUs = 1000;
constexpr useconds_t kLongestBackOffUs = 32000;

// The descriptor still names the queue: the daemon neither renamed nor removed it while we
// waited for its lock.
bool IsStillTheQueue(int fd, const std::string& queuePath) {
    struct stat held, named;
    return fstat(fd, &held) == 0 && lstat(queuePath.c_str(), &named) == 0 && held.st_dev == named.st_dev &&
           held.st_ino == named.st_ino;
}

// Writes the whole line or, after a short write (disk full), cuts the file back to where it was
// while the lock is still held, so that the next record does not join a partial line.
bool WriteWholeLine(int fd, const std::string& line) {
    struct stat before;
    const bool sized = fstat(fd, &before) == 0;
    const ssize_t wrote = write(fd, line.data(), line.size());
    if (wrote == static_cast<ssize_t>(line.size())) return true;
    FILEIDX_DEBUG_LOG("write fail, (%ld, %ld)", static_cast<long>(wrote), static_cast<long>(line.size()));
    if (sized && wrote > 0 && ftruncate(fd, before.st_size) != 0) FILEIDX_LOG("ftruncate failed, reason=%m");
    return false;
}

void BackOff(useconds_t& delayUs) {
    usleep(delayUs / 2 + static_cast<useconds_t>(rand()) % (delayUs / 2 + 1));
    delayUs = std::min(delayUs * 2, kLongestBackOffUs);
}

// True when the line was appended whole under the queue's lock.
bool AppendLine(const std::string& queuePath, const std::string& line) {
    const auto deadline = std::chrono::steady_clock::now() + kLockPatience;
    useconds_t delayUs = kFirstBackOffUs;
    while (true) {
        const int fd = detail::OpenNoFollow(queuePath, O_WRONLY | O_CREAT | O_APPEND, 0644);
        if (fd < 0) return false;
        if (flock(fd, LOCK_EX | LOCK_NB) == 0) {
            if (IsStillTheQueue(fd, queuePath)) {
                const bool written = WriteWholeLine(fd, line);
                flock(fd, LOCK_UN);
                close(fd);
                return written;
            }
            flock(fd, LOCK_UN);  // taken while we waited: open the new queue at once
        } else if (errno != EINTR && errno != EWOULDBLOCK) {
            FILEIDX_DEBUG_LOG("flock fail, path=%s, reason=%m", queuePath.c_str());
            close(fd);
            return false;
        } else {
            BackOff(delayUs);
        }
        close(fd);
        if (std::chrono::steady_clock::now() >= deadline) break;
    }
    errno = EWOULDBLOCK;
    FILEIDX_DEBUG_LOG("try lock too many times, path=%s, reason=%m", queuePath.c_str());
    return false;
}

}  // namespace

namespace detail {

bool AddCustomEvent(const int& event, const std::string& path, const Json::Value& data, PendingReindex& pending) {
    if (!NulFree(path)) return false;
    std::vector<char> shareName(QIRA_SHARE_NAME_LEN, '\0');
    std::vector<char> inside(QIRA_SHARE_PATH_LEN, '\0');
    if (QIRAShareNamePathGet(path.c_str(), shareName.data(), static_cast<int>(shareName.size()), inside.data(),
                             static_cast<int>(inside.size())) < 0) {
        FILEIDX_LOG("QIRAShareNamePathGet failed, path=%s", path.c_str());
        return MarkShareForReindex("");
    }
    shareName.back() = '\0';
    const std::string share = shareName.data();
    char queueBuffer[4096] = {0};
    if (FILEIDXQueuePathGet(share.c_str(), queueBuffer, sizeof queueBuffer) < 0) {
        FILEIDX_LOG("FILEIDXQueuePathGet failed, share=%s", share.c_str());
        return MarkShareForReindex(share);
    }
    const std::string queuePath = queueBuffer;
    if (pending.IsQueued(path, queuePath) || pending.IsQueued(path, queuePath + ".tmp")) return true;

    Json::Value record(Json::objectValue);
    record["event"] = static_cast<Json::UInt>(event);
    record["path"] = path;
    record["data"] = data;
    const std::string line = toString(record) + "\n";
    if (line.size() - 1 > kMaxQueueLine) {
        FILEIDX_LOG("Event too long for the queue, path=%s, length=%zu", path.c_str(), line.size() - 1);
        return MarkShareForReindex(share);
    }
    return AppendLine(queuePath, line) || MarkShareForReindex(share);
}

}  // namespace detail

bool AddCustomEvent(const int& event, const std::string& path, const Json::Value& data) {
    detail::PendingReindex pending({path});
    return detail::AddCustomEvent(event, path, data, pending);
}

}  // namespace FILEINDEX
}  // namespace QIRA
