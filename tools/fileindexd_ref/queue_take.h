// Taking a share's event queue the way fileindexd does: renamed to its ".tmp" companion under the
// queue's lock, so that writers waiting for the lock open a new queue, then read without the lock.
//
// The queue and its companion lie in the share's "@eaDir", which the share's users can write: both
// are reached only through the share directory's descriptor, "@eaDir" included, never through a
// link; a file of the wrong kind at either name is set aside so that the share goes on.
#pragma once

#include <sys/types.h>

#include <functional>
#include <string>
#include <vector>

#include "beneath.h"
#include "fileindex/queue_reader.h"

namespace fileindexd_ref {

using Batch = std::vector<QIRA::FILEINDEX::QueueRecordView>;

class QueueTake {
public:
    QueueTake(std::string share, std::string shareDir) : share_(std::move(share)), shareDir_(std::move(shareDir)) {}

    // Moves the queue to its companion under the queue's lock (waiting at most about a second for
    // it): renamed, or appended when the companion still holds records. A queue or companion that is
    // not a regular file with one link is set aside under a new name in "@eaDir", logged, and the
    // share marked need-reindex.
    void Take();

    // Reads the companion's next `batchSize` records from where the last batch ended and hands them
    // to `apply`. When it succeeds the batch is done and a companion read to its end is removed;
    // when it fails the batch stays to be read again and the share is marked need-reindex. A
    // companion that cannot be read (sparse, too large) is removed unread, its share marked.
    // Returns the records applied (0 also when there were none).
    size_t ApplyNext(size_t batchSize, const std::function<bool(const Batch&)>& apply);

    // True while the companion holds records not yet applied.
    bool HasMore() const { return more_; }
    // Records of the companion being read that are applied already; 0 when none is being read.
    size_t Applied() const { return applied_; }

private:
    tools::Fd OpenEaDir() const;
    // Moves `name`, found to be `kind`, aside in "@eaDir"; logs it and marks the share.
    void SetAside(int eaDir, const char* name, const std::string& kind);
    void Remove(int eaDir, const char* name, dev_t dev, ino_t ino);

    std::string share_;
    std::string shareDir_;
    dev_t dev_ = 0;  // the companion being read, and how far
    ino_t ino_ = 0;
    off_t offset_ = 0;
    size_t applied_ = 0;
    bool more_ = false;
};

}  // namespace fileindexd_ref
