#include "captured_log.h"
#include "commands.h"
#include "lock_retry.h"

namespace fileindexctl {

bool Context::Attempt(const std::function<bool()>& operation) {
    before_.emplace();
    return RetryWhileLocked(lockWait, [&] {
        tools::ClearCapturedLog();
        return operation();
    });
}

int Context::Fail(const std::string& operation) const {
    return out.Fail(operation, before_ ? before_->Changed() : std::vector<std::string>());
}

}  // namespace fileindexctl
