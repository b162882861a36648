// The answer shape the tools share, for success and failure alike:
// {"ok", "result", "error": {"name", "number"}, "message", "log", "saved"}.
#pragma once

#include <string>
#include <vector>

#include <json/value.h>

#include "fileindex/error.h"

namespace tools {

struct ErrorText {
    const char* name;
    const char* explanation;
};

ErrorText DescribeError(QIRA::FILEINDEX::_tag_fileindex_err_ code);

// "<operation> failed: <NAME> (<number>): <explanation>" for the library's present error code.
std::string FailureMessage(const std::string& operation);

// The envelope with the library's present error code and the captured log lines.
Json::Value Envelope(bool ok, const Json::Value& result, const std::string& message,
                     const std::vector<std::string>& saved);

}  // namespace tools
