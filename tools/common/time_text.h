// Times as the tools print them.
#pragma once

#include <string>

namespace tools {

// "2026-11-22 05:42:17 UTC" in the local time zone; ISO 8601 in UTC ("2026-11-22T05:42:17Z").
std::string FormatLocalTime(long long epochSeconds);
std::string FormatUtc(long long epochSeconds);

}  // namespace tools
