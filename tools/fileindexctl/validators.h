// Arguments the library would accept but that no administrator means.
#pragma once

#include <CLI/CLI.hpp>

namespace fileindexctl {

// An empty share name would mean every share to the library.
extern const CLI::Validator ShareName;
// A pause whose end passes 2038-01-19 would wrap to a negative resume time that reads as running.
extern const CLI::Validator PauseHours;

}  // namespace fileindexctl
