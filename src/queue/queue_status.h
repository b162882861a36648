// Whether a share's queue file holds records for an indexed folder.
#pragma once

#include <string>

namespace QIRA {
namespace FILEINDEX {
namespace detail {

// True when `queuePath` holds a well-formed record whose path (or, for event 256, old path) is
// the folder or lies beneath it, or when the queue is refused for reading (sparse or oversized).
// Read incrementally (queue_readings.h); a malformed line is logged the first time it is read.
bool IsFolderInQueue(const std::string& folderPath, const std::string& queuePath);

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
