// Client library of the file-change notification daemon qiranotifyd.
#pragma once

#include <string>

#include <json/value.h>

namespace QIRA {
namespace QIRANOTIFYD {

// Directories at most this many components below their share directory are watched; what lies
// deeper is neither watched nor reported.
constexpr int kMaxTreeDepth = 64;

enum _tag_monitor_queue_type_ {
    MONITOR_QUEUE_TYPE_NONE = 0,
    MONITOR_QUEUE_TYPE_CUSTOM = 1,
};

class MonitorQueue {
public:
    // Throws std::invalid_argument when jsQueue is not a queue description
    // ({"queue": string, "config": array}).
    explicit MonitorQueue(const Json::Value& jsQueue);

    const std::string& QueuePath() const { return queue_path_; }
    const Json::Value& Description() const { return description_; }

    // Registers the queue, replacing a registration with the same queue path, owner and type.
    static bool Upsert(const MonitorQueue& queue, const std::string& owner, _tag_monitor_queue_type_ type);
    static bool Delete(const std::string& queuePath, const std::string& owner, _tag_monitor_queue_type_ type);

private:
    std::string queue_path_;
    Json::Value description_;
};

}  // namespace QIRANOTIFYD
}  // namespace QIRA
