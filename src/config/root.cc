#include "root.h"

#include <cstdlib>

namespace QIRA {
namespace FILEINDEX {
namespace detail {

std::string RootPath(const std::string& fixedPath) {
    const char* env = std::getenv("QIRA_ROOT");
    std::string root = env ? env : "";
    while (!root.empty() && root.back() == '/') root.pop_back();
    return root + fixedPath;
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
