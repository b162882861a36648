// Captures the library's syslog lines in this process (syslog is interposed by the test binary).
#pragma once

#include <string>
#include <vector>

namespace testkit {

struct LogLine {
    int priority;
    std::string source;   // e.g. "config.cc"
    std::string message;  // the text after "file:line "
};

const std::vector<LogLine>& LogLines();
std::vector<std::string> LogMessages();
void ClearLog();
bool Logged(const std::string& message);

}  // namespace testkit
