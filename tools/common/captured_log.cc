#include "captured_log.h"

#include <syslog.h>

#include <cstdarg>
#include <cstdio>

namespace tools {
namespace {

std::vector<std::string>& Lines() {
    static std::vector<std::string> lines;
    return lines;
}

}  // namespace

const std::vector<std::string>& CapturedLog() { return Lines(); }

void ClearCapturedLog() { Lines().clear(); }

}  // namespace tools

// Takes the place of libc's syslog for the library loaded into this process.
extern "C" void syslog(int priority, const char* format, ...) {
    va_list args;
    va_start(args, format);
    va_list copy;
    va_copy(copy, args);
    char line[8192];
    vsnprintf(line, sizeof line, format, args);
    tools::Lines().push_back(line);
    vsyslog(priority, format, copy);
    va_end(copy);
    va_end(args);
}
