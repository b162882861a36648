// Taking a share's event queue the way fileindexd does: renamed to its ".tmp" companion under the
// queue's lock, so that writers waiting for the lock open a new queue, then read without the lock.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "fileindex/queue_reader.h"

namespace fileindexd_ref {

// Moves the queue to its companion under the queue's lock: renamed, or appended when the companion
// still holds records taken earlier. The lock is held for that alone.
void TakeQueue(const std::string& queuePath);

using Batch = std::vector<QIRA::FILEINDEX::QueueRecordView>;

// Hands the companion's records to `apply` in batches of at most `batchSize`, then removes the
// companion. A companion that cannot be read (sparse, too large, not a regular file) is removed
// unread: its share is marked need-reindex. Returns the records read.
size_t ProcessTaken(const std::string& queuePath, size_t batchSize, const std::function<void(const Batch&)>& apply);

}  // namespace fileindexd_ref
