// Command-line parsing shared by the tools: help and --version exit 0, a usage error exits 2 with
// the message and the usage on stderr, a refused run exits with its own status.
#pragma once

#include <optional>

#include <CLI/CLI.hpp>

namespace tools {

constexpr int kExitUsage = 2;

// Parses; the exit status when parsing (or a callback) ended the run, nothing to go on.
std::optional<int> Parse(CLI::App& app, int argc, char** argv);

}  // namespace tools
