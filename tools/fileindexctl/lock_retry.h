// Retrying an operation that met a held configuration lock.
#pragma once

#include <functional>

namespace fileindexctl {

// Runs `operation` until it succeeds, fails for another reason than a held lock (error 9), or
// `seconds` have passed; 0 runs it once. The error code is cleared before every attempt, so the
// code left belongs to the last one.
bool RetryWhileLocked(double seconds, const std::function<bool()>& operation);

}  // namespace fileindexctl
