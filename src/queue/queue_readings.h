// What a queue file holds for the folders asked about, read incrementally: a host that asks again
// and again (the console, progress --watch, the daemon) pays only for the bytes appended since.
//
// The process keeps, per queue file (device and inode, the file held open so that its inode is
// not reused), the offset read to, the lines before it, and for each folder asked about the
// records that concern it. A later question reads on from that offset. A file that shrank, or
// whose bytes before the offset changed (its first 4 KiB and 64 bytes each from the middle and
// the end of what was read are compared), is read again from the start; so is every file when a
// folder is first asked about, to count its records. The state per
// file is bounded by the folders asked about (at most kMaxFoldersPerQueue, or the folders of one
// question when it asks about more), never by its records,
// and at most kMaxQueuesRead files are held. Safe when several threads ask.
//
// Files are counted with FileChanges in file order; a stretch read by two threads starts the
// second thread's recent paths afresh.
//
// Until a folder is asked about, a file's lines are only counted (the progress report); records
// are parsed, and malformed lines logged, once per process, when a question first needs them. A
// last line without "\n" is counted but not kept, since a writer may be completing it. A stretch
// of 16 MiB or more is read by two threads, the lines logged in file order all the same.
#pragma once

#include <sys/types.h>

#include <cstddef>
#include <string>
#include <vector>

namespace QIRA {
namespace FILEINDEX {
namespace detail {

constexpr size_t kMaxFoldersPerQueue = 4096;
constexpr size_t kMaxQueuesRead = 256;

// Well-formed records, and the files they change as FileChanges counts them.
struct Tally {
    unsigned long long records = 0;
    unsigned long long files = 0;
};

struct QueueAnswer {
    bool refused = false;          // sparse or oversized: not read (logged once, share marked)
    unsigned long long lines = 0;  // every line, a last one without "\n" included
    Tally all;                     // once a folder was asked about
    // Per folder prefix asked ("<full path>/"), in the order asked: the well-formed records whose
    // path (or old path, for event 256) is the folder or lies beneath it, each record counted
    // once; none for an empty prefix.
    std::vector<Tally> under;
};

// Answers for `queueFile` and `prefixes` ("<full path>/" each). False, with errno set, when the
// file cannot be opened as a regular file without following a link.
bool ReadQueue(const std::string& queueFile, const std::vector<std::string>& prefixes, QueueAnswer& answer);

// Forgets every reading (and closes the files held): for tests and benchmarks.
void ForgetQueueReadings();

// Bytes the readings hold, roughly: for benchmarks.
size_t QueueReadingsFootprint();

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
