// How the tools print results and failures.
//
// With --json every command prints one object on stdout, of the same shape for success and
// failure: {"ok", "result", "error": {"name", "number"}, "message", "log", "saved"}. Without it a
// result is a table or a line on stdout and a failure is told on stderr: its cause, the library's
// log lines of the operation (unless -q; with their source file and line under -v) and the
// configuration files it had already saved when it failed.
#pragma once

#include <string>
#include <vector>

#include <json/value.h>

#include "cause.h"

namespace tools {

using Table = std::vector<std::vector<std::string>>;

constexpr int kExitFailure = 1;
// The change was saved, but a later step (the daemon, a service, the notifier) did not follow.
constexpr int kExitNotApplied = 4;

class Output {
public:
    std::string tool = "fileindexctl";  // names the tool in what goes to stderr
    bool json = false;
    bool quiet = false;
    bool verbose = false;

    void Emit(const Json::Value& result, const Table& table) const;
    void Emit(const Json::Value& result, const std::string& text) const;
    // A warning beside a result: on stderr, unless the answer is JSON (the result carries it).
    void Warn(const std::string& text) const;
    // Tells the failure of `operation` with the cause the library leaves; returns the exit status:
    // kExitNotApplied when `saved` names files changed before the failure, else kExitFailure.
    int Fail(const std::string& operation, const std::vector<std::string>& saved) const;
    // The same with a cause the tool found itself, and the exit status to give.
    int Fail(const std::string& operation, const Cause& cause, int status) const;

private:
    int Tell(const std::string& operation, const Cause& cause, const std::vector<std::string>& saved, int status) const;
};

}  // namespace tools
