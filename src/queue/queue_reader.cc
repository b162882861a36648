// The queue's records for the indexing daemon, through the bounded scan of the status readers.
#include "fileindex/queue_reader.h"

#include <sys/stat.h>

#include <algorithm>

#include "line_reader.h"
#include "queue_file.h"

namespace QIRA {
namespace FILEINDEX {

QueueReading ReadQueueRecords(const std::string& queueFile, const std::function<void(const QueueRecordView&)>& onRecord,
                              const std::function<void(off_t offset, size_t length)>& onMalformed) {
    QueueRecordView view;
    const detail::QueueOpen opened = detail::ScanQueue(
        queueFile,
        [&](const detail::QueueRecord& record) {
            view.event = record.event;
            view.path = record.path;
            view.path_old = record.path_old;
            onRecord(view);
        },
        [&](const detail::MalformedLine& line) { onMalformed(line.offset, line.length); });
    switch (opened) {
        case detail::QueueOpen::Opened: return QueueReading::Read;
        case detail::QueueOpen::Refused: return QueueReading::Refused;
        case detail::QueueOpen::Failed: break;
    }
    return QueueReading::Unopened;
}

QueueReading ReadQueueSlice(int fd, const std::string& queueFile, off_t from, size_t maxRecords,
                            const std::function<void(const QueueRecordView&)>& onRecord,
                            const std::function<void(off_t offset, size_t length)>& onMalformed, off_t& next) {
    next = from;
    struct stat st;
    if (fstat(fd, &st) != 0 || !S_ISREG(st.st_mode)) return QueueReading::Unopened;
    if (const char* refusal = detail::QueueRefusal(st)) {
        detail::ReportRefusedQueue(queueFile, st, refusal);
        return QueueReading::Refused;
    }
    detail::LineReader lines(fd, detail::kMaxQueueLine, from, st.st_size);
    detail::QueueRecordReader reader;
    detail::QueueRecord record;
    QueueRecordView view;
    detail::LineReader::Line line;
    size_t records = 0;
    while (records < maxRecords && lines.Next(line)) {
        next = std::min<off_t>(st.st_size, from + line.offset + static_cast<off_t>(line.length) + 1);
        if (!line.overlong && reader.Read(line.begin, line.end, record)) {
            view.event = record.event;
            view.path = record.path;
            view.path_old = record.path_old;
            onRecord(view);
            ++records;
        } else {
            onMalformed(from + line.offset, line.length);
        }
    }
    return QueueReading::Read;
}

}  // namespace FILEINDEX
}  // namespace QIRA
