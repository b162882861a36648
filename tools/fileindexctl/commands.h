// The command groups of fileindexctl.
#pragma once

#include <CLI/CLI.hpp>

#include "output.h"

namespace fileindexctl {

struct Context {
    Output out;
    int status = 0;
};

void AddFolderCommands(CLI::App& app, Context& ctx);
void AddServiceCommands(CLI::App& app, Context& ctx);
void AddShareCommands(CLI::App& app, Context& ctx);
void AddQuestionCommands(CLI::App& app, Context& ctx);

}  // namespace fileindexctl
