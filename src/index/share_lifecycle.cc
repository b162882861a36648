// Following the life of a share: removal, rename, pause, resume and wiping its index data.
#include "fileindex/fileidx.h"
#include "fileindex/folders.h"
#include "fileindex/index_mgr.h"
#include "fileindex/utils.h"
#include "daemon_channel.h"
#include "ea_dir.h"
#include "index_support.h"
#include "path_rules.h"
#include "queue_file.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

bool LockAndListShare(Folders& folders, const std::string& share, std::vector<Folder>& list) {
    return folders.Lock(true) && folders.Load() && folders.List(list, share);
}

}  // namespace

bool IndexMgr::ShareRemove(const std::string& share) {
    Folders folders;
    detail::UnlockOnExit unlock(folders);
    std::vector<Folder> list;
    if (!detail::NulFree(share) || !LockAndListShare(folders, share, list)) return false;
    for (const auto& folder : list) {
        Json::Value report;
        if (!folders.Delete(report, folder.path)) return false;
    }
    if (!folders.Save()) return false;
    if (folders.Count() == 0) detail::StopIndexingServices();
    return true;
}

bool IndexMgr::ShareRename(const std::string& oldName, const std::string& newName) {
    Folders folders;
    detail::UnlockOnExit unlock(folders);
    std::vector<Folder> list;
    if (!detail::NulFree(oldName) || !detail::NulFree(newName) || !LockAndListShare(folders, oldName, list)) {
        return false;
    }
    for (auto& folder : list) {
        Json::Value report;
        if (!folders.Delete(report, folder.path)) return false;
        folder.SetPath(ReplaceShareName(folder.path, newName));
        if (!folders.Upsert(report, folder.asJson())) return false;
    }
    return folders.Save();
}

bool IndexMgr::SharePause(const std::string& share) {
    if (!detail::NulFree(share)) return false;
    if (!SendCammandToDaemon("delete_share_worker", detail::ShareNameData(share))) return false;
    if (!DeleteQIRANotifydCfg(share)) {
        FILEIDX_LOG("DeleteQIRANotifydCfg failed, share=%s", share.c_str());
        return false;
    }
    return true;
}

bool IndexMgr::ShareResume(const std::string& share) {
    if (!detail::NulFree(share)) return false;
    if (!UpsertQIRANotifydCfg(share)) {
        FILEIDX_LOG("UpsertQIRANotifydCfg failed, share=%s", share.c_str());
        return false;
    }
    return SendCammandToDaemon("revive_share_worker", detail::ShareNameData(share));
}

bool IndexMgr::CleanShareIndexData(const std::string& share) {
    std::string queuePath;
    if (!detail::ShareQueuePath(share, queuePath)) return false;
    detail::RemoveInEaDir(queuePath);
    detail::RemoveInEaDir(queuePath + ".tmp");
    char dbPath[4096] = {0};
    if (FILEIDXDBPathGet(share.c_str(), dbPath, sizeof dbPath) < 0) {
        FILEIDX_LOG("FILEIDXDBPathGet failed, share=%s", share.c_str());
        return false;
    }
    detail::RemoveInEaDir(dbPath);
    return true;
}

}  // namespace FILEINDEX
}  // namespace QIRA
