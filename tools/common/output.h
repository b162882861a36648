// How the tools print results and failures.
//
// With --json every command prints one object on stdout, of the same shape for success and
// failure: {"ok", "result", "error": {"name", "number"}, "message", "log", "saved"}. Without it a
// result is a table or a line on stdout and a failure is told on stderr: the error code, the
// library's log lines of the operation (unless -q) and the configuration files it had already
// saved when it failed.
#pragma once

#include <string>
#include <vector>

#include <json/value.h>

namespace tools {

using Table = std::vector<std::vector<std::string>>;

constexpr int kExitFailure = 1;

class Output {
public:
    std::string tool = "fileindexctl";  // names the tool in what goes to stderr
    bool json = false;
    bool quiet = false;

    void Emit(const Json::Value& result, const Table& table) const;
    void Emit(const Json::Value& result, const std::string& text) const;
    // Tells the failure of `operation`; returns the exit status.
    int Fail(const std::string& operation, const std::vector<std::string>& saved) const;

private:
    void EmitEnvelope(bool ok, const Json::Value& result, const std::string& message,
                      const std::vector<std::string>& saved) const;
};

// "2026-11-22 05:42:17 UTC" in the local time zone; ISO 8601 in UTC ("2026-11-22T05:42:17Z").
std::string FormatLocalTime(long long epochSeconds);
std::string FormatUtc(long long epochSeconds);

}  // namespace tools
