// Reading the records of a share's event queue file.
#pragma once

#include <functional>
#include <string>

#include "queue_record.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {

// Calls onRecord for every record line and onMalformed (with the line and its offset in the
// file) for every other line, streaming: memory is bounded by the longest line. False, with errno
// set, when the file cannot be opened as a regular file (links are not followed, a FIFO is
// refused without blocking).
using RecordHandler = std::function<void(const QueueRecord&)>;
using MalformedHandler = std::function<void(const std::string& line, off_t offset)>;
bool ScanQueue(const std::string& queueFile, const RecordHandler& onRecord, const MalformedHandler& onMalformed);
// The same over an open queue file, from its current offset; the descriptor stays the caller's.
void ScanQueue(int fd, const RecordHandler& onRecord, const MalformedHandler& onMalformed);

// True when `queueFile` holds a reindex record (65536) for exactly `path`.
bool IsReindexQueued(const std::string& path, const std::string& queueFile);

// The share's queue path from FILEIDXQueuePathGet (4096-byte buffer); logs and returns false
// when it cannot be formed.
bool ShareQueuePath(const std::string& share, std::string& queuePath);

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
