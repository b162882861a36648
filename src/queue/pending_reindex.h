// Pending reindex records (65536) for a set of full paths, read from each queue file once and
// then only as far as the file has grown, so that one operation queueing many events reads each
// queue once. Every answer is the one a full reading of the file at that moment would give.
#pragma once

#include <sys/types.h>

#include <map>
#include <memory>
#include <set>
#include <string>
#include <string_view>
#include <unordered_set>
#include <vector>

namespace QIRA {
namespace FILEINDEX {
namespace detail {

class PendingReindex {
public:
    explicit PendingReindex(const std::vector<std::string>& paths);
    ~PendingReindex();
    PendingReindex(const PendingReindex&) = delete;
    PendingReindex& operator=(const PendingReindex&) = delete;

    // True when `queueFile` holds a reindex record for exactly the full path `path`. A file that
    // exists but cannot be opened logs "Failed to open queue=%s, reason=%m" and answers false; so
    // does one that is refused for reading (sparse or oversized), whose share is then marked.
    bool IsQueued(const std::string& path, const std::string& queueFile);

private:
    // The file read is kept open, so that its inode cannot be reused by a new queue file that
    // would then pass for it.
    struct FileState {
        int fd = -1;
        dev_t dev = 0;
        ino_t ino = 0;
        off_t scanned = 0;       // bytes read up to the last complete line
        std::string tail;        // the last bytes read, to notice a file rewritten in place
        std::set<std::string> queued;
    };

    void Watch(const std::string& path);
    // Reads the lines of `fd` from `state.scanned` on, or all of it when the file is not the one
    // read; takes ownership of `fd`.
    void CatchUp(int fd, FileState& state);
    void Forget();
    bool MayCarryWantedPath(const char* begin, const char* end) const;

    std::vector<std::unique_ptr<std::string>> owned_;
    std::unordered_set<std::string_view> wanted_;
    std::map<std::string, FileState> files_;
};

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
