// The one owner of the root prefix: every fixed path, of the library and of the simulated
// platform, resolves through RootPrefix.
#include "root.h"

#include <cstdlib>

#include "fileindex/root.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

constexpr char kVariable[] = "QIRA_ROOT";

}  // namespace

std::string RootPrefix() {
#ifdef FILEINDEX_FIXED_PATHS
    return "";
#else
    const char* env = std::getenv(kVariable);
    std::string root = env ? env : "";
    while (!root.empty() && root.back() == '/') root.pop_back();
    return root;
#endif
}

bool UseRootPrefix(const std::string& root) {
#ifdef FILEINDEX_FIXED_PATHS
    (void)root;
    return false;
#else
    return setenv(kVariable, root.c_str(), 1) == 0;
#endif
}

std::string DaemonSocketPath() { return RootPrefix() + "/var/run/fileindexd.sock"; }

namespace detail {

std::string RootPath(const std::string& fixedPath) { return RootPrefix() + fixedPath; }

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
