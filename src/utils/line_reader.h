// Reading a file line by line in large blocks, keeping no more than the longest line in memory.
#pragma once

#include <sys/types.h>

#include <cstddef>
#include <vector>

namespace QIRA {
namespace FILEINDEX {
namespace detail {

class LineReader {
public:
    // Readable bytes that always follow a returned line (simdjson reads past the end it is given).
    static constexpr size_t kPadding = 64;

    // Reads `fd` from its current offset; the descriptor stays the caller's.
    explicit LineReader(int fd) : fd_(fd) {}

    // The next line without its "\n" (a last line without one counts too); false at the end of
    // the file or on a read error. The bytes stay valid until the next call.
    bool Next(const char*& begin, const char*& end);

    // Bytes of the file up to and including the last "\n" returned so far.
    off_t TerminatedBytes() const { return terminated_; }

private:
    bool Fill();

    int fd_;
    std::vector<char> buffer_;
    size_t start_ = 0;     // first unread byte in buffer_
    size_t filled_ = 0;    // bytes of buffer_ holding file data
    off_t bufferOffset_ = 0;  // file offset of buffer_[0], relative to where reading began
    off_t terminated_ = 0;
    bool eof_ = false;
};

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
