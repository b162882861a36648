// How fast the pending files drain, from the counts the console saw at its status answers.
#pragma once

#include <chrono>
#include <deque>
#include <mutex>
#include <utility>

namespace tools {

class PendingRate {
public:
    using Clock = std::chrono::steady_clock;

    // Notes the count seen now and answers the files drained per second since the newest
    // sample at least a minute old (or the oldest one); 0 while there is no drain to measure, or
    // less than a second of it. New work restarts the measure, so that a
    // burst of arrivals never reads as a negative rate.
    double Update(unsigned long long pending, Clock::time_point now = Clock::now());

private:
    std::mutex mutex_;
    std::deque<std::pair<Clock::time_point, unsigned long long>> samples_;
};

}  // namespace tools
