// Reading the records of a share's event queue file.
#pragma once

#include <functional>
#include <string>

namespace QIRA {
namespace FILEINDEX {
namespace detail {

struct QueueRecord {
    unsigned event = 0;
    std::string path;
    std::string path_old;  // only for event 256; empty otherwise
};

constexpr unsigned kEventRename = 256;

// Calls onRecord for every well-formed line (a JSON object with an "event" convertible to an
// unsigned integer and a string "path") and onMalformed for every other line. False, with
// errno set, when the file cannot be opened as a regular file (links are not followed, a FIFO
// is refused without blocking).
bool ScanQueue(const std::string& queueFile, const std::function<void(const QueueRecord&)>& onRecord,
               const std::function<void(const std::string&)>& onMalformed);

// True when `queueFile` holds a reindex record (65536) for exactly `path`.
bool IsReindexQueued(const std::string& path, const std::string& queueFile);

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA

namespace QIRA {
namespace FILEINDEX {
namespace detail {

// True when `queuePath` holds a well-formed record whose path (or, for event 256, old path) is
// the folder or lies beneath it. Malformed lines are logged and skipped.
bool IsFolderInQueue(const std::string& folderPath, const std::string& queuePath);

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA

namespace QIRA {
namespace FILEINDEX {
namespace detail {

// The share's queue path from FILEIDXQueuePathGet (4096-byte buffer); logs and returns false
// when it cannot be formed.
bool ShareQueuePath(const std::string& share, std::string& queuePath);

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
