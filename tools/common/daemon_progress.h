// How far the indexing daemon has got, as it publishes it for the tools: per share, the records of
// the batch it has taken (the queue's companion) that it has applied already, so that a long batch
// does not look frozen, and when the share was last brought up to date.
#pragma once

#include <string>

#include <json/value.h>

namespace tools {

// "/var/run/fileindexd.progress" under the root prefix.
std::string DaemonProgressPath();

// {"shares": {"<share>": {"applied": records, "up_to_date": epoch seconds or null}}}, every share
// an object; null when there is none, or it is not a regular file of at most 1 MiB reached
// without a link.
Json::Value ReadDaemonProgress();

// Replaces the file whole; false on failure.
bool WriteDaemonProgress(const Json::Value& progress);

// The records still to apply: `pending` (what GetProgress counts for the share) less what the
// daemon reports applied of the batch it has taken.
unsigned long long StillPending(unsigned long long pending, const Json::Value& daemonProgress, const std::string& share);

}  // namespace tools
