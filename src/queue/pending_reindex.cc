#include "pending_reindex.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstring>

#include "ea_dir.h"
#include "fileindex/utils.h"
#include "line_reader.h"
#include "log.h"
#include "queue_file.h"
#include "queue_record.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {
namespace {

constexpr size_t kTailBytes = 64;

bool SameTail(int fd, off_t scanned, const std::string& tail) {
    if (tail.empty()) return true;
    std::string now(tail.size(), '\0');
    return pread(fd, &now[0], now.size(), scanned - static_cast<off_t>(tail.size())) ==
               static_cast<ssize_t>(now.size()) &&
           now == tail;
}

std::string TailOf(int fd, off_t scanned) {
    const off_t length = std::min<off_t>(scanned, kTailBytes);
    std::string tail(static_cast<size_t>(length), '\0');
    if (length > 0 && pread(fd, &tail[0], tail.size(), scanned - length) != length) tail.clear();
    return tail;
}

}  // namespace

PendingReindex::PendingReindex(const std::vector<std::string>& paths) {
    for (const auto& path : paths) Watch(path);
}

PendingReindex::~PendingReindex() { Forget(); }

void PendingReindex::Forget() {
    for (auto& entry : files_) {
        if (entry.second.fd >= 0) close(entry.second.fd);
    }
    files_.clear();
}

void PendingReindex::Watch(const std::string& path) {
    if (wanted_.count(path) != 0) return;
    owned_.push_back(std::make_unique<std::string>(path));
    wanted_.insert(*owned_.back());
    Forget();  // what was read so far was not read for this path
}

// Without a backslash every string of the line stands verbatim between two quotes, so a line in
// which no string is a wanted path cannot carry a record for one and needs no parse.
bool PendingReindex::MayCarryWantedPath(const char* begin, const char* end) const {
    if (std::memchr(begin, '\\', static_cast<size_t>(end - begin)) != nullptr) return true;
    const char* open = static_cast<const char*>(std::memchr(begin, '"', static_cast<size_t>(end - begin)));
    while (open != nullptr) {
        const char* close = static_cast<const char*>(std::memchr(open + 1, '"', static_cast<size_t>(end - open - 1)));
        if (close == nullptr) return false;
        if (wanted_.count(std::string_view(open + 1, static_cast<size_t>(close - open - 1))) != 0) return true;
        open = static_cast<const char*>(std::memchr(close + 1, '"', static_cast<size_t>(end - close - 1)));
    }
    return false;
}

void PendingReindex::CatchUp(int fd, FileState& state) {
    struct stat st;
    if (fstat(fd, &st) != 0) {
        close(fd);
        return;
    }
    if (state.fd < 0 || st.st_dev != state.dev || st.st_ino != state.ino || st.st_size < state.scanned ||
        !SameTail(fd, state.scanned, state.tail)) {
        if (state.fd >= 0) close(state.fd);
        state = FileState();
        state.dev = st.st_dev;
        state.ino = st.st_ino;
        state.fd = fd;
    } else {
        close(fd);  // the same file as the one held
        fd = state.fd;
    }
    if (lseek(fd, state.scanned, SEEK_SET) != state.scanned) return;
    LineReader lines(fd, kMaxQueueLine);
    QueueRecordReader reader;
    QueueRecord record;
    LineReader::Line line;
    while (lines.Next(line)) {
        if (line.overlong || !MayCarryWantedPath(line.begin, line.end) || !reader.Read(line.begin, line.end, record)) {
            continue;
        }
        if (record.event == static_cast<unsigned>(kEventReindex) && wanted_.count(record.path) != 0) {
            state.queued.insert(record.path);
        }
    }
    state.scanned += lines.TerminatedBytes();
    state.tail = TailOf(fd, state.scanned);
}

bool PendingReindex::IsQueued(const std::string& path, const std::string& queueFile) {
    if (!IsFileExist(queueFile)) return false;
    Watch(path);
    int fd = -1;
    switch (OpenQueueForReading(queueFile, fd)) {
        case QueueOpen::Opened:
            break;
        case QueueOpen::Refused:
            return false;  // the share is marked for a full reindex instead
        case QueueOpen::Failed:
            FILEIDX_LOG("Failed to open queue=%s, reason=%m", queueFile.c_str());
            return false;
    }
    FileState& state = files_[queueFile];
    CatchUp(fd, state);
    return state.queued.count(path) != 0;
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
