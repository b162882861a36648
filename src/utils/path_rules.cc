#include "path_rules.h"

#include <climits>

#include <json/value.h>

#include "fileindex/json.h"
#include "log.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {

bool NulFree(const std::string& value) {
    if (value.find('\0') == std::string::npos) return true;
    FILEIDX_LOG("Bad param: %s", toString(Json::Value(value)).c_str());
    ErrorHandler::SetError(FILEINDEX_ERR_BAD_PARAM);
    return false;
}

bool IsWithin(const std::string& path, const std::string& dir) {
    const size_t n = dir.size();
    // The boundary and the last byte first: siblings sharing a long prefix fail at once.
    if (path.size() < n || (path.size() > n && path[n] != '/') || (n > 0 && path[n - 1] != dir[n - 1])) return false;
    return path.compare(0, n, dir) == 0;
}

bool FitsPathMax(size_t length) { return length < PATH_MAX; }

bool IsCanonicalSharePath(const std::string& path) {
    if (path.empty() || path[0] != '/' || !FitsPathMax(path.size()) || path.find('\0') != std::string::npos) {
        return false;
    }
    size_t begin = 1;
    while (true) {
        const size_t end = path.find('/', begin);
        const size_t length = (end == std::string::npos ? path.size() : end) - begin;
        if (length == 0 || length > NAME_MAX) return false;
        if (path.compare(begin, length, ".") == 0 || path.compare(begin, length, "..") == 0) return false;
        if (end == std::string::npos) return true;
        begin = end + 1;
    }
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
