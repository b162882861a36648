#include "queue_count.h"

#include "queue_readings.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {

std::map<std::string, unsigned long long> CountRecordsUnder(const std::string& file,
                                                            const std::vector<std::string>& prefixes, bool* refused) {
    QueueAnswer answer;
    const bool read = ReadQueue(file, prefixes, answer);
    if (refused != nullptr) *refused = answer.refused;
    if (!read) {
        for (const auto& prefix : prefixes) answer.under[prefix] = 0;
    }
    return answer.under;
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
