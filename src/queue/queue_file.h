// A share's event queue: what the indexing daemon has still to do for the share.
//
// The queue is the file "<share>/@eaDir/QIRA@file_index_queue", one JSON record per line:
// {"event": N, "path": P, "data": {...}} and, for a move (256), "path_old". Its companion
// "<queue>.tmp" holds what the daemon took and has not finished.
// - Writers append whole lines, each in one write, under an exclusive flock of the queue: the
//   library (custom_event.h: reindex 65536 and settings 131072 records, waiting about a second
//   for the lock and else marking the share need-reindex) and the notification daemon (its
//   change records).
// - The daemon takes the queue under the same lock, by renaming it to the companion (or
//   appending it there), and then reads the companion without the lock.
// - Readers take no lock: they read whole lines only and treat a last line without "\n" as
//   being written. The status scan and counts (queue_status.h, queue_count.h, progress) read
//   incrementally (queue_readings.h); the pending-reindex check (pending_reindex.h) and the
//   daemon's reader (fileindex/queue_reader.h) read from the start.
//
// This file: reading a queue file within fixed bounds.
//
// A share's users can write in the share's "@eaDir", so a queue may hold anything. Readers keep
// to two bounds, chosen from what the writers can produce: the library and the notifier write a
// record of at most two paths of PATH_MAX bytes and a small data object per line, and the daemon
// takes a queue long before it holds a gigabyte.
#pragma once

#include <sys/stat.h>
#include <sys/types.h>

#include <functional>
#include <string>
#include <string_view>

#include "queue_record.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {

// A longer line is malformed: it is skipped to its newline without being held in memory.
constexpr size_t kMaxQueueLine = 64 * 1024;
// A larger queue file is not read line by line: reading it would hold a caller for seconds, and no
// daemon lets its backlog grow so far.
constexpr off_t kMaxQueueFileSize = off_t{1} << 30;
// A file of at least this size with blocks for less than an eighth of it is sparse: no append
// made it, and its holes would read as a line of NUL bytes as long as the file.
constexpr off_t kSparseFloor = off_t{1} << 20;

enum class QueueOpen { Opened, Refused, Failed };

// "sparse" or "oversized" for a queue file that is not read line by line, else null.
const char* QueueRefusal(const struct stat& st);
// One log line naming the file and the reason, and the share holding it marked need-reindex
// (unless it is marked already).
void ReportRefusedQueue(const std::string& queueFile, const struct stat& st, const char* refusal);

// Opens a queue file or its companion for reading, without following links or blocking. Opened:
// `fd` is the caller's. Refused: the file is sparse or larger than kMaxQueueFileSize; it is not
// opened, one line naming the file and the reason is logged and the share holding it is marked
// need-reindex, and its records count as pending. Failed: it cannot be opened as a regular file
// (errno set).
QueueOpen OpenQueueForReading(const std::string& queueFile, int& fd);

struct MalformedLine {
    off_t offset = 0;        // of its first byte, from where reading began
    size_t length = 0;       // without the "\n"
    std::string_view text;   // empty when the line is longer than kMaxQueueLine
    bool overlong = false;
};

// Calls onRecord for every record line and onMalformed for every other line, streaming: memory is
// bounded by kMaxQueueLine and one block of the file.
using RecordHandler = std::function<void(const QueueRecord&)>;
using MalformedHandler = std::function<void(const MalformedLine&)>;
QueueOpen ScanQueue(const std::string& queueFile, const RecordHandler& onRecord, const MalformedHandler& onMalformed);
// The same over an open queue file, from its current offset; the descriptor stays the caller's.
void ScanQueue(int fd, const RecordHandler& onRecord, const MalformedHandler& onMalformed);

// True when `queueFile` holds a reindex record (65536) for exactly `path`.
bool IsReindexQueued(const std::string& path, const std::string& queueFile);

// The share's queue path from FILEIDXQueuePathGet (4096-byte buffer); logs and returns false
// when it cannot be formed.
bool ShareQueuePath(const std::string& share, std::string& queuePath);

// Sets the share's need-reindex flag; logs "ShareSetNeedReindex failed, share=%s" when that
// fails. Returns false, for the callers that fail with it.
bool MarkShareForReindex(const std::string& share);

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
