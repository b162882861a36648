#include "queue_take.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include "fileindex/status_mgr.h"
#include "fileindex/utils.h"

namespace fileindexd_ref {
namespace {

bool AppendAll(const std::string& path, const std::string& text) {
    const int fd = open(path.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC, 0644);
    if (fd < 0) return false;
    const bool ok = write(fd, text.data(), text.size()) == static_cast<ssize_t>(text.size());
    close(fd);
    return ok;
}

std::string ReadAll(int fd) {
    std::string text;
    char buffer[65536];
    ssize_t got;
    while ((got = read(fd, buffer, sizeof buffer)) > 0) text.append(buffer, static_cast<size_t>(got));
    return text;
}

// The share of a queue path ".../<share dir>/@eaDir/QIRA@file_index_queue".
std::string ShareOfQueue(const std::string& queuePath) {
    std::string share, inside;
    return QIRA::FILEINDEX::GetShareNamePathByFullPath(share, inside, queuePath) ? share : "";
}

}  // namespace

void TakeQueue(const std::string& queuePath) {
    const int fd = open(queuePath.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC);
    if (fd < 0) return;
    struct stat st;
    if (fstat(fd, &st) != 0 || !S_ISREG(st.st_mode) || flock(fd, LOCK_EX) != 0) {
        close(fd);
        return;
    }
    const std::string taken = queuePath + ".tmp";
    struct stat companion;
    if (lstat(taken.c_str(), &companion) != 0) {
        rename(queuePath.c_str(), taken.c_str());
    } else if (AppendAll(taken, ReadAll(fd))) {
        unlink(queuePath.c_str());
    }
    flock(fd, LOCK_UN);
    close(fd);
}

size_t ProcessTaken(const std::string& queuePath, size_t batchSize, const std::function<void(const Batch&)>& apply) {
    const std::string taken = queuePath + ".tmp";
    struct stat st;
    if (lstat(taken.c_str(), &st) != 0) return 0;
    Batch batch;
    size_t read = 0;
    const auto reading = QIRA::FILEINDEX::ReadQueueRecords(
        taken,
        [&](const QIRA::FILEINDEX::QueueRecordView& record) {
            batch.push_back(record);
            ++read;
            if (batch.size() >= batchSize) {
                apply(batch);
                batch.clear();
            }
        },
        [](off_t, size_t) {});
    if (!batch.empty()) apply(batch);
    if (reading == QIRA::FILEINDEX::QueueReading::Unopened) {
        const std::string share = ShareOfQueue(queuePath);
        if (!share.empty()) QIRA::FILEINDEX::StatusMgr::ShareSetNeedReindex(share, true);
    }
    unlink(taken.c_str());
    return read;
}

}  // namespace fileindexd_ref
