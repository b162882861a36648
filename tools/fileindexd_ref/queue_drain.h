// Draining a share's event queue the way fileindexd does.
#pragma once

#include <string>

namespace fileindexd_ref {

// Moves the queue to its ".tmp" companion under the queue's lock (renamed, or appended when the
// companion still holds records), so that writers waiting for the lock open a new queue. Returns
// 1 when the queue was taken, 0 when there was none or it could not be moved.
int TakeQueue(const std::string& queuePath);

// Processes every record of the ".tmp" companion (counting the files under each event's path by
// media type), then removes it. Returns the records processed.
int ProcessTaken(const std::string& queuePath);

}  // namespace fileindexd_ref
