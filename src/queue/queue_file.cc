#include "queue_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <vector>

#include "ea_dir.h"
#include "fileindex/fileidx.h"
#include "fileindex/status_mgr.h"
#include "line_reader.h"
#include "log.h"
#include "path_rules.h"
#include "pending_reindex.h"
#include "qira/qira_share.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {
namespace {

// The share whose directory holds the queue file, as the platform finds it; "" when none does.
std::string ShareOfQueue(const std::string& queueFile) {
    std::vector<char> name(QIRA_SHARE_NAME_LEN, '\0');
    std::vector<char> inside(QIRA_SHARE_PATH_LEN, '\0');
    if (QIRAShareNamePathGet(queueFile.c_str(), name.data(), static_cast<int>(name.size()), inside.data(),
                             static_cast<int>(inside.size())) < 0) {
        return "";
    }
    name.back() = '\0';
    return name.data();
}

}  // namespace

const char* QueueRefusal(const struct stat& st) {
    if (st.st_size >= kSparseFloor && static_cast<off_t>(st.st_blocks) * 512 < st.st_size / 8) return "sparse";
    if (st.st_size > kMaxQueueFileSize) return "oversized";
    return nullptr;
}

void ReportRefusedQueue(const std::string& queueFile, const struct stat& st, const char* refusal) {
    FILEIDX_LOG("Queue not read, queue=%s, reason=%s, size=%lld, allocated=%lld", queueFile.c_str(), refusal,
                static_cast<long long>(st.st_size), static_cast<long long>(st.st_blocks) * 512);
    const std::string share = ShareOfQueue(queueFile);
    if (!share.empty() && !StatusMgr::ShareIsNeedReindex(share)) MarkShareForReindex(share);
}

QueueOpen OpenQueueForReading(const std::string& queueFile, int& fd) {
    fd = OpenNoFollow(queueFile, O_RDONLY);
    if (fd < 0) return QueueOpen::Failed;
    struct stat st;
    const char* refusal = fstat(fd, &st) == 0 ? QueueRefusal(st) : nullptr;
    if (refusal == nullptr) return QueueOpen::Opened;
    close(fd);
    fd = -1;
    ReportRefusedQueue(queueFile, st, refusal);
    return QueueOpen::Refused;
}

QueueOpen ScanQueue(const std::string& queueFile, const RecordHandler& onRecord, const MalformedHandler& onMalformed) {
    int fd = -1;
    const QueueOpen opened = OpenQueueForReading(queueFile, fd);
    if (opened != QueueOpen::Opened) return opened;
    ScanQueue(fd, onRecord, onMalformed);
    close(fd);
    return opened;
}

void ScanQueue(int fd, const RecordHandler& onRecord, const MalformedHandler& onMalformed) {
    LineReader lines(fd, kMaxQueueLine);
    QueueRecordReader reader;
    QueueRecord record;
    LineReader::Line line;
    while (lines.Next(line)) {
        if (!line.overlong && reader.Read(line.begin, line.end, record)) {
            onRecord(record);
            continue;
        }
        MalformedLine malformed;
        malformed.offset = line.offset;
        malformed.length = line.length;
        malformed.overlong = line.overlong;
        if (!line.overlong) malformed.text = std::string_view(line.begin, line.length);
        onMalformed(malformed);
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

bool MarkShareForReindex(const std::string& share) {
    if (!StatusMgr::ShareSetNeedReindex(share, true)) {
        FILEIDX_LOG("ShareSetNeedReindex failed, share=%s", share.c_str());
    }
    return false;
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
