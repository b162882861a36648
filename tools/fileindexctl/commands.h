// The command groups of fileindexctl and what they share.
#pragma once

#include <functional>
#include <optional>

#include <CLI/CLI.hpp>

#include "output.h"
#include "saved_files.h"
#include "time_text.h"
#include "validators.h"

namespace fileindexctl {

using tools::Output;
using tools::Table;
using tools::FormatLocalTime;

constexpr int kExitUnknown = 2;  // a question whose answer could not be worked out
constexpr int kExitTimeOut = 3;  // wait: the time ran out first

struct Context {
    Output out;
    int status = 0;
    double lockWait = 5;  // seconds to retry a held configuration lock

    // Runs one library operation: the error code and the log lines are cleared first, so those
    // left belong to it, and a held configuration lock is retried for lockWait seconds.
    bool Attempt(const std::function<bool()>& operation);
    // Tells the failure of the last attempt; returns the exit status.
    int Fail(const std::string& operation) const;
    // Tells a failure the tool found before asking the library.
    int Fail(const std::string& operation, const tools::Cause& cause, int status = tools::kExitFailure) const {
        return out.Fail(operation, cause, status);
    }

private:
    std::optional<tools::SavedFiles> before_;
};

void AddFolderCommands(CLI::App& app, Context& ctx);
void AddServiceCommands(CLI::App& app, Context& ctx);
void AddShareCommands(CLI::App& app, Context& ctx);
void AddQuestionCommands(CLI::App& app, Context& ctx);
void AddInsightCommands(CLI::App& app, Context& ctx);
void AddSearchCommand(CLI::App& app, Context& ctx);

}  // namespace fileindexctl
