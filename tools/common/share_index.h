// A share's index opened as every reader in the tools opens it: only where the caller may read
// and enter the share's directory (its user could list the files anyway), with every statement
// under a deadline.
#pragma once

#include <chrono>
#include <memory>
#include <string>

#include "cause.h"
#include "search_index.h"

namespace tools {

// The share's index, read-only; `shareDir` is the share's directory ("" when the share does not
// resolve). Null with `problem` and `cause`: SHARE_UNKNOWN, NOT_PERMITTED, INDEX_MISSING (problem
// Missing), INDEX_DAMAGED or INDEX_UNREADABLE.
std::unique_ptr<SearchIndex> OpenShareIndex(const std::string& share, const std::string& shareDir, std::chrono::seconds budget,
                                            IndexProblem& problem, Cause& cause);

// The cause a reader reports for an index that failed with `problem` (`error` says how).
Cause IndexCause(IndexProblem problem, const std::string& share, const std::string& error);

}  // namespace tools
