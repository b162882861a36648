#include "full_path_resolver.h"

#include "fileindex/error.h"
#include "fileindex/utils.h"
#include "path_rules.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {

bool FullPathResolver::Resolve(const std::string& path, std::string& fullPath) {
    std::string share;
    if (path.find('\0') != std::string::npos || !GetShareNameByPath(share, path)) return GetFullPath(fullPath, path);
    auto found = shares_.find(share);
    if (found == shares_.end()) {
        std::string volume;
        const bool known = ShareFullPath(share, "", volume);
        found = shares_.emplace(share, std::make_pair(known, volume)).first;
    }
    if (!found->second.first) {
        ErrorHandler::SetError(FILEINDEX_ERR_PATH);
        return false;
    }
    fullPath = found->second.second + path;
    return true;
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
