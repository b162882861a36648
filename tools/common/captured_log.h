// The library's log lines of the running operation, kept through the library's log sink to be
// shown with the failure they explain; each line still goes to the system log too.
#pragma once

#include <string>
#include <vector>

namespace tools {

struct CapturedLine {
    std::string file;  // e.g. "config.cc"
    int line = 0;
    std::string message;
};

// Installs the sink; once, at the start of a tool.
void CaptureLibraryLog();

const std::vector<CapturedLine>& CapturedLog();
void ClearCapturedLog();

// The messages; with `withSource` each as "file.cc:line message".
std::vector<std::string> CapturedMessages(bool withSource);

}  // namespace tools
