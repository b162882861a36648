// One line of a share's event queue read as a record.
//
// The reading every line is held to is strict JSON through jsoncpp (the configuration files'
// rules). QueueRecordReader gives the same answers faster: it takes simdjson's result where
// simdjson accepts the line and nothing in it could be read differently (duplicate keys, an
// "event" that is a fraction, deep nesting), and the strict reading otherwise.
#pragma once

#include <memory>
#include <string>

namespace QIRA {
namespace FILEINDEX {
namespace detail {

struct QueueRecord {
    unsigned event = 0;
    std::string path;
    std::string path_old;  // only for event 256; empty otherwise

    bool operator==(const QueueRecord& other) const {
        return event == other.event && path == other.path && path_old == other.path_old;
    }
};

constexpr unsigned kEventRename = 256;

// A record is a JSON object with an "event" that converts to an unsigned integer (null, booleans
// and numbers from 0 to 4294967295, fractions cut) and a string "path". False for any other line.
bool ReadQueueRecordStrict(const char* begin, const char* end, QueueRecord& record);

class StrictJsonReader;

class QueueRecordReader {
public:
    QueueRecordReader();
    ~QueueRecordReader();
    QueueRecordReader(const QueueRecordReader&) = delete;
    QueueRecordReader& operator=(const QueueRecordReader&) = delete;

    // The same answer as ReadQueueRecordStrict. REQUIRES: 64 readable bytes after `end`.
    bool Read(const char* begin, const char* end, QueueRecord& record);

private:
    struct Parser;
    std::unique_ptr<Parser> parser_;
    std::unique_ptr<StrictJsonReader> strict_;
};

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
