#include "registrations.h"

#include "qira_sim/appliance.h"

namespace qiranotifyd_sim {

std::vector<Root> RegisteredRoots() {
    std::vector<Root> roots;
    for (const auto& registration : qira_sim::Registrations()) {
        if (registration["owner"] != "fileindex" || registration["type"] != 1) continue;
        const Json::Value& description = registration["description"];
        for (const auto& entry : description["config"]) {
            if (!entry["path"].isString()) continue;
            Root root;
            root.path = entry["path"].asString();
            root.mask = entry["mask"].isUInt() ? entry["mask"].asUInt() : 0;
            for (const auto& name : entry["ignore"]) {
                if (name.isString()) root.ignore.push_back(name.asString());
            }
            root.queue = description["queue"].asString();
            roots.push_back(root);
        }
    }
    return roots;
}

}  // namespace qiranotifyd_sim
