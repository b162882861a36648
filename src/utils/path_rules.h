// What the library accepts as a share path or a share name before anything reaches the platform.
#pragma once

#include <string>

namespace QIRA {
namespace FILEINDEX {
namespace detail {

// True when `value` holds no NUL byte. Otherwise logs "Bad param: <value as JSON>", sets error 1
// and returns false: the platform would see the value cut at the NUL, the library all of it.
bool NulFree(const std::string& value);

// "/share/dir...": no NUL, no empty, "." or ".." component, no trailing "/", each component
// within NAME_MAX and the whole within PATH_MAX.
bool IsCanonicalSharePath(const std::string& path);

// The containment rule of every path comparison: `path` + "/" starts with `dir` + "/", so a
// directory holds itself and what lies beneath it, not a sibling sharing a name prefix. An
// empty `dir` holds every absolute path.
bool IsWithin(const std::string& path, const std::string& dir);

// True when a full path of `length` bytes fits the system's path length.
bool FitsPathMax(size_t length);

// The full path of the share path `path` in share `shareName`, without logging or setting the
// error code; false when the share is unknown.
bool ShareFullPath(const std::string& shareName, const std::string& path, std::string& fullPath);

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
