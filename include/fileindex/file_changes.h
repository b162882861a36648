// Files rather than queue records: a new file is queued as created and then written, and a file
// written in steps once per step. A record whose path is among the last kRecentFiles paths seen
// is one more change of a file already counted, so that a burst counts each file once; changes
// of one file further apart count again. The progress report and the daemon's published progress
// count with it alike, so that what the daemon has applied can be taken from what is pending.
#pragma once

#include <array>
#include <cstddef>
#include <string>

#include "fileindex/export.h"

namespace QIRA {
namespace FILEINDEX {

class FILEINDEX_EXPORT FileChanges {
public:
    static constexpr size_t kRecentFiles = 16;

    // True when `path` is none of the recent paths, which it then joins (the oldest leaving).
    // Paths are kept as hashes: a few bytes whatever their length.
    bool IsNewFile(const std::string& path);

private:
    std::array<size_t, kRecentFiles> recent_{};
    size_t held_ = 0;
};

}  // namespace FILEINDEX
}  // namespace QIRA
