// Internals of the daemon command channel: the data objects of its commands, and the writer
// (exposed for tests).
#pragma once

#include <cstddef>
#include <string>

#include <json/value.h>

namespace QIRA {
namespace FILEINDEX {
namespace detail {

constexpr size_t kDaemonWriteChunk = 1024;

// {"share_name": share}: the data of "delete_share_worker" and "revive_share_worker".
Json::Value ShareNameData(const std::string& share);
// {"folder_path": path}: the data of "upsert_folder_setting" and "delete_folder_setting".
Json::Value FolderPathData(const std::string& path);

// Writes `size` bytes in pieces of at most 1024. A result of 0 fails unless errno is EINTR
// (three retries over the whole buffer); any other result, -1 included, counts as written.
// A -1 that would move before the start of the buffer ends the write as a failure.
bool WriteChunked(int fd, const char* data, size_t size);

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
