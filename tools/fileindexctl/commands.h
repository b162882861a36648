// The command groups of fileindexctl.
#pragma once

#include <CLI/CLI.hpp>

#include "lock_retry.h"
#include "output.h"
#include "validators.h"

namespace fileindexctl {

struct Context {
    Output out;
    int status = 0;
    double lockWait = 5;  // seconds to retry a held configuration lock

    bool Attempt(const std::function<bool()>& operation) const { return RetryWhileLocked(lockWait, operation); }
};

void AddFolderCommands(CLI::App& app, Context& ctx);
void AddServiceCommands(CLI::App& app, Context& ctx);
void AddShareCommands(CLI::App& app, Context& ctx);
void AddQuestionCommands(CLI::App& app, Context& ctx);

}  // namespace fileindexctl
