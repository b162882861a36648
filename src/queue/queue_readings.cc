#include "queue_readings.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <limits>
#include <map>
#include <memory>
#include <mutex>
#include <set>
#include <string_view>
#include <system_error>
#include <thread>

#include "ea_dir.h"
#include "fileindex/file_changes.h"
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

using Counts = std::map<std::string, Tally, std::less<>>;  // folder full path -> its records and files

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
    Tally all;
    FileChanges changes;
    Counts counts;
    std::set<size_t> lengths;  // of the folder paths in `counts`
    // The last question's prefixes and each one's entry in `counts` (end() for ""): a host that
    // asks the same again finds its counters without a look-up.
    std::vector<std::string> asked;
    std::vector<Counts::iterator> slots;
    std::vector<Sample> samples;
    off_t refusedSize = -1;  // the size a refusal was logged for
    off_t tailLoggedAt = -1;
    size_t tailLoggedLength = 0;
    unsigned long long lastUse = 0;
};

using Key = std::pair<dev_t, ino_t>;

std::mutex g_mutex;
std::map<Key, std::shared_ptr<Reading>> g_readings;
unsigned long long g_uses = 0;


bool Removed(const Reading& reading) {
    struct stat st;
    return fstat(reading.fd, &st) != 0 || st.st_nlink == 0;
}

// Closes the files that were removed, so that their space is freed: at most once a second.
void DropRemovedFiles() {
    static std::chrono::steady_clock::time_point last;
    const auto now = std::chrono::steady_clock::now();
    if (now - last < std::chrono::seconds(1)) return;
    last = now;
    for (auto it = g_readings.begin(); it != g_readings.end();) {
        it = Removed(*it->second) ? g_readings.erase(it) : std::next(it);
    }
}

// The reading of the file open as `fd`, made when the file is new to the process; takes `fd` over.
std::shared_ptr<Reading> ReadingOf(int fd, const struct stat& st) {
    std::lock_guard<std::mutex> lock(g_mutex);
    DropRemovedFiles();
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
    reading.all = Tally();
    reading.changes = FileChanges();
    for (auto& entry : reading.counts) entry.second = Tally();
    reading.samples.clear();
    if (rewritten) {
        reading.loggedUpTo = 0;
        reading.tailLoggedAt = -1;
    }
}

std::string_view FolderOf(const std::string& prefix) { return std::string_view(prefix).substr(0, prefix.size() - 1); }

// Starts counting the folders of this question not counted yet and points `slots` at each
// prefix's counter; true when the file must be read again for new folders. Past
// kMaxFoldersPerQueue only this question's folders are kept.
bool Track(Reading& reading, const std::vector<std::string>& prefixes) {
    if (prefixes == reading.asked) return false;
    std::vector<std::string_view> missing;
    for (const auto& prefix : prefixes) {
        if (!prefix.empty() && reading.counts.find(FolderOf(prefix)) == reading.counts.end()) missing.push_back(FolderOf(prefix));
    }
    if (reading.counts.size() + missing.size() > kMaxFoldersPerQueue) {
        reading.counts.clear();
        reading.lengths.clear();
        missing.clear();
        for (const auto& prefix : prefixes) {
            if (!prefix.empty()) missing.push_back(FolderOf(prefix));
        }
    }
    for (const auto folder : missing) {
        reading.counts.emplace(folder, Tally());
        reading.lengths.insert(folder.size());
    }
    reading.asked = prefixes;
    reading.slots.clear();
    for (const auto& prefix : prefixes) {
        reading.slots.push_back(prefix.empty() ? reading.counts.end() : reading.counts.find(FolderOf(prefix)));
    }
    return !missing.empty() && reading.committed > 0;
}

// Calls `count` once for each folder of `counts` that holds the record's path, or else its old
// path; `lengths` are those of the folders' paths.
template <typename F>
void ForEachFolder(const std::set<size_t>& lengths, Counts& counts, const QueueRecord& record, F count) {
    static thread_local std::vector<Counts::iterator> matched;
    matched.clear();
    const auto match = [&](const std::string& path) {
        for (const size_t length : lengths) {
            if (path.size() < length) break;
            if (path.size() > length && path[length] != '/') continue;
            const auto folder = counts.find(std::string_view(path.data(), length));
            if (folder == counts.end() || std::find(matched.begin(), matched.end(), folder) != matched.end()) continue;
            matched.push_back(folder);
            count(folder);
        }
    };
    match(record.path);
    if (record.event == kEventRename && !record.path_old.empty()) match(record.path_old);
}

void Add(Tally& to, const Tally& from) {
    to.records += from.records;
    to.files += from.files;
}

