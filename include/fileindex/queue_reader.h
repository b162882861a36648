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

// A slice of a queue file the caller opened (the daemon reaches it through the share directory's
// descriptor): the lines from byte `from` on, until `maxRecords` records were handed out or the
// file ends; `next` is the offset after the last line read (an unterminated last line included),
// where the next slice starts. `queueFile` names the file in the refusal's log line and tells its
// share. Refused like the whole reading (the share is marked need-reindex); Unopened when `fd` is
// not a regular file. The descriptor's offset is left alone.
FILEINDEX_EXPORT QueueReading ReadQueueSlice(int fd, const std::string& queueFile, off_t from, size_t maxRecords,
                                             const std::function<void(const QueueRecordView&)>& onRecord,
                                             const std::function<void(off_t offset, size_t length)>& onMalformed,
                                             off_t& next);

}  // namespace FILEINDEX
}  // namespace QIRA
