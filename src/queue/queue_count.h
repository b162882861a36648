// Counting the records a share's queue holds for folders, for the explanation.
#pragma once

#include <map>
#include <string>
#include <vector>

namespace QIRA {
namespace FILEINDEX {
namespace detail {

// Per folder prefix ("<full path>/"), the well-formed records of the file whose path (or old
// path, for event 256) lies in it. A file refused for reading counts nothing and sets `*refused`.
// Read incrementally (queue_readings.h).
std::map<std::string, unsigned long long> CountRecordsUnder(const std::string& file,
                                                            const std::vector<std::string>& prefixes,
                                                            bool* refused = nullptr);

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
