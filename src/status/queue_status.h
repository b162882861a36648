// Whether a share's queue file holds records for an indexed folder, and the listing's batch that
// reads each queue file once for all folders of a page.
#pragma once

#include <sys/types.h>

#include <map>
#include <set>
#include <string>
#include <string_view>
#include <unordered_map>
#include <unordered_set>
#include <utility>
#include <vector>

#include "fileindex/folder.h"
#include "queue_file.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {

// True when `queuePath` holds a well-formed record whose path (or, for event 256, old path) is
// the folder or lies beneath it, or when the queue is refused for reading (sparse or oversized).
// Malformed lines are logged and skipped. Inside a
// FolderStatusBatch of the calling thread the answer and the log lines come from the batch.
bool IsFolderInQueue(const std::string& folderPath, const std::string& queuePath);

// While it lives, IsFolderInQueue on this thread answers for the given folders from one reading
// of each queue file, and writes the log lines that a reading per folder would have written.
class FolderStatusBatch {
public:
    explicit FolderStatusBatch(const std::vector<Folder>& folders);
    ~FolderStatusBatch();
    FolderStatusBatch(const FolderStatusBatch&) = delete;
    FolderStatusBatch& operator=(const FolderStatusBatch&) = delete;

    // False when the batch cannot answer for this folder prefix ("<full path>/").
    bool Answer(const std::string& prefix, const std::string& queuePath, bool& inQueue);

private:
    struct QueueReading {
        dev_t dev = 0;
        ino_t ino = 0;
        off_t size = 0;  // when read; a file that has changed since is read again
        int fd = -1;     // kept open to read malformed lines again for their log lines
        int openErrno = 0;
        bool refused = false;  // sparse or oversized: every folder counts as pending
        std::vector<MalformedLine> malformed;  // without their text
        std::unordered_set<std::string_view> matched;  // prefixes with a record
    };

    QueueReading& Read(const std::string& queuePath);
    void Match(const std::string& recordPath, QueueReading& reading) const;

    std::vector<std::string> owned_;  // the prefixes that the views below point into
    std::unordered_map<std::string_view, std::string_view> byFolder_;  // prefix without its "/" -> prefix
    std::set<size_t> folderLengths_;
    std::map<std::string, QueueReading> readings_;
    FolderStatusBatch* outer_;
};

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
