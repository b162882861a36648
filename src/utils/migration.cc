// Bringing a system configured by an earlier release into the running state.
#include <set>

#include "fileindex/folders.h"
#include "fileindex/index_mgr.h"
#include "fileindex/utils.h"
#include "log.h"
#include "qira/qlib_core.h"
#include "qira/qlib_service.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

bool CollectSharesAndPaths(const std::vector<Folder>& folders, std::set<std::string>& shares, Json::Value& paths) {
    for (const auto& folder : folders) {
        std::string share;
        if (!GetShareNameByPath(share, folder.path)) {
            FILEIDX_LOG("GetShareNameByPath failed, path=%s", folder.path.c_str());
            return false;
        }
        shares.insert(share);
        paths.append(folder.path);
    }
    return true;
}

}  // namespace

bool Updater_lum60_beta2() {
    Folders config;
    std::vector<Folder> folders;
    if (!config.Load() || !config.List(folders)) return false;
    if (folders.empty()) {
        if (QLIBServiceStop("fileindexd", 1) >= 0) return true;
        // The text names the start operation although the stop failed; kept as it is.
        FILEIDX_LOG_PLATFORM("QLIBServiceStart");
        return false;
    }
    if (QLIBServiceStart("fileindexd", 1) < 0) {
        FILEIDX_LOG_PLATFORM("QLIBServiceStart");
        return false;
    }
    if (QIRASMBSetSpotlight(true) < 0) {
        FILEIDX_LOG_PLATFORM("QIRASMBSetSpotlight");
        return false;
    }
    std::set<std::string> shares;
    Json::Value paths(Json::arrayValue);
    if (!CollectSharesAndPaths(folders, shares, paths)) return false;
    for (const auto& share : shares) {
        if (!IndexMgr::UpsertQIRANotifydCfg(share)) {
            FILEIDX_LOG("UpsertQIRANotifydCfg failed, share=%s", share.c_str());
            return false;
        }
    }
    if (!IndexMgr::Reindex(paths)) {
        FILEIDX_LOG("Reindex failed");
        return false;
    }
    return true;
}

}  // namespace FILEINDEX
}  // namespace QIRA
