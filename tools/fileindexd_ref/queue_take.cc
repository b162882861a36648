#include "queue_take.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <iostream>
#include <thread>

#include "fileindex/service_state.h"
#include "fileindex/status_mgr.h"

namespace fileindexd_ref {
namespace {

constexpr char kQueue[] = "QIRA@file_index_queue";
constexpr char kCompanion[] = "QIRA@file_index_queue.tmp";
constexpr std::chrono::milliseconds kLockPatience{1000};

bool IsPlainFile(const struct stat& st) { return S_ISREG(st.st_mode) && st.st_nlink == 1; }

int OpenIn(int eaDir, const char* name, int flags) {
    return openat(eaDir, name, flags | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC, 0644);
}

// The exclusive lock of `fd`, waiting at most kLockPatience: a share's user can hold it for ever.
bool LockWithin(int fd) {
    const auto deadline = std::chrono::steady_clock::now() + kLockPatience;
    while (flock(fd, LOCK_EX | LOCK_NB) != 0) {
        if ((errno != EWOULDBLOCK && errno != EINTR) || std::chrono::steady_clock::now() >= deadline) return false;
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
    return true;
}

// Appends what `from` holds from its start to `to`, block by block.
bool CopyAll(int from, int to) {
    char buffer[65536];
    ssize_t got;
    off_t at = 0;
    while ((got = pread(from, buffer, sizeof buffer, at)) > 0) {
        if (write(to, buffer, static_cast<size_t>(got)) != got) return false;
        at += got;
    }
    return got == 0;
}

void Say(const std::string& share, const std::string& what) {
    std::cout << "fileindexd-ref: share " << share << ": " << what << std::endl;
}

}  // namespace

tools::Fd QueueTake::OpenEaDir() const {
    const tools::Fd share(open(shareDir_.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    return tools::Fd(share.Valid() ? tools::OpenBeneath(share.Get(), "@eaDir", O_RDONLY | O_DIRECTORY) : -1);
}

void QueueTake::SetAside(int eaDir, const char* name, const std::string& kind) {
    const std::string aside = tools::SetAsideName(name);
    const bool moved = renameat(eaDir, name, eaDir, aside.c_str()) == 0;
    Say(share_, std::string(name) + " is " + kind + ", not a queue file; " +
                    (moved ? "set aside as " + aside : "it could not be set aside") + "; the share is marked need-reindex");
    QIRA::FILEINDEX::StatusMgr::ShareSetNeedReindex(share_, true);
}

void QueueTake::Remove(int eaDir, const char* name, dev_t dev, ino_t ino) {
    struct stat st;
    if (fstatat(eaDir, name, &st, AT_SYMLINK_NOFOLLOW) == 0 && st.st_dev == dev && st.st_ino == ino) unlinkat(eaDir, name, 0);
}

void QueueTake::Take() {
    const tools::Fd eaDir = OpenEaDir();
    if (!eaDir.Valid()) return;
    const Json::Value problems = QIRA::FILEINDEX::QueueFileProblems(share_);
    if (problems.isMember("queue")) SetAside(eaDir.Get(), kQueue, problems["queue"].asString());
    if (problems.isMember("companion")) SetAside(eaDir.Get(), kCompanion, problems["companion"].asString());
    const tools::Fd queue(OpenIn(eaDir.Get(), kQueue, O_RDONLY));
    struct stat st;
    if (!queue.Valid() || fstat(queue.Get(), &st) != 0 || !IsPlainFile(st) || !LockWithin(queue.Get())) return;
    const tools::Fd companion(OpenIn(eaDir.Get(), kCompanion, O_WRONLY | O_APPEND));
    struct stat held;
    if (!companion.Valid()) {
        if (errno == ENOENT) renameat(eaDir.Get(), kQueue, eaDir.Get(), kCompanion);
    } else if (fstat(companion.Get(), &held) == 0 && IsPlainFile(held) && CopyAll(queue.Get(), companion.Get())) {
        Remove(eaDir.Get(), kQueue, st.st_dev, st.st_ino);
    }
    flock(queue.Get(), LOCK_UN);
}

size_t QueueTake::ApplyNext(size_t batchSize, const std::function<bool(const Batch&)>& apply) {
    more_ = false;
    const tools::Fd eaDir = OpenEaDir();
    const tools::Fd companion(eaDir.Valid() ? OpenIn(eaDir.Get(), kCompanion, O_RDONLY) : -1);
    struct stat st;
    if (!companion.Valid() || fstat(companion.Get(), &st) != 0) return 0;
    if (st.st_dev != dev_ || st.st_ino != ino_) {
        dev_ = st.st_dev;
        ino_ = st.st_ino;
        offset_ = 0;
        applied_ = 0;
    }
    Batch batch;
    off_t next = offset_;
    const auto reading = QIRA::FILEINDEX::ReadQueueSlice(
        companion.Get(), shareDir_ + "/@eaDir/" + kCompanion, offset_, batchSize,
        [&](const QIRA::FILEINDEX::QueueRecordView& record) { batch.push_back(record); }, [](off_t, size_t) {}, next);
    if (reading != QIRA::FILEINDEX::QueueReading::Read) {
        Remove(eaDir.Get(), kCompanion, st.st_dev, st.st_ino);  // the library marked the share
        applied_ = 0;
        return 0;
    }
    if (!batch.empty() && !apply(batch)) {
        Say(share_, std::to_string(batch.size()) + " records not applied; they stay in " + kCompanion +
                        " for the next pass and the share is marked need-reindex");
        QIRA::FILEINDEX::StatusMgr::ShareSetNeedReindex(share_, true);
        return 0;
    }
    offset_ = next;
    applied_ += batch.size();
    more_ = offset_ < st.st_size;
    if (!more_) {
        Remove(eaDir.Get(), kCompanion, st.st_dev, st.st_ino);
        offset_ = 0;
        applied_ = 0;
    }
    return batch.size();
}

}  // namespace fileindexd_ref
