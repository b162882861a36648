// Reading a file line by line in large blocks. A line longer than the reader's limit is never
// held in memory: it is skipped to its newline and reported by its offset and length only, so
// memory stays bounded by the limit and one block whatever the file holds.
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

    struct Line {
        const char* begin = nullptr;  // the bytes without the "\n"; null for an overlong line
        const char* end = nullptr;
        off_t offset = 0;             // of the first byte, from where reading began
        size_t length = 0;            // without the "\n"
        bool overlong = false;        // longer than the limit: skipped, not held
    };

    // Reads `fd` from its current offset; the descriptor stays the caller's.
    LineReader(int fd, size_t maxLine) : fd_(fd), maxLine_(maxLine) {}
    // Reads the bytes [from, until) of `fd` with pread, leaving its offset alone, so that several
    // readers can share one descriptor; offsets stay relative to `from`.
    LineReader(int fd, size_t maxLine, off_t from, off_t until)
        : fd_(fd), maxLine_(maxLine), position_(from), until_(until) {}

    // The next line (a last line without "\n" counts too); false at the end of the file or on a
    // read error. The bytes stay valid until the next call.
    bool Next(Line& line);

    // Bytes of the file up to and including the last "\n" returned so far.
    off_t TerminatedBytes() const { return terminated_; }

private:
    bool Fill();
    ssize_t ReadBlock(char* into);
    bool Take(size_t end, bool terminated, Line& line);
    bool SkipOverlong(Line& line);

    int fd_;
    size_t maxLine_;
    std::vector<char> buffer_;
    size_t start_ = 0;        // first unread byte in buffer_
    size_t filled_ = 0;       // bytes of buffer_ holding file data
    off_t bufferOffset_ = 0;  // file offset of buffer_[0], relative to where reading began
    off_t terminated_ = 0;
    bool eof_ = false;
    off_t position_ = -1;  // next offset to pread in a range; -1 reads on from the descriptor's offset
    off_t until_ = -1;
};

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
