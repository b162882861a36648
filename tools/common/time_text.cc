#include "time_text.h"

#include <ctime>
#include <string>

namespace tools {
namespace {

std::string FormatTime(long long epochSeconds, struct tm* (*convert)(const time_t*, struct tm*), const char* format) {
    const time_t when = static_cast<time_t>(epochSeconds);
    struct tm broken;
    if (convert(&when, &broken) == nullptr) return std::to_string(epochSeconds);
    char buffer[64];
    strftime(buffer, sizeof buffer, format, &broken);
    return buffer;
}

}  // namespace

std::string FormatLocalTime(long long epochSeconds) { return FormatTime(epochSeconds, localtime_r, "%Y-%m-%d %H:%M:%S %Z"); }

std::string FormatUtc(long long epochSeconds) { return FormatTime(epochSeconds, gmtime_r, "%Y-%m-%dT%H:%M:%SZ"); }

}  // namespace tools
