// What the notification daemon is told to watch: the monitor queues registered for the owner
// "fileindex", as the simulated platform keeps them.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace qiranotifyd_sim {

struct Root {
    std::string path;                 // a directory watched with everything beneath it
    uint32_t mask = 0;                // the events to report, as inotify bits
    std::vector<std::string> ignore;  // names never watched nor reported, at any depth
    std::string queue;                // where its records go
};

// The roots of every registration of owner "fileindex" and type 1, in registration order.
std::vector<Root> RegisteredRoots();

}  // namespace qiranotifyd_sim
