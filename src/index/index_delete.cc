// Folder delete: folder.conf, commands and events, monitor queues, share data, services.
#include <set>

#include "fileindex/folders.h"
#include "fileindex/index_mgr.h"
#include "fileindex/json.h"
#include "fileindex/utils.h"
#include "daemon_channel.h"
#include "index_support.h"
#include "path_rules.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

// Every element must be a string without a NUL byte; checked before anything changes.
bool AllStrings(const Json::Value& paths) {
    for (const auto& element : paths) {
        if (!element.isString() || element.asString().find('\0') != std::string::npos) {
            FILEIDX_LOG("Bad param: %s", toString(element).c_str());
            ErrorHandler::SetError(FILEINDEX_ERR_BAD_PARAM);
            return false;
        }
    }
    return true;
}

bool ApplyDeletes(Folders& folders, const Json::Value& paths, Json::Value& deleted, std::set<std::string>& shares) {
    for (const auto& element : paths) {
        const std::string path = element.asString();
        Json::Value report;
        if (!folders.Delete(report, path)) {
            FILEIDX_LOG("Delete failed, path=%s", path.c_str());
            return false;
        }
        deleted[path] = report;
        std::string share;
        if (!GetShareNameByPath(share, path)) {
            FILEIDX_LOG("GetShareNameByPath failed, path=%s", path.c_str());
            return false;
        }
        shares.insert(share);
    }
    return true;
}

bool NotifyDaemonOfDeletes(const Json::Value& paths, const Json::Value& deleted) {
    for (const auto& element : paths) {
        if (!SendCammandToDaemon("delete_folder_setting", detail::FolderPathData(element.asString()))) {
            FILEIDX_LOG("SendCammandToDaemon failed");
            return false;
        }
    }
    detail::PendingReindex pending(detail::ResolvableFullPaths(deleted.getMemberNames()));
    for (auto it = deleted.begin(); it != deleted.end(); ++it) {
        if (!detail::QueueSettingChange(it.name(), *it, pending)) {
            FILEIDX_LOG("Update failed");
            return false;
        }
    }
    return true;
}

// Rebuild the monitor queue of a share that keeps folders; otherwise wipe its index data and
// then unregister it.
bool ReconcileShares(Folders& saved, const std::set<std::string>& shares) {
    for (const auto& share : shares) {
        if (detail::HoldsShare(saved, share)) {
            if (!detail::RegisterShareMonitor(saved, share)) {
                FILEIDX_LOG("UpsertQIRANotifydCfg failed, share=%s", share.c_str());
                return false;
            }
            continue;
        }
        if (!IndexMgr::CleanShareIndexData(share)) {
            FILEIDX_LOG("CleanShareIndexData failed, share=%s", share.c_str());
            return false;
        }
        if (!IndexMgr::DeleteQIRANotifydCfg(share)) {
            FILEIDX_LOG("DeleteQIRANtifydCfg failed, share=%s", share.c_str());
            return false;
        }
    }
    return true;
}

}  // namespace

bool IndexMgr::Delete(const Json::Value& paths) {
    if (!paths.isArray()) {
        FILEIDX_LOG("Bad param: %s", toString(paths).c_str());
        ErrorHandler::SetError(FILEINDEX_ERR_BAD_PARAM);
        return false;
    }
    if (!AllStrings(paths)) return false;
    Folders config;
    detail::UnlockOnExit unlock(config);
    Json::Value deleted(Json::objectValue);
    std::set<std::string> shares;
    if (!config.Lock(true) || !config.Load() || !ApplyDeletes(config, paths, deleted, shares) || !config.Save()) {
        return false;
    }
    if (config.Count() == 0) {
        detail::StopIndexingServices();
    } else if (!NotifyDaemonOfDeletes(paths, deleted)) {
        return false;
    }
    return ReconcileShares(config, shares);
}

}  // namespace FILEINDEX
}  // namespace QIRA
