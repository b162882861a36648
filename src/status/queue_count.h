// Counting what a share's queue holds, for the explanation and the progress report.
#pragma once

#include <map>
#include <string>
#include <vector>

namespace QIRA {
namespace FILEINDEX {
namespace detail {

// Lines in the file (a last line without "\n" counts); 0 when it is missing or not a regular file,
// 0 and `refused` when it is not read because it is sparse or oversized (its share is marked).
struct LineCount {
    unsigned long long lines = 0;
    bool refused = false;
};
LineCount CountLines(const std::string& file);

// Per folder prefix ("<full path>/"), the well-formed records of the file whose path (or old
// path, for event 256) lies in it. A file refused for reading counts nothing and sets `*refused`.
// Both read incrementally (queue_readings.h).
std::map<std::string, unsigned long long> CountRecordsUnder(const std::string& file,
                                                            const std::vector<std::string>& prefixes,
                                                            bool* refused = nullptr);

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
