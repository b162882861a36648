// The pause state as the tools show it, and the pauses they accept.
#pragma once

#include <string>

#include <json/value.h>

namespace tools {

// {"paused", "resume_time" (epoch seconds; 0 = until resumed, -1 = running), "resume_time_utc"
// (ISO-8601, null when there is no end)}.
Json::Value PauseState(long long resumeTime);

// True when a pause of `hours` (0 or more) ends before the 32-bit resume time wraps
// (2038-01-19 03:14:07 UTC); the library would store a wrapped time that reads as running.
bool PauseEndFits(long long hours);

}  // namespace tools
