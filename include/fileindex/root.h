// Where the library's fixed paths (folder.conf, status.conf, the lock files, the daemon socket,
// the notifier) lie: under a root prefix, so that a simulated appliance can live in any directory
// and several can run side by side. The appliance build has none and uses the fixed paths.
#pragma once

#include <string>

#include "fileindex/export.h"

namespace QIRA {
namespace FILEINDEX {

// The prefix in force: QIRA_ROOT without trailing slashes; "" for the real root and always in
// the appliance build.
FILEINDEX_EXPORT std::string RootPrefix();

// Makes `root` the prefix for this process (the simulated platform in it included). False, and
// nothing changed, in the appliance build.
FILEINDEX_EXPORT bool UseRootPrefix(const std::string& root);

// The indexing daemon's socket, "/var/run/fileindexd.sock" under the prefix.
FILEINDEX_EXPORT std::string DaemonSocketPath();

}  // namespace FILEINDEX
}  // namespace QIRA
