// Queue lines as the appliance writes them: the notifier's events (created, written, attributes,
// deleted), moves with and without "path_old", settings changes with their data, reindex records,
// and 1% malformed lines of six kinds.
#pragma once

#include <string>

namespace bench {

// The i-th line (with its "\n") of a queue whose records lie under `dir`.
std::string MixedQueueLine(const std::string& dir, size_t i);

}  // namespace bench
