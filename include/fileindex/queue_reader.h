// Reading a share's event queue, for the indexing daemon and its stand-ins: the records as the
// status operations read them, within the same bounds, whatever the file holds.
#pragma once

#include <sys/types.h>

#include <cstddef>
#include <functional>
#include <string>

#include "fileindex/export.h"

namespace QIRA {
namespace FILEINDEX {

struct QueueRecordView {
    unsigned event = 0;
    std::string path;      // a full path
    std::string path_old;  // event 256 only: where the path was before; empty otherwise
};

enum class QueueReading {
    Read,      // every line was handed to one of the callbacks
    Refused,   // sparse or larger than 1 GiB: not read; the share is marked need-reindex
    Unopened,  // missing, or not a regular file reached without a link (errno tells)
};

// Calls onRecord for each well-formed record of `queueFile` (a queue or its ".tmp" companion) in
// file order and onMalformed with the offset and length of every other line; a line over 64 KiB
// is malformed and never held in memory. Takes no lock: the caller takes the queue away first
// (renamed under the queue's lock) or accepts reading lines a writer is appending. Logs only a
// refusal.
FILEINDEX_EXPORT QueueReading ReadQueueRecords(const std::string& queueFile,
                                               const std::function<void(const QueueRecordView&)>& onRecord,
                                               const std::function<void(off_t offset, size_t length)>& onMalformed);

}  // namespace FILEINDEX
}  // namespace QIRA
