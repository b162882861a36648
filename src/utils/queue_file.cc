#include "queue_file.h"

#include <fcntl.h>
#include <unistd.h>

#include "ea_dir.h"
#include "fileindex/fileidx.h"
#include "line_reader.h"
#include "log.h"
#include "path_rules.h"
#include "pending_reindex.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {

bool ScanQueue(const std::string& queueFile, const RecordHandler& onRecord, const MalformedHandler& onMalformed) {
    const int fd = OpenNoFollow(queueFile, O_RDONLY);
    if (fd < 0) return false;
    ScanQueue(fd, onRecord, onMalformed);
    close(fd);
    return true;
}

void ScanQueue(int fd, const RecordHandler& onRecord, const MalformedHandler& onMalformed) {
    LineReader lines(fd);
    QueueRecordReader reader;
    QueueRecord record;
    const char* begin;
    const char* end;
    off_t offset = 0;
    while (lines.Next(begin, end)) {
        if (reader.Read(begin, end, record)) {
            onRecord(record);
        } else {
            onMalformed(std::string(begin, end), offset);
        }
        offset = lines.TerminatedBytes();
    }
}

bool IsReindexQueued(const std::string& path, const std::string& queueFile) {
    return PendingReindex({path}).IsQueued(path, queueFile);
}

bool ShareQueuePath(const std::string& share, std::string& queuePath) {
    if (!NulFree(share)) return false;
    char buffer[4096] = {0};
    if (FILEIDXQueuePathGet(share.c_str(), buffer, sizeof buffer) < 0) {
        FILEIDX_LOG("FILEIDXQueuePathGet failed, share=%s", share.c_str());
        return false;
    }
    queuePath = buffer;
    return true;
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
