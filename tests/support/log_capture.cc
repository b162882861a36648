#include "log_capture.h"

#include <syslog.h>

#include <algorithm>
#include <cstdarg>
#include <cstdio>
#include <regex>

namespace testkit {
namespace {

std::vector<LogLine>& Lines() {
    static std::vector<LogLine> lines;
    return lines;
}

}  // namespace

const std::vector<LogLine>& LogLines() { return Lines(); }

std::vector<std::string> LogMessages() {
    std::vector<std::string> messages;
    for (const auto& line : Lines()) messages.push_back(line.message);
    return messages;
}

void ClearLog() { Lines().clear(); }

bool Logged(const std::string& message) {
    return std::any_of(Lines().begin(), Lines().end(), [&](const LogLine& line) { return line.message == message; });
}

void Record(int priority, const std::string& text) {
    static const std::regex form(R"(^([A-Za-z0-9_.]+):(\d+) ([\s\S]*)$)");
    std::smatch match;
    if (std::regex_match(text, match, form)) {
        Lines().push_back({priority, match[1], match[3]});
    } else {
        Lines().push_back({priority, "", "<no file:line prefix> " + text});
    }
}

}  // namespace testkit

// Every line the library sends to the system log lands here instead.
extern "C" void syslog(int priority, const char* format, ...) {
    char buffer[8192];
    va_list args;
    va_start(args, format);
    vsnprintf(buffer, sizeof buffer, format, args);
    va_end(args);
    testkit::Record(priority, buffer);
}
