#include "captured_log.h"

#include "fileindex/log_sink.h"

namespace tools {
namespace {

std::vector<CapturedLine>& Lines() {
    static std::vector<CapturedLine> lines;
    return lines;
}

void Keep(const QIRA::FILEINDEX::LogLine& line, void*) { Lines().push_back({line.file, line.line, line.message}); }

}  // namespace

void CaptureLibraryLog() { QIRA::FILEINDEX::SetLogSink(Keep, nullptr, QIRA::FILEINDEX::LogSinkMode::BesidesSyslog); }

const std::vector<CapturedLine>& CapturedLog() { return Lines(); }

void ClearCapturedLog() { Lines().clear(); }

std::vector<std::string> CapturedMessages(bool withSource) {
    std::vector<std::string> messages;
    for (const auto& line : Lines()) {
        messages.push_back(withSource ? line.file + ":" + std::to_string(line.line) + " " + line.message : line.message);
    }
    return messages;
}

}  // namespace tools
