#include "line_reader.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

namespace QIRA {
namespace FILEINDEX {
namespace detail {
namespace {

constexpr size_t kBlock = 256 * 1024;

}  // namespace

ssize_t LineReader::ReadBlock(char* into) {
    ssize_t got;
    if (position_ < 0) {
        do {
            got = read(fd_, into, kBlock);
        } while (got < 0 && errno == EINTR);
        return got;
    }
    const size_t want = static_cast<size_t>(std::min<off_t>(static_cast<off_t>(kBlock), until_ - position_));
    if (want == 0) return 0;
    do {
        got = pread(fd_, into, want, position_);
    } while (got < 0 && errno == EINTR);
    if (got > 0) position_ += got;
    return got;
}

// Drops the bytes already returned, keeps the partial line at the front and reads one block.
bool LineReader::Fill() {
    if (start_ > 0) {
        std::memmove(buffer_.data(), buffer_.data() + start_, filled_ - start_);
        bufferOffset_ += static_cast<off_t>(start_);
        filled_ -= start_;
        start_ = 0;
    }
    if (buffer_.size() < filled_ + kBlock + kPadding) buffer_.resize(filled_ + kBlock + kPadding);
    const ssize_t got = ReadBlock(buffer_.data() + filled_);
    if (got <= 0) {
        eof_ = true;
        return false;
    }
    filled_ += static_cast<size_t>(got);
    return true;
}

// The line from start_ to `end` (a "\n" when `terminated`, else the end of the data).
bool LineReader::Take(size_t end, bool terminated, Line& line) {
    line.offset = bufferOffset_ + static_cast<off_t>(start_);
    line.length = end - start_;
    line.overlong = line.length > maxLine_;
    line.begin = line.overlong ? nullptr : buffer_.data() + start_;
    line.end = line.overlong ? nullptr : buffer_.data() + end;
    start_ = terminated ? end + 1 : end;
    if (terminated) terminated_ = bufferOffset_ + static_cast<off_t>(start_);
    return true;
}

// The partial line has outgrown the limit: read on to its newline holding one block at a time.
bool LineReader::SkipOverlong(Line& line) {
    line = Line();
    line.offset = bufferOffset_ + static_cast<off_t>(start_);
    line.overlong = true;
    size_t length = filled_ - start_;
    start_ = filled_;
    while (Fill()) {
        const void* newline = std::memchr(buffer_.data(), '\n', filled_);
        if (newline != nullptr) {
            const size_t at = static_cast<size_t>(static_cast<const char*>(newline) - buffer_.data());
            line.length = length + at;
            start_ = at + 1;
            terminated_ = bufferOffset_ + static_cast<off_t>(start_);
            return true;
        }
        length += filled_;
        start_ = filled_;
    }
    line.length = length;  // it ends with the file
    return true;
}

bool LineReader::Next(Line& line) {
    size_t searched = start_;
    while (true) {
        const void* newline = searched < filled_ ? std::memchr(buffer_.data() + searched, '\n', filled_ - searched) : nullptr;
        if (newline != nullptr) return Take(static_cast<size_t>(static_cast<const char*>(newline) - buffer_.data()), true, line);
        if (filled_ - start_ > maxLine_) return SkipOverlong(line);
        if (eof_) break;
        searched = filled_ - start_;  // offsets below shift to the front in Fill
        if (!Fill()) break;
    }
    if (start_ >= filled_) return false;
    return Take(filled_, false, line);
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
