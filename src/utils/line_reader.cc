#include "line_reader.h"

#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace QIRA {
namespace FILEINDEX {
namespace detail {
namespace {

constexpr size_t kBlock = 256 * 1024;

}  // namespace

bool LineReader::Fill() {
    if (start_ > 0) {
        std::memmove(buffer_.data(), buffer_.data() + start_, filled_ - start_);
        bufferOffset_ += static_cast<off_t>(start_);
        filled_ -= start_;
        start_ = 0;
    }
    if (buffer_.size() < filled_ + kBlock + kPadding) buffer_.resize(filled_ + kBlock + kPadding);
    ssize_t got;
    do {
        got = read(fd_, buffer_.data() + filled_, kBlock);
    } while (got < 0 && errno == EINTR);
    if (got <= 0) {
        eof_ = true;
        return false;
    }
    filled_ += static_cast<size_t>(got);
    return true;
}

bool LineReader::Next(const char*& begin, const char*& end) {
    size_t searched = start_;
    while (true) {
        const void* newline = searched < filled_ ? std::memchr(buffer_.data() + searched, '\n', filled_ - searched) : nullptr;
        if (newline != nullptr) {
            const size_t at = static_cast<const char*>(newline) - buffer_.data();
            begin = buffer_.data() + start_;
            end = buffer_.data() + at;
            start_ = at + 1;
            terminated_ = bufferOffset_ + static_cast<off_t>(start_);
            return true;
        }
        if (eof_) break;
        searched = filled_ - start_;  // offsets below shift to the front in Fill
        if (!Fill()) break;
    }
    if (start_ >= filled_) return false;
    begin = buffer_.data() + start_;
    end = buffer_.data() + filled_;
    start_ = filled_;
    return true;
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
