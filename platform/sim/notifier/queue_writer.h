// Appending records to a share's event queue with the protocol every writer of the queue keeps:
// the queue's exclusive lock, one whole line per write, a queue taken away meanwhile opened anew.
#pragma once

#include <string>
#include <vector>

namespace qiranotifyd_sim {

// Appends the lines (each ending in "\n"). A lock held for more than about a second, a short
// write (cut back again) or a queue that cannot be opened fails the whole call. The queue's
// directory is reached without following a link.
bool AppendLines(const std::string& queuePath, const std::vector<std::string>& lines);

}  // namespace qiranotifyd_sim
