// Status words for the service and for one folder, from the pause state and the queues.
#include <ctime>
#include <set>
#include <vector>

#include "fileindex/fileidx.h"
#include "fileindex/index_mgr.h"
#include "fileindex/status_mgr.h"
#include "fileindex/utils.h"
#include "log.h"
#include "queue_file.h"
#include "queue_status.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

const char kFinished[] = "finished";
const char kProcessing[] = "processing";
const char kPaused[] = "paused";
const char kNoSpace[] = "err_no_space";

bool IsHeldBack(long long resumeTime) { return resumeTime == 0 || static_cast<long long>(time(nullptr)) < resumeTime; }

// Shares of the folders that can be indexed, in ascending order; false when a name is unknown.
bool IndexableShares(const std::vector<Folder>& folders, std::set<std::string>& shares) {
    for (const auto& folder : folders) {
        std::string share;
        if (!GetShareNameByPath(share, folder.path)) {
            FILEIDX_LOG("Failed to get share name from path: %s", folder.path.c_str());
            return false;
        }
        if (CanPathBeIndexed(folder.path)) shares.insert(share);
    }
    return true;
}

}  // namespace

bool StatusMgr::GetStatus(std::string& status) {
    std::vector<Folder> folders;
    std::set<std::string> shares;
    if (!IndexMgr::List(folders) || !IndexableShares(folders, shares)) return false;
    for (const auto& share : shares) {
        std::string queuePath;
        if (!detail::ShareQueuePath(share, queuePath)) return false;
        if (!IsFileExist(queuePath) && !IsFileExist(queuePath + ".tmp")) continue;
        long long resumeTime = -1;
        if (!GetPauseInfo(resumeTime)) return false;
        status = IsHeldBack(resumeTime) ? kPaused : kProcessing;
        return true;
    }
    status = kFinished;
    return true;
}

std::string StatusMgr::GetFolderStatus(const std::string& path) {
    if (!CanPathBeIndexed(path)) return kPaused;
    std::string share;
    if (!GetShareNameByPath(share, path)) {
        FILEIDX_LOG("Failed to get share name from path: %s", path.c_str());
        return kFinished;
    }
    if (ShareIsNoSpace(share)) return kNoSpace;
    std::string queuePath;
    if (!detail::ShareQueuePath(share, queuePath)) return kFinished;
    long long resumeTime = -1;
    GetPauseInfo(resumeTime);
    if (!detail::IsFolderInQueue(path, queuePath) && !detail::IsFolderInQueue(path, queuePath + ".tmp")) {
        return kFinished;
    }
    return IsHeldBack(resumeTime) ? kPaused : kProcessing;
}

}  // namespace FILEINDEX
}  // namespace QIRA
