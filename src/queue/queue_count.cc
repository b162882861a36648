#include "queue_count.h"

#include "queue_readings.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {

unsigned long long CountRecordsUnder(const std::string& file, const std::string& prefix, bool* refused) {
    QueueAnswer answer;
    ReadQueue(file, {prefix}, answer);
    if (refused != nullptr) *refused = answer.refused;
    return answer.under[0].records;
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
