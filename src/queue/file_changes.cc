#include "fileindex/file_changes.h"

#include <algorithm>
#include <functional>

namespace QIRA {
namespace FILEINDEX {

bool FileChanges::IsNewFile(const std::string& path) {
    const size_t hash = std::hash<std::string>()(path);
    const auto end = recent_.begin() + static_cast<std::ptrdiff_t>(std::min(held_, kRecentFiles));
    if (std::find(recent_.begin(), end, hash) != end) return false;
    recent_[held_++ % kRecentFiles] = hash;
    return true;
}

}  // namespace FILEINDEX
}  // namespace QIRA