// Counts a well-formed record in `all` and in the tally `into` gives for each folder of `counts`
// that holds it; the file too when `changes` finds it new.
template <typename Into>
void CountRecord(const std::set<size_t>& lengths, Counts& counts, const QueueRecord& record, FileChanges& changes,
                 Tally& all, Into into) {
    const Tally one{1, changes.IsNewFile(record.path) ? 1u : 0u};
    Add(all, one);
    ForEachFolder(lengths, counts, record, [&](Counts::iterator folder) { Add(into(folder), one); });
}

Tally& InPlace(Counts::iterator folder) { return folder->second; }

void LogMalformed(const std::string& queueFile, const char* text, off_t offset, size_t length) {
    if (text == nullptr) {
        FILEIDX_LOG("Malformed command: too long, queue=%s, offset=%lld, length=%zu", queueFile.c_str(),
                    static_cast<long long>(offset), length);
    } else {
        FILEIDX_LOG("Malformed command: %.*s", static_cast<int>(length), text);
    }
}

// The same for a line found by another thread, read again from the file.
void LogMalformedAt(int fd, const std::string& queueFile, off_t offset, size_t length) {
    if (length > kMaxQueueLine) return LogMalformed(queueFile, nullptr, offset, length);
    std::string text(length, '\0');
    const ssize_t got = length == 0 ? 0 : pread(fd, &text[0], length, offset);
    LogMalformed(queueFile, text.data(), offset, got < 0 ? 0 : static_cast<size_t>(got));
}

// Calls take(line, offset, terminated, wellFormed, record) for each line of `lines`, which begins
// at file offset `base`, until it returns false (the line not taken); the bytes up to the last
// "\n" taken.
template <typename Take>
off_t EachLine(LineReader& lines, off_t base, bool parse, Take take) {
    QueueRecordReader reader;
    QueueRecord record;
    LineReader::Line line;
    off_t terminatedBefore = 0;
    while (lines.Next(line)) {
        const bool terminated = lines.TerminatedBytes() > terminatedBefore;
        const bool wellFormed = parse && !line.overlong && reader.Read(line.begin, line.end, record);
        if (!take(line, base + line.offset, terminated, wellFormed, record)) break;
        terminatedBefore = lines.TerminatedBytes();
    }
    return terminatedBefore;
}

// Reads on from the offset read to, up to `until`, counting lines (and, when `parse`, records
// and malformed lines). A last line without "\n" goes to `tail`, `tailAll` and `tailLines`, for this
// answer only.
void ReadOn(Reading& reading, const std::string& queueFile, off_t until, bool parse, Counts& tail, Tally& tailAll,
            unsigned long long& tailLines) {
    LineReader lines(reading.fd, kMaxQueueLine, reading.committed, until);
    const auto take = [&](const LineReader::Line& line, off_t offset, bool terminated, bool wellFormed,
                          const QueueRecord& record) {
        const char* text = line.overlong ? nullptr : line.begin;
        if (terminated) {
            ++reading.lines;
            if (wellFormed) CountRecord(reading.lengths, reading.counts, record, reading.changes, reading.all, InPlace);
            else if (parse && offset >= reading.loggedUpTo) LogMalformed(queueFile, text, offset, line.length);
            return true;
        }
        ++tailLines;
        if (wellFormed) {
            FileChanges changes = reading.changes;  // the line may be completed: not remembered
            CountRecord(reading.lengths, reading.counts, record, changes, tailAll,
                        [&](Counts::iterator folder) -> Tally& { return tail[folder->first]; });
        } else if (parse && (offset != reading.tailLoggedAt || line.length != reading.tailLoggedLength)) {
            LogMalformed(queueFile, text, offset, line.length);
            reading.tailLoggedAt = offset;
            reading.tailLoggedLength = line.length;
        }
        return true;
    };
    reading.committed += EachLine(lines, reading.committed, parse, take);
}

// A long stretch is read by two threads: this one from the start, a helper from a line start
// near the middle. The helper keeps what it found apart, and the malformed lines' places only
// (at most kMaxHeldMalformed, where it stops), so that this thread logs and adds them in order.
constexpr off_t kSplitFrom = off_t{16} << 20;
constexpr size_t kMaxHeldMalformed = 16384;

struct Part {
    off_t begin = 0;
    off_t end = 0;
    off_t stoppedAt = 0;  // the first byte not taken: a line start
    unsigned long long lines = 0;
    Tally all;
    FileChanges changes;
    Counts counts;        // the reading's folders
    std::vector<std::pair<off_t, size_t>> malformed;  // offset and length
};

// The start of the first line after the middle of [from, size); -1 when the stretch is short or
// no "\n" lies within a line's length of the middle.
off_t SplitPoint(int fd, off_t from, off_t size) {
    if (size - from < kSplitFrom || std::thread::hardware_concurrency() < 2) return -1;
    char block[4096];
    const off_t middle = from + (size - from) / 2;
    for (off_t at = middle; at < size && at - middle <= static_cast<off_t>(kMaxQueueLine);) {
        const ssize_t got = pread(fd, block, sizeof block, at);
        if (got <= 0) return -1;
        const void* newline = std::memchr(block, '\n', static_cast<size_t>(got));
        if (newline != nullptr) {
            const off_t split = at + (static_cast<const char*>(newline) - block) + 1;
            return split < size ? split : -1;
        }
        at += got;
    }
    return -1;
}

