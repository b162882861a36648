// Simulated notification daemon: registrations in monitors.json keyed by queue, owner and type.
#include "qiranotifyd/monitor_queue.h"

#include <stdexcept>

#include "sim_state.h"

namespace QIRA {
namespace QIRANOTIFYD {
namespace {

bool SameKey(const Json::Value& entry, const std::string& queue, const std::string& owner, int type) {
    return entry["queue"].asString() == queue && entry["owner"].asString() == owner && entry["type"].asInt() == type;
}

Json::Value KeyArgs(const std::string& queue, const std::string& owner, int type) {
    Json::Value args(Json::arrayValue);
    args.append(queue);
    args.append(owner);
    args.append(type);
    return args;
}

void RemoveKey(Json::Value& all, const std::string& queue, const std::string& owner, int type, bool& found) {
    Json::Value kept(Json::arrayValue);
    for (const auto& entry : all) {
        if (entry.isObject() && SameKey(entry, queue, owner, type)) {
            found = true;
        } else {
            kept.append(entry);
        }
    }
    all = kept;
}

}  // namespace

MonitorQueue::MonitorQueue(const Json::Value& jsQueue) {
    if (qira_sim::detail::Faulted("MonitorQueue::MonitorQueue")) throw std::invalid_argument("injected fault");
    if (!jsQueue.isObject() || !jsQueue["queue"].isString() || !jsQueue["config"].isArray()) {
        throw std::invalid_argument("not a monitor queue description");
    }
    queue_path_ = jsQueue["queue"].asString();
    description_ = jsQueue;
}

bool MonitorQueue::Upsert(const MonitorQueue& queue, const std::string& owner, _tag_monitor_queue_type_ type) {
    using namespace qira_sim::detail;
    Json::Value args = KeyArgs(queue.QueuePath(), owner, type);
    args.append(queue.Description());
    const bool ok = !Faulted("MonitorQueue::Upsert", queue.QueuePath());
    if (ok) {
        UpdateState("monitors.json", Json::Value(Json::arrayValue), [&](Json::Value& all) {
            bool found = false;
            RemoveKey(all, queue.QueuePath(), owner, type, found);
            Json::Value entry(Json::objectValue);
            entry["queue"] = queue.QueuePath();
            entry["owner"] = owner;
            entry["type"] = static_cast<int>(type);
            entry["description"] = queue.Description();
            all.append(entry);
        });
    }
    AppendJournal("MonitorQueue::Upsert", args, ok);
    return ok;
}

bool MonitorQueue::Delete(const std::string& queuePath, const std::string& owner, _tag_monitor_queue_type_ type) {
    using namespace qira_sim::detail;
    const bool ok = !Faulted("MonitorQueue::Delete", queuePath);
    if (ok) {
        UpdateState("monitors.json", Json::Value(Json::arrayValue), [&](Json::Value& all) {
            bool found = false;
            if (!all.isArray()) all = Json::Value(Json::arrayValue);
            RemoveKey(all, queuePath, owner, type, found);
        });
    }
    AppendJournal("MonitorQueue::Delete", KeyArgs(queuePath, owner, type), ok);
    return ok;
}

}  // namespace QIRANOTIFYD
}  // namespace QIRA
