// Appending custom events to a share's event queue; a lost event marks the share for reindex.
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
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

constexpr int kAppendAttempts = 3;
// Bound on reopening a queue that the daemon took away while we waited for its lock.
constexpr int kMaxReopen = 100;

enum class AppendResult { Written, Contended, Failed };

// A queue the daemon unlinked while we waited for its lock is no longer the queue.
bool StillLinked(int fd) {
    struct stat st;
    return fstat(fd, &st) == 0 && st.st_nlink > 0;
}

// A short write (disk full) is cut off again while the lock is held, so the next record does
// not join a partial line.
void WriteWholeLineOrNothing(int fd, const std::string& line) {
    struct stat before;
    const bool sized = fstat(fd, &before) == 0;
    const ssize_t wrote = write(fd, line.data(), line.size());
    if (wrote == static_cast<ssize_t>(line.size())) return;
    FILEIDX_DEBUG_LOG("write fail, (%ld, %ld)", static_cast<long>(wrote), static_cast<long>(line.size()));
    if (sized && wrote > 0) ftruncate(fd, before.st_size);
}

AppendResult AppendLine(const std::string& queuePath, const std::string& line) {
    int attempt = 0;
    int reopened = 0;
    while (attempt < kAppendAttempts) {
        const int fd = detail::OpenNoFollow(queuePath, O_WRONLY | O_CREAT | O_APPEND, 0644);
        if (fd < 0) return AppendResult::Failed;
        if (flock(fd, LOCK_EX | LOCK_NB) == 0) {
            if (!StillLinked(fd) && ++reopened <= kMaxReopen) {
                flock(fd, LOCK_UN);
                close(fd);
                continue;
            }
            WriteWholeLineOrNothing(fd, line);
            flock(fd, LOCK_UN);
            close(fd);
            return AppendResult::Written;
        }
        if (errno != EINTR && errno != EWOULDBLOCK) {
            FILEIDX_DEBUG_LOG("flock fail, path=%s, reason=%m", queuePath.c_str());
            close(fd);
            return AppendResult::Failed;
        }
        close(fd);
        usleep(static_cast<useconds_t>((rand() % 10) * 1000));
        ++attempt;
    }
    FILEIDX_DEBUG_LOG("try lock too many times, path=%s, reason=%m", queuePath.c_str());
    return AppendResult::Contended;
}

bool MarkShareForReindex(const std::string& shareName) {
    if (!StatusMgr::ShareSetNeedReindex(shareName, true)) {
        FILEIDX_LOG("ShareSetNeedReindex failed, share=%s", shareName.c_str());
    }
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
    switch (AppendLine(queuePath, toString(record) + "\n")) {
        case AppendResult::Written:
        case AppendResult::Contended:
            return true;
        case AppendResult::Failed:
            break;
    }
    return MarkShareForReindex(share);
}

}  // namespace detail

bool AddCustomEvent(const int& event, const std::string& path, const Json::Value& data) {
    detail::PendingReindex pending({path});
    return detail::AddCustomEvent(event, path, data, pending);
}

}  // namespace FILEINDEX
}  // namespace QIRA
