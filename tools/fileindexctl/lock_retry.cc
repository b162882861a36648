#include "lock_retry.h"

#include <chrono>
#include <random>
#include <thread>

#include "fileindex/error.h"

namespace fileindexctl {

bool RetryWhileLocked(double seconds, const std::function<bool()>& operation) {
    using namespace QIRA::FILEINDEX;
    using Clock = std::chrono::steady_clock;
    const auto deadline = Clock::now() + std::chrono::duration<double>(seconds);
    std::minstd_rand jitter(std::random_device{}());
    while (true) {
        ErrorHandler::SetError(FILEINDEX_ERR_NONE);
        if (operation()) return true;
        if (ErrorHandler::GetError() != FILEINDEX_ERR_LOCK || Clock::now() >= deadline) return false;
        // Spread the retries of several waiting writers so that they do not collide again.
        std::this_thread::sleep_for(std::chrono::milliseconds(10 + jitter() % 40));
    }
}

}  // namespace fileindexctl
