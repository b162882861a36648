// Registration of each indexed share's monitor queue with qiranotifyd.
#include <memory>

#include "fileindex/fileidx.h"
#include "fileindex/folders.h"
#include "fileindex/index_mgr.h"
#include "fileindex/json.h"
#include "fileindex/service_state.h"
#include "fileindex/utils.h"
#include "index_support.h"
#include "qiranotifyd/monitor_queue.h"
#include "queue_file.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

using QIRA::QIRANOTIFYD::MonitorQueue;

const char kOwner[] = "fileindex";
// Every event that can change what is indexed; kept as this number (bit 0x1000 included).
constexpr int kMonitorMask = 65486;
const auto kQueueType = static_cast<QIRA::QIRANOTIFYD::_tag_monitor_queue_type_>(1);

// One "config" entry per folder of the share, each path resolved afresh.
bool BuildMonitorConfig(const std::vector<Folder>& folders, Json::Value& config) {
    Json::Value ignore(Json::arrayValue);
    ignore.append("@eaDir");
    config = Json::Value(Json::arrayValue);
    for (const auto& folder : folders) {
        std::string fullPath;
        if (!GetFullPath(fullPath, folder.path)) {
            FILEIDX_LOG("GetFullPath failed, path=%s", folder.path.c_str());
            return false;
        }
        Json::Value entry(Json::objectValue);
        entry["path"] = fullPath;
        entry["mask"] = kMonitorMask;
        entry["ignore"] = ignore;
        config.append(entry);
    }
    return true;
}

// {"queue", "config"} for the share's folders in `folders`.
bool DescribeShare(Folders& folders, const std::string& share, const std::string& queuePath, Json::Value& description) {
    std::vector<Folder> list;
    if (!folders.List(list, share)) return false;
    description = Json::Value(Json::objectValue);
    if (!BuildMonitorConfig(list, description["config"])) return false;
    description["queue"] = queuePath;
    return true;
}

std::unique_ptr<MonitorQueue> CreateMonitorQueue(const Json::Value& description) {
    try {
        return std::make_unique<MonitorQueue>(description);
    } catch (const std::exception&) {
        return nullptr;
    }
}

}  // namespace

bool DescribeMonitorQueue(const std::string& share, Json::Value& out) {
    std::string queuePath;
    Folders folders;
    return detail::ShareQueuePath(share, queuePath) && folders.Load() && DescribeShare(folders, share, queuePath, out);
}

bool IndexMgr::UpsertQIRANotifydCfg(const std::string& share) {
    std::string queuePath;
    if (!detail::ShareQueuePath(share, queuePath)) return false;
    Folders folders;
    return folders.Load() && detail::RegisterShareMonitor(folders, share, queuePath);
}

namespace detail {

bool RegisterShareMonitor(Folders& folders, const std::string& share, const std::string& queuePath) {
    Json::Value description;
    if (!DescribeShare(folders, share, queuePath, description)) return false;
    const auto queue = CreateMonitorQueue(description);
    if (!queue) {
        FILEIDX_LOG("Failed to create MonitorQueue, jsQueue=%s", toString(description).c_str());
        return false;
    }
    if (!MonitorQueue::Upsert(*queue, kOwner, kQueueType)) {
        FILEIDX_LOG("MonitorQueue::Add failed");
        return false;
    }
    return true;
}

}  // namespace detail

bool IndexMgr::DeleteQIRANotifydCfg(const std::string& share) {
    std::string queuePath;
    if (!detail::ShareQueuePath(share, queuePath)) return false;
    if (!MonitorQueue::Delete(queuePath, kOwner, kQueueType)) {
        FILEIDX_LOG("MonitorQueue::Delete failed");
        return false;
    }
    return true;
}

}  // namespace FILEINDEX
}  // namespace QIRA
