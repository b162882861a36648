// Counting the records a share's queue holds for folders, for the explanation.
#pragma once

#include <string>

namespace QIRA {
namespace FILEINDEX {
namespace detail {

// The well-formed records of the file whose path (or old path, for event 256) lies in the folder
// `prefix` ("<full path>/"); 0 for a file that cannot be read. A file refused for reading counts
// nothing and sets `*refused`. Read incrementally (queue_readings.h).
unsigned long long CountRecordsUnder(const std::string& file, const std::string& prefix, bool* refused = nullptr);

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
