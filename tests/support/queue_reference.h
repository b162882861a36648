// The plain reading of a queue file that the incremental readings must always agree with: the
// whole file, every line, every folder, from scratch.
#pragma once

#include <sys/stat.h>

#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "fileindex/file_changes.h"
#include "path_rules.h"
#include "queue_file.h"
#include "queue_readings.h"
#include "queue_record.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {

inline bool operator==(const Tally& a, const Tally& b) { return a.records == b.records && a.files == b.files; }
inline void PrintTo(const Tally& tally, std::ostream* out) { *out << tally.records << " records, " << tally.files << " files"; }

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA

namespace testkit {

inline std::vector<unsigned long long> RecordsOf(const std::vector<QIRA::FILEINDEX::detail::Tally>& tallies) {
    std::vector<unsigned long long> records;
    for (const auto& tally : tallies) records.push_back(tally.records);
    return records;
}

// False when the file is not a regular file.
inline bool FullReading(const std::string& file, const std::vector<std::string>& prefixes,
                        QIRA::FILEINDEX::detail::QueueAnswer& answer) {
    using namespace QIRA::FILEINDEX::detail;
    answer = QueueAnswer();
    answer.under.assign(prefixes.size(), Tally());
    struct stat st;
    if (lstat(file.c_str(), &st) != 0 || !S_ISREG(st.st_mode)) return false;
    if (QueueRefusal(st) != nullptr) {
        answer.refused = true;
        return true;
    }
    std::ifstream in(file, std::ios::binary);
    const std::string content((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    QIRA::FILEINDEX::FileChanges changes;
    size_t begin = 0;
    while (begin < content.size()) {
        size_t end = content.find('\n', begin);
        if (end == std::string::npos) end = content.size();
        ++answer.lines;
        QueueRecord record;
        if (end - begin <= kMaxQueueLine && ReadQueueRecordStrict(content.data() + begin, content.data() + end, record)) {
            const Tally one{1, changes.IsNewFile(record.path) ? 1u : 0u};
            const auto add = [&one](Tally& to) {
                to.records += one.records;
                to.files += one.files;
            };
            add(answer.all);
            for (size_t i = 0; i < prefixes.size(); ++i) {
                if (prefixes[i].empty()) continue;
                const std::string folder = prefixes[i].substr(0, prefixes[i].size() - 1);
                if (IsWithin(record.path, folder) ||
                    (record.event == kEventRename && !record.path_old.empty() && IsWithin(record.path_old, folder))) {
                    add(answer.under[i]);
                }
            }
        }
        begin = end + 1;
    }
    return true;
}

}  // namespace testkit
