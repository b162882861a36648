// One queue line read both ways: the fast reader must give the strict reading's verdict, event,
// path and old path for every input.
#include <cstdlib>
#include <vector>

#include "line_reader.h"
#include "queue_record.h"

using namespace QIRA::FILEINDEX::detail;

extern "C" int LLVMFuzzerTestOneInput(const unsigned char* data, size_t size) {
    static QueueRecordReader reader;
    std::vector<char> line(data, data + size);
    line.resize(size + LineReader::kPadding);
    QueueRecord fast, strict;
    const bool fastRead = reader.Read(line.data(), line.data() + size, fast);
    const bool strictRead = ReadQueueRecordStrict(line.data(), line.data() + size, strict);
    if (fastRead != strictRead || (fastRead && !(fast == strict))) std::abort();
    return 0;
}
