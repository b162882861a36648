// Folder upsert: folder.conf, monitor queues, fileindexd, Spotlight, commands, events.
#include <set>

#include "fileindex/folders.h"
#include "fileindex/index_mgr.h"
#include "fileindex/json.h"
#include "fileindex/utils.h"
#include "daemon_channel.h"
#include "index_support.h"
#include "path_rules.h"
#include "qira/qlib_service.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

// Applies every request element in memory; nothing is kept when one is rejected.
bool ApplyUpserts(Folders& folders, const Json::Value& request, Json::Value& upserted, std::set<std::string>& shares) {
    for (const auto& element : request) {
        Json::Value changes;
        if (!folders.Upsert(changes, element)) {
            FILEIDX_LOG("Upsert failed, folder=%s", toString(element).c_str());
            return false;
        }
        std::string path;
        RetrieveStringFromJsonObj(path, "path", element);
        upserted[path] = changes;
        std::string share;
        if (!GetShareNameByPath(share, path)) {
            FILEIDX_LOG("GetShareNameByPath failed, path=%s", path.c_str());
            return false;
        }
        shares.insert(share);
    }
    return true;
}

bool RegisterShares(Folders& saved, const std::set<std::string>& shares) {
    for (const auto& share : shares) {
        if (!detail::RegisterShareMonitor(saved, share)) {
            FILEIDX_LOG("UpsertQIRANtifydCfg failed, share=%s", share.c_str());
            return false;
        }
    }
    return true;
}

// Spotlight failures are logged only.
void EnsureSpotlightOn() {
    if (QIRASMBIsEnableSpotlight() != 0) return;
    if (QIRASMBSetSpotlight(1) < 0) {
        FILEIDX_LOG_PLATFORM("QIRASMBSetSpotlight");
        return;
    }
    if (QLIBServiceRestart("samba") < 0) FILEIDX_LOG_PLATFORM("QLIBServiceRestart");
}

bool SendUpsertCommands(const Json::Value& request) {
    for (const auto& element : request) {
        std::string path;
        RetrieveStringFromJsonObj(path, "path", element);
        if (!SendCammandToDaemon("upsert_folder_setting", detail::FolderPathData(path))) {
            FILEIDX_LOG("SendCammandToDaemon failed");
            return false;
        }
    }
    return true;
}

// One event per distinct path, in ascending path order.
bool QueueChangeEvents(const Json::Value& upserted) {
    detail::PendingReindex pending(detail::ResolvableFullPaths(upserted.getMemberNames()));
    for (auto it = upserted.begin(); it != upserted.end(); ++it) {
        if (!detail::QueueSettingChange(it.name(), *it, pending)) return false;
    }
    return true;
}

}  // namespace

bool IndexMgr::Upsert(const Json::Value& folders) {
    if (!folders.isArray()) {
        FILEIDX_LOG("Bad param: %s", toString(folders).c_str());
        ErrorHandler::SetError(FILEINDEX_ERR_BAD_PARAM);
        return false;
    }
    Folders config;
    detail::UnlockOnExit unlock(config);
    std::vector<Folder> all;
    if (!config.Lock(true) || !config.Load() || !config.List(all)) return false;
    Json::Value upserted(Json::objectValue);
    std::set<std::string> shares;
    if (!ApplyUpserts(config, folders, upserted, shares) || !config.Save()) return false;
    if (!RegisterShares(config, shares)) return false;
    if (QLIBServiceStart("fileindexd", 1) < 0) {
        FILEIDX_LOG_PLATFORM("QLIBServiceStart");
        return false;
    }
    EnsureSpotlightOn();
    return SendUpsertCommands(folders) && QueueChangeEvents(upserted);
}

bool IndexMgr::Set(const Json::Value& folders) { return Upsert(folders); }

bool IndexMgr::Add(const Json::Value& folders) { return Upsert(folders); }

bool IndexMgr::Update(const std::string& path, const Json::Value& changes) {
    if (!detail::NulFree(path)) return false;
    detail::PendingReindex pending({});
    return detail::QueueSettingChange(path, changes, pending);
}

}  // namespace FILEINDEX
}  // namespace QIRA
