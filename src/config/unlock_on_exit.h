// Releases a configuration lock on every way out of a scope.
#pragma once

#include "fileindex/config.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {

class UnlockOnExit {
public:
    explicit UnlockOnExit(Config& config) : config_(config) {}
    ~UnlockOnExit() { config_.Unlock(); }
    UnlockOnExit(const UnlockOnExit&) = delete;
    UnlockOnExit& operator=(const UnlockOnExit&) = delete;

private:
    Config& config_;
};

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
