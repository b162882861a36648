#include "queue_readings.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <memory>
#include <mutex>
#include <set>
#include <string_view>

#include "ea_dir.h"
#include "line_reader.h"
#include "log.h"
#include "queue_file.h"
#include "queue_record.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {
namespace {

constexpr off_t kHeadBytes = 4096;
constexpr off_t kSampleBytes = 64;

using Counts = std::map<std::string, unsigned long long, std::less<>>;  // folder full path -> records

struct Sample {
    off_t offset;
    std::string bytes;
};

struct Reading {
    ~Reading() { close(fd); }

    std::mutex mutex;
    int fd = -1;
    off_t committed = 0;   // bytes read, up to and including the last "\n"
    off_t loggedUpTo = 0;  // malformed lines that begin before this offset were logged
    unsigned long long lines = 0;
    Counts counts;
    std::set<size_t> lengths;  // of the folder paths in `counts`
    std::vector<Sample> samples;
    off_t refusedSize = -1;  // the size a refusal was logged for
    off_t tailLoggedAt = -1;
    size_t tailLoggedLength = 0;
    unsigned long long lastUse = 0;
};

using Key = std::pair<dev_t, ino_t>;

std::mutex g_mutex;
std::map<Key, std::shared_ptr<Reading>> g_readings;
std::map<std::string, std::set<std::string>> g_expected;  // queue file -> folder full paths
unsigned long long g_uses = 0;

std::string FolderOf(const std::string& prefix) { return prefix.empty() ? prefix : prefix.substr(0, prefix.size() - 1); }

bool Removed(const Reading& reading) {
    struct stat st;
    return fstat(reading.fd, &st) != 0 || st.st_nlink == 0;
}

std::set<std::string> TakeExpected(const std::string& queueFile) {
    std::lock_guard<std::mutex> lock(g_mutex);
    const auto found = g_expected.find(queueFile);
    if (found == g_expected.end()) return {};
    std::set<std::string> expected = std::move(found->second);
    g_expected.erase(found);
    return expected;
}

// The reading of the file open as `fd`, made when the file is new to the process; takes `fd` over.
std::shared_ptr<Reading> ReadingOf(int fd, const struct stat& st) {
    std::lock_guard<std::mutex> lock(g_mutex);
    for (auto it = g_readings.begin(); it != g_readings.end();) {
        it = Removed(*it->second) ? g_readings.erase(it) : std::next(it);
    }
    std::shared_ptr<Reading>& slot = g_readings[Key(st.st_dev, st.st_ino)];
    if (slot) {
        close(fd);
    } else {
        slot = std::make_shared<Reading>();
        slot->fd = fd;
    }
    slot->lastUse = ++g_uses;
    const std::shared_ptr<Reading> reading = slot;
    while (g_readings.size() > kMaxQueuesRead) {
        g_readings.erase(std::min_element(g_readings.begin(), g_readings.end(), [](const auto& a, const auto& b) {
            return a.second->lastUse < b.second->lastUse;
        }));
    }
    return reading;
}

bool SamplesHold(const Reading& reading) {
    std::string now;
    for (const auto& sample : reading.samples) {
        now.resize(sample.bytes.size());
        if (pread(reading.fd, &now[0], now.size(), sample.offset) != static_cast<ssize_t>(now.size()) || now != sample.bytes) {
            return false;
        }
    }
    return true;
}

// The first bytes read (up to kHeadBytes), and kSampleBytes from the middle and from the end.
void TakeSamples(Reading& reading) {
    reading.samples.clear();
    const off_t head = std::min<off_t>(reading.committed, kHeadBytes);
    const off_t length = std::min<off_t>(reading.committed, kSampleBytes);
    for (const auto& [offset, size] : {std::pair{off_t{0}, head}, std::pair{(reading.committed - length) / 2, length},
                                       std::pair{reading.committed - length, length}}) {
        Sample sample{offset, std::string(static_cast<size_t>(size), '\0')};
        if (size > 0 && pread(reading.fd, &sample.bytes[0], sample.bytes.size(), offset) != size) continue;
        reading.samples.push_back(std::move(sample));
    }
}

// Reads the file from the start again; `rewritten` when its content is no longer what was read.
void ReadAgain(Reading& reading, bool rewritten) {
    reading.committed = 0;
    reading.lines = 0;
    for (auto& entry : reading.counts) entry.second = 0;
    reading.samples.clear();
    if (rewritten) {
        reading.loggedUpTo = 0;
        reading.tailLoggedAt = -1;
    }
}

// Starts counting the folders not counted yet; true when the file must be read again for them.
bool Track(Reading& reading, const std::vector<std::string>& prefixes, const std::set<std::string>& expected) {
    std::vector<std::string> folders(expected.begin(), expected.end());
    for (const auto& prefix : prefixes) {
        if (!prefix.empty()) folders.push_back(FolderOf(prefix));
    }
    bool added = false;
    for (const auto& folder : folders) {
        if (reading.counts.count(folder) != 0) continue;
        if (reading.counts.size() >= kMaxFoldersPerQueue) {  // bounded: start over with these folders
            reading.counts.clear();
            reading.lengths.clear();
        }
        reading.counts.emplace(folder, 0);
        reading.lengths.insert(folder.size());
        added = true;
    }
    return added && reading.committed > 0;
}

// Calls `count` once for each counted folder that holds the record's path, or else its old path.
template <typename F>
void ForEachFolder(Reading& reading, const QueueRecord& record, F count) {
    static thread_local std::vector<Counts::iterator> matched;
    matched.clear();
    const auto match = [&](const std::string& path) {
        for (const size_t length : reading.lengths) {
            if (path.size() < length) break;
            if (path.size() > length && path[length] != '/') continue;
            const auto folder = reading.counts.find(std::string_view(path.data(), length));
            if (folder == reading.counts.end() || std::find(matched.begin(), matched.end(), folder) != matched.end()) continue;
            matched.push_back(folder);
            count(folder);
        }
    };
    match(record.path);
    if (record.event == kEventRename && !record.path_old.empty()) match(record.path_old);
}

void LogMalformed(const std::string& queueFile, const LineReader::Line& line, off_t offset) {
    if (line.overlong) {
        FILEIDX_LOG("Malformed command: too long, queue=%s, offset=%lld, length=%zu", queueFile.c_str(),
                    static_cast<long long>(offset), line.length);
    } else {
        FILEIDX_LOG("Malformed command: %.*s", static_cast<int>(line.length), line.begin);
    }
}

// Reads on from the offset read to. A last line without "\n" is counted into `tail` and
// `tailLines` for this answer only.
void CatchUp(Reading& reading, const std::string& queueFile, Counts& tail, unsigned long long& tailLines) {
    if (lseek(reading.fd, reading.committed, SEEK_SET) != reading.committed) return;
    LineReader lines(reading.fd, kMaxQueueLine);
    QueueRecordReader reader;
    QueueRecord record;
    LineReader::Line line;
    off_t terminatedBefore = 0;
    while (lines.Next(line)) {
        const bool terminated = lines.TerminatedBytes() > terminatedBefore;
        terminatedBefore = lines.TerminatedBytes();
        const off_t offset = reading.committed + line.offset;
        const bool wellFormed = !line.overlong && reader.Read(line.begin, line.end, record);
        if (terminated) {
            ++reading.lines;
            if (wellFormed) ForEachFolder(reading, record, [](Counts::iterator folder) { ++folder->second; });
            else if (offset >= reading.loggedUpTo) LogMalformed(queueFile, line, offset);
            continue;
        }
        ++tailLines;
        if (wellFormed) {
            ForEachFolder(reading, record, [&](Counts::iterator folder) { ++tail[folder->first]; });
        } else if (offset != reading.tailLoggedAt || line.length != reading.tailLoggedLength) {
            LogMalformed(queueFile, line, offset);
            reading.tailLoggedAt = offset;
            reading.tailLoggedLength = line.length;
        }
    }
    reading.committed += lines.TerminatedBytes();
    reading.loggedUpTo = std::max(reading.loggedUpTo, reading.committed);
    TakeSamples(reading);
}

}  // namespace