void ReadPart(const Reading& reading, Part& part) {
    LineReader lines(reading.fd, kMaxQueueLine, part.begin, part.end);
    const auto take = [&](const LineReader::Line& line, off_t offset, bool terminated, bool wellFormed,
                          const QueueRecord& record) {
        // Not taken: a last line without "\n", or a malformed line past what may be held.
        if (!terminated || (!wellFormed && part.malformed.size() >= kMaxHeldMalformed)) return false;
        ++part.lines;
        if (wellFormed) CountRecord(reading.lengths, part.counts, record, part.changes, part.all, InPlace);
        else part.malformed.emplace_back(offset, line.length);
        return true;
    };
    part.stoppedAt = part.begin + EachLine(lines, part.begin, true, take);
}

void TakePart(Reading& reading, const std::string& queueFile, const Part& part) {
    for (const auto& [offset, length] : part.malformed) {
        if (offset >= reading.loggedUpTo) LogMalformedAt(reading.fd, queueFile, offset, length);
    }
    reading.lines += part.lines;
    Add(reading.all, part.all);
    reading.changes = part.changes;
    auto theirs = part.counts.begin();
    for (auto& mine : reading.counts) Add(mine.second, (theirs++)->second);  // the same folders, in order
    reading.committed = part.stoppedAt;
}

// Reads what was appended since the last reading (all of the file the first time): counting lines
// only until a folder is asked about, so that malformed lines are logged when first parsed.
void CatchUp(Reading& reading, const std::string& queueFile, off_t size, Counts& tail, Tally& tailAll,
             unsigned long long& tailLines) {
    constexpr off_t kToTheEnd = std::numeric_limits<off_t>::max();
    const bool parse = !reading.counts.empty();
    Part part;
    part.begin = parse ? SplitPoint(reading.fd, reading.committed, size) : -1;
    std::thread helper;
    if (part.begin > 0) {
        part.end = size;
        part.counts = reading.counts;
        for (auto& entry : part.counts) entry.second = Tally();
        try {
            helper = std::thread([&] { ReadPart(reading, part); });
        } catch (const std::system_error&) {
            part.begin = -1;
        }
    }
    ReadOn(reading, queueFile, helper.joinable() ? part.begin : kToTheEnd, parse, tail, tailAll, tailLines);
    if (helper.joinable()) {
        helper.join();
        if (reading.committed == part.begin) {
            TakePart(reading, queueFile, part);
            ReadOn(reading, queueFile, kToTheEnd, parse, tail, tailAll, tailLines);
        }
    }
    if (parse) reading.loggedUpTo = std::max(reading.loggedUpTo, reading.committed);
    TakeSamples(reading);
}

}  // namespace

bool ReadQueue(const std::string& queueFile, const std::vector<std::string>& prefixes, QueueAnswer& answer) {
    answer = QueueAnswer();
    answer.under.assign(prefixes.size(), Tally());
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
    if (Track(*reading, prefixes)) ReadAgain(*reading, false);
    Counts tail;
    Tally tailAll;
    unsigned long long tailLines = 0;
    CatchUp(*reading, queueFile, st.st_size, tail, tailAll, tailLines);
    answer.lines = reading->lines + tailLines;
    answer.all = reading->all;
    Add(answer.all, tailAll);
    for (size_t i = 0; i < prefixes.size(); ++i) {
        const Counts::iterator slot = reading->slots[i];
        if (slot == reading->counts.end()) continue;
        const auto inTail = tail.empty() ? tail.end() : tail.find(slot->first);
        answer.under[i] = slot->second;
        if (inTail != tail.end()) Add(answer.under[i], inTail->second);
    }
    return true;
}

void ForgetQueueReadings() {
    std::lock_guard<std::mutex> lock(g_mutex);
    g_readings.clear();
}

size_t QueueReadingsFootprint() {
    std::lock_guard<std::mutex> lock(g_mutex);
    size_t bytes = 0;
    for (const auto& entry : g_readings) {
        const Reading& reading = *entry.second;
        bytes += sizeof(Reading) + 64;  // the entry of the map of readings
        for (const auto& folder : reading.counts) bytes += folder.first.capacity() + 64;  // a map node
        bytes += reading.lengths.size() * 40;
        for (const auto& prefix : reading.asked) bytes += prefix.capacity() + sizeof(prefix) + sizeof(Counts::iterator);
        for (const auto& sample : reading.samples) bytes += sizeof(Sample) + sample.bytes.capacity();
    }
    return bytes;
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
