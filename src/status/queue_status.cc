#include "queue_status.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "ea_dir.h"
#include "fileindex/utils.h"
#include "log.h"
#include "path_rules.h"
#include "queue_file.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {
namespace {

thread_local FolderStatusBatch* currentBatch = nullptr;

// "Malformed command: <line>", or for an overlong line its offset and length, never its text.
void LogMalformedLine(const std::string& queueFile, const MalformedLine& line) {
    if (line.overlong) {
        FILEIDX_LOG("Malformed command: too long, queue=%s, offset=%lld, length=%zu", queueFile.c_str(),
                    static_cast<long long>(line.offset), line.length);
    } else {
        FILEIDX_LOG("Malformed command: %.*s", static_cast<int>(line.text.size()), line.text.data());
    }
}

bool ScanForFolder(const std::string& folderFullPath, const std::string& queuePath) {
    bool found = false;
    const QueueOpen opened = ScanQueue(
        queuePath,
        [&](const QueueRecord& record) {
            if (IsWithin(record.path, folderFullPath) ||
                (record.event == kEventRename && IsWithin(record.path_old, folderFullPath))) {
                found = true;
            }
        },
        [&](const MalformedLine& line) { LogMalformedLine(queuePath, line); });
    if (opened == QueueOpen::Failed) {
        FILEIDX_LOG("Failed to open queue=%s, reason=%m", queuePath.c_str());
        return false;
    }
    return found || opened == QueueOpen::Refused;  // a refused queue counts as pending
}

}  // namespace

bool IsFolderInQueue(const std::string& folderPath, const std::string& queuePath) {
    if (!IsFileExist(queuePath)) return false;
    std::string fullPath;
    if (!GetFullPath(fullPath, folderPath)) {
        FILEIDX_LOG("Cannot get full path: %s", folderPath.c_str());
        return false;
    }
    const std::string prefix = fullPath + "/";
    bool inQueue = false;
    if (currentBatch != nullptr && currentBatch->Answer(prefix, queuePath, inQueue)) return inQueue;
    return ScanForFolder(fullPath, queuePath);
}

FolderStatusBatch::FolderStatusBatch(const std::vector<Folder>& folders) : outer_(currentBatch) {
    for (const auto& folder : folders) {
        std::string share;
        std::string fullPath;
        if (GetShareNameByPath(share, folder.path) && ShareFullPath(share, folder.path, fullPath)) {
            owned_.push_back(fullPath + "/");
        }
    }
    for (const auto& prefix : owned_) {
        byFolder_.emplace(std::string_view(prefix.data(), prefix.size() - 1), prefix);
        folderLengths_.insert(prefix.size() - 1);
    }
    currentBatch = this;
}

FolderStatusBatch::~FolderStatusBatch() {
    currentBatch = outer_;
    for (auto& entry : readings_) {
        if (entry.second.fd >= 0) close(entry.second.fd);
    }
}

// Every prefix of the batch that the record path lies in: a folder of the batch that is the path
// or one of its ancestors. Only the lengths of the batch's folders are looked up.
void FolderStatusBatch::Match(const std::string& recordPath, QueueReading& reading) const {
    for (const size_t length : folderLengths_) {
        if (recordPath.size() < length) break;
        if (recordPath.size() > length && recordPath[length] != '/') continue;
        const auto folder = byFolder_.find(std::string_view(recordPath.data(), length));
        if (folder != byFolder_.end()) reading.matched.insert(folder->second);
    }
}

FolderStatusBatch::QueueReading& FolderStatusBatch::Read(const std::string& queuePath) {
    struct stat st;
    const bool present = lstat(queuePath.c_str(), &st) == 0;
    auto found = readings_.find(queuePath);
    struct stat held;
    if (found != readings_.end() && present && found->second.dev == st.st_dev && found->second.ino == st.st_ino &&
        fstat(found->second.fd, &held) == 0 && held.st_size == found->second.size) {
        return found->second;
    }
    QueueReading reading;
    const QueueOpen opened = OpenQueueForReading(queuePath, reading.fd);
    reading.refused = opened == QueueOpen::Refused;
    if (opened == QueueOpen::Failed) {
        reading.openErrno = errno;
    } else if (opened == QueueOpen::Opened && fstat(reading.fd, &st) == 0) {
        reading.dev = st.st_dev;
        reading.ino = st.st_ino;
        reading.size = st.st_size;
        ScanQueue(
            reading.fd,
            [&](const QueueRecord& record) {
                Match(record.path, reading);
                if (record.event == kEventRename) Match(record.path_old, reading);
            },
            [&](const MalformedLine& line) { reading.malformed.push_back({line.offset, line.length, {}, line.overlong}); });
    }
    if (found != readings_.end() && found->second.fd >= 0) close(found->second.fd);
    return readings_[queuePath] = std::move(reading);
}

bool FolderStatusBatch::Answer(const std::string& prefix, const std::string& queuePath, bool& inQueue) {
    if (byFolder_.count(std::string_view(prefix).substr(0, prefix.size() - 1)) == 0) return false;
    const QueueReading& reading = Read(queuePath);
    if (reading.refused) {
        inQueue = true;
        return true;
    }
    if (reading.fd < 0) {
        errno = reading.openErrno;
        FILEIDX_LOG("Failed to open queue=%s, reason=%m", queuePath.c_str());
        inQueue = false;
        return true;
    }
    for (const auto& malformed : reading.malformed) {
        std::string text(malformed.overlong ? 0 : malformed.length, '\0');
        if (pread(reading.fd, &text[0], text.size(), malformed.offset) != static_cast<ssize_t>(text.size())) text.clear();
        MalformedLine line = malformed;
        line.text = text;
        LogMalformedLine(queuePath, line);
    }
    inQueue = reading.matched.count(prefix) != 0;
    return true;
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
