// Internals of the daemon command channel, exposed for tests.
#pragma once

#include <cstddef>
#include <string>

namespace QIRA {
namespace FILEINDEX {
namespace detail {

constexpr size_t kDaemonWriteChunk = 1024;


// Writes `size` bytes in pieces of at most 1024. A result of 0 fails unless errno is EINTR
// (three retries over the whole buffer); any other result, -1 included, counts as written.
// A -1 that would move before the start of the buffer ends the write as a failure.
bool WriteChunked(int fd, const char* data, size_t size);

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
