#include "cause.h"

#include <cerrno>
#include <cstring>
#include <regex>
#include <vector>

#include "captured_log.h"
#include "envelope.h"
#include "fileindex/error.h"
#include "fileindex/root.h"
#include "fileindex/service_state.h"

namespace tools {
namespace {

using QIRA::FILEINDEX::_tag_fileindex_err_;

int HttpStatusOf(_tag_fileindex_err_ code) {
    using namespace QIRA::FILEINDEX;
    switch (code) {
        case FILEINDEX_ERR_BAD_PARAM: return 400;
        case FILEINDEX_ERR_PATH:
        case FILEINDEX_ERR_NO_SUCH_FOLDER: return 404;
        case FILEINDEX_ERR_EXCEED_MAX_FOLDER: return 422;
        case FILEINDEX_ERR_LOCK: return 409;
        default: return 500;
    }
}

std::string DaemonText() {
    const std::string socket = QIRA::FILEINDEX::DaemonSocketPath();
    if (QIRA::FILEINDEX::DaemonAnswers()) return "the indexing daemon at " + socket + " did not take the command";
    return "the indexing daemon does not answer at " + socket + " (" + std::strerror(errno) + ")";
}

// The cause a log line names, if it names one.
bool CauseOfLine(const std::string& message, Cause& cause) {
    static const std::regex platform(R"(^(Q[A-Za-z]+) failed: err=\[0x([0-9A-Fa-f]+) )");
    static const std::regex share(R"(^QIRAShareGet failed, (?:name|share)=(.*?)(?:, code=-?[0-9]+)?$)");
    static const std::regex outside(R"(^QIRAShareNamePathGet failed, path=(.*)$)");
    std::smatch match;
    if (message == "SendCammandToDaemon failed") {
        cause = {"DAEMON_UNREACHABLE", 0, DaemonText(), 502};
    } else if (std::regex_search(message, match, platform)) {
        cause = {"PLATFORM_CALL_FAILED", 0, "the platform call " + match[1].str() + " failed with error 0x" + match[2].str(), 502};
    } else if (std::regex_match(message, match, share)) {
        cause = {"SHARE_UNKNOWN", 0, "no share is named \"" + match[1].str() + "\"", 404};
    } else if (std::regex_match(message, match, outside)) {
        cause = {"SHARE_UNKNOWN", 0, "no share holds " + match[1].str(), 404};
    } else if (message == "MonitorQueue::Add failed" || message == "MonitorQueue::Delete failed" ||
               message.rfind("Failed to create MonitorQueue", 0) == 0) {
        cause = {"NOTIFIER_REFUSED", 0, "the notification daemon refused the change of what it watches", 502};
    } else if (message.rfind("AddCustomEvent failed", 0) == 0 || message.rfind("Event too long", 0) == 0) {
        cause = {"EVENT_NOT_QUEUED", 0,
                 "an event could not be queued (its queue stayed locked or could not be written); the share is "
                 "marked for a full reindex",
                 502};
    } else {
        return false;
    }
    return true;
}

}  // namespace

Cause CauseOfFailure() {
    const auto code = QIRA::FILEINDEX::ErrorHandler::GetError();
    if (code != QIRA::FILEINDEX::FILEINDEX_ERR_NONE) {
        const ErrorText text = DescribeError(code);
        return {text.name, static_cast<int>(code), text.explanation, HttpStatusOf(code)};
    }
    Cause cause;
    for (const auto& line : CapturedLog()) {
        if (CauseOfLine(line.message, cause)) return cause;
    }
    return {"UNSPECIFIED", 0, "the library set no error code and its log names no known cause", 500};
}

}  // namespace tools
