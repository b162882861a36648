// The answer shape the tools share, for success and failure alike:
// {"ok", "result", "error": {"name", "number"}, "message", "log", "saved"}.
#pragma once

#include <string>
#include <vector>

#include <json/value.h>

#include "cause.h"
#include "fileindex/error.h"

namespace tools {

struct ErrorText {
    const char* name;
    const char* explanation;
};

ErrorText DescribeError(QIRA::FILEINDEX::_tag_fileindex_err_ code);

// "<operation> failed: <NAME> (<number>): <text>" (no number for a derived cause), or, when
// configuration files were saved before the failure, "<operation>: saved; not applied: ...".
std::string FailureMessage(const std::string& operation, const Cause& cause, const std::vector<std::string>& saved);

// Success: "error" is FILEINDEX_ERR_NONE and "log" empty, unless `verbose` asks for the lines the
// library wrote anyway ("file.cc:line message").
Json::Value SuccessEnvelope(const Json::Value& result, bool verbose);
// Failure: the cause, the message, the library's log lines (with their source when `verbose`)
// and the files saved before the failure.
Json::Value FailureEnvelope(const Cause& cause, const std::string& message, const std::vector<std::string>& saved,
                            bool verbose);

}  // namespace tools