bool ReadQueue(const std::string& queueFile, const std::vector<std::string>& prefixes, QueueAnswer& answer) {
    answer = QueueAnswer();
    for (const auto& prefix : prefixes) answer.under[prefix] = 0;
    const std::set<std::string> expected = TakeExpected(queueFile);
    const int fd = OpenNoFollow(queueFile, O_RDONLY);
    struct stat st;
    if (fd < 0 || fstat(fd, &st) != 0) {
        const int reason = errno;
        if (fd >= 0) close(fd);
        errno = reason;
        return false;
    }
    const std::shared_ptr<Reading> reading = ReadingOf(fd, st);
    std::lock_guard<std::mutex> lock(reading->mutex);
    if (const char* refusal = QueueRefusal(st)) {
        if (reading->refusedSize != st.st_size) ReportRefusedQueue(queueFile, st, refusal);
        reading->refusedSize = st.st_size;
        answer.refused = true;
        return true;
    }
    reading->refusedSize = -1;
    if (st.st_size < reading->committed || !SamplesHold(*reading)) ReadAgain(*reading, true);
    if (Track(*reading, prefixes, expected)) ReadAgain(*reading, false);
    Counts tail;
    unsigned long long tailLines = 0;
    CatchUp(*reading, queueFile, tail, tailLines);
    answer.lines = reading->lines + tailLines;
    for (auto& [prefix, count] : answer.under) {
        if (prefix.empty()) continue;
        const std::string folder = FolderOf(prefix);
        const auto found = reading->counts.find(folder);
        const auto inTail = tail.find(folder);
        count = (found != reading->counts.end() ? found->second : 0) + (inTail != tail.end() ? inTail->second : 0);
    }
    return true;
}

void ExpectFolders(const std::string& queueFile, const std::vector<std::string>& prefixes) {
    std::lock_guard<std::mutex> lock(g_mutex);
    auto& expected = g_expected[queueFile];
    if (expected.size() + prefixes.size() > kMaxFoldersPerQueue) expected.clear();
    for (const auto& prefix : prefixes) {
        if (!prefix.empty()) expected.insert(FolderOf(prefix));
    }
}

void ForgetQueueReadings() {
    std::lock_guard<std::mutex> lock(g_mutex);
    g_readings.clear();
    g_expected.clear();
}

size_t QueueReadingsFootprint() {
    std::lock_guard<std::mutex> lock(g_mutex);
    size_t bytes = 0;
    for (const auto& entry : g_readings) {
        const Reading& reading = *entry.second;
        bytes += sizeof(Reading) + 64;  // the entry of the map of readings
        for (const auto& folder : reading.counts) bytes += folder.first.capacity() + 64;  // a map node
        bytes += reading.lengths.size() * 40;
        for (const auto& sample : reading.samples) bytes += sizeof(Sample) + sample.bytes.capacity();
    }
    return bytes;
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
