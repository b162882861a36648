// GetFullPath for many share paths at once: each share is looked up once.
#pragma once

#include <map>
#include <string>
#include <utility>

namespace QIRA {
namespace FILEINDEX {
namespace detail {

class FullPathResolver {
public:
    // The same result, output, log lines and error code as GetFullPath(fullPath, path).
    bool Resolve(const std::string& path, std::string& fullPath);

private:
    std::map<std::string, std::pair<bool, std::string>> shares_;  // share -> (found, volume prefix)
};

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
