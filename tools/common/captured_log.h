// The library's log lines of the running operation. the tool is the host process, so it takes
// the library's syslog calls: each line still goes to the system log and is kept here as well,
// to be shown with the failure it explains.
#pragma once

#include <string>
#include <vector>

namespace tools {

const std::vector<std::string>& CapturedLog();
void ClearCapturedLog();

}  // namespace tools
