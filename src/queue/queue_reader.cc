// The queue's records for the indexing daemon, through the bounded scan of the status readers.
#include "fileindex/queue_reader.h"

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

}  // namespace FILEINDEX
}  // namespace QIRA
