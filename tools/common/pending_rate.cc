#include "pending_rate.h"

namespace tools {
namespace {

constexpr std::chrono::seconds kWindow{60};
constexpr std::chrono::seconds kShortest{1};

}  // namespace

double PendingRate::Update(unsigned long long pending, Clock::time_point now) {
    std::lock_guard<std::mutex> lock(mutex_);
    if (!samples_.empty() && pending > samples_.back().second) samples_.clear();
    samples_.emplace_back(now, pending);
    // The oldest sample kept is the newest one at least a window old.
    while (samples_.size() > 2 && now - samples_[1].first >= kWindow) samples_.pop_front();
    const auto& [since, before] = samples_.front();
    const double seconds = std::chrono::duration<double>(now - since).count();
    if (seconds < std::chrono::duration<double>(kShortest).count() || before <= pending) return 0;
    return static_cast<double>(before - pending) / seconds;
}

}  // namespace tools
