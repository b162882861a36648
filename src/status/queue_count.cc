#include "queue_count.h"

#include <fcntl.h>
#include <unistd.h>

#include <cstring>
#include <string_view>
#include <unordered_map>

#include "queue_file.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {

LineCount CountLines(const std::string& file) {
    LineCount count;
    int fd = -1;
    const QueueOpen opened = OpenQueueForReading(file, fd);
    count.refused = opened == QueueOpen::Refused;
    if (opened != QueueOpen::Opened) return count;
    static thread_local char buffer[1 << 20];
    char last = '\n';
    ssize_t got;
    while ((got = read(fd, buffer, sizeof buffer)) > 0) {
        for (const char* p = buffer; (p = static_cast<const char*>(std::memchr(p, '\n', buffer + got - p))) != nullptr; ++p) {
            ++count.lines;
        }
        last = buffer[got - 1];
    }
    close(fd);
    if (last != '\n') ++count.lines;
    return count;
}

std::map<std::string, unsigned long long> CountRecordsUnder(const std::string& file,
                                                            const std::vector<std::string>& prefixes, bool* refused) {
    std::unordered_map<std::string_view, unsigned long long> counts;
    for (const auto& prefix : prefixes) counts.emplace(prefix, 0);
    // Each prefix a record lies in counts it once, by its path or else its old path.
    const auto countAncestors = [&](const std::string& recordPath, std::vector<std::string_view>& seen) {
        const std::string probe = recordPath + "/";
        for (size_t slash = probe.find('/'); slash != std::string::npos; slash = probe.find('/', slash + 1)) {
            const auto found = counts.find(std::string_view(probe.data(), slash + 1));
            if (found == counts.end()) continue;
            bool counted = false;
            for (const auto& prefix : seen) counted = counted || prefix == found->first;
            if (!counted) {
                ++found->second;
                seen.push_back(found->first);
            }
        }
    };
    const QueueOpen opened = ScanQueue(
        file,
        [&](const QueueRecord& record) {
            std::vector<std::string_view> seen;
            countAncestors(record.path, seen);
            if (record.event == kEventRename && !record.path_old.empty()) countAncestors(record.path_old, seen);
        },
        [](const MalformedLine&) {});
    if (refused != nullptr) *refused = opened == QueueOpen::Refused;
    std::map<std::string, unsigned long long> result;
    for (const auto& [prefix, count] : counts) result.emplace(std::string(prefix), count);
    return result;
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
