#include "pause.h"

#include <cstdint>
#include <ctime>
#include <limits>

#include "time_text.h"

namespace tools {

Json::Value PauseState(long long resumeTime) {
    Json::Value pause(Json::objectValue);
    pause["paused"] = resumeTime == 0 || (resumeTime > 0 && time(nullptr) < resumeTime);
    pause["resume_time"] = static_cast<Json::Int64>(resumeTime);
    pause["resume_time_utc"] = resumeTime > 0 ? Json::Value(FormatUtc(resumeTime)) : Json::Value();
    return pause;
}

bool PauseEndFits(long long hours) {
    const long long last = std::numeric_limits<int32_t>::max();
    return hours >= 0 && hours <= (last - static_cast<long long>(time(nullptr))) / 3600;
}

}  // namespace tools
