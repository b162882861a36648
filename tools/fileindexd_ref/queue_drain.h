// Draining a share's event queue the way fileindexd does.
#pragma once

#include <string>

namespace fileindexd_ref {

// Moves the queue's records to its ".tmp" companion under the queue's lock and removes the
// queue, so that writers waiting for the lock open a new one. Returns the records moved.
int TakeQueue(const std::string& queuePath);

// Processes every record of the ".tmp" companion (counting the files under each event's path by
// media type), then removes it. Returns the records processed.
int ProcessTaken(const std::string& queuePath);

}  // namespace fileindexd_ref
