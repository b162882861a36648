// Pieces shared by the index manager's operations.
#pragma once

#include <string>

#include "fileindex/config.h"
#include "log.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {

// Releases a configuration lock on every way out of a scope.
class UnlockOnExit {
public:
    explicit UnlockOnExit(Config& config) : config_(config) {}
    ~UnlockOnExit() { config_.Unlock(); }
    UnlockOnExit(const UnlockOnExit&) = delete;
    UnlockOnExit& operator=(const UnlockOnExit&) = delete;

private:
    Config& config_;
};

// The last indexed folder is gone: stop fileindexd, switch Spotlight off and restart samba when
// it was on. Failures are logged only.
void StopIndexingServices();

Json::Value FolderPathData(const std::string& path);

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
