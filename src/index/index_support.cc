#include "index_support.h"

#include "custom_event.h"
#include "fileindex/utils.h"
#include "path_rules.h"
#include "queue_file.h"
#include "qira/qlib_service.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {

void StopIndexingServices() {
    if (QLIBServiceStop("fileindexd", 1) < 0) FILEIDX_LOG_PLATFORM("QLIBServiceStop");
    if (QIRASMBIsEnableSpotlight() == 0) return;
    if (QIRASMBSetSpotlight(0) < 0) {
        FILEIDX_LOG_PLATFORM("QIRASMBSetSpotlight");
        return;
    }
    if (QLIBServiceRestart("samba") < 0) FILEIDX_LOG_PLATFORM("QLIBServiceRestart");
}

bool QueueSettingChange(const std::string& path, const Json::Value& changes, PendingReindex& pending) {
    std::string fullPath;
    if (!GetFullPath(fullPath, path)) {
        FILEIDX_LOG("GetFullPath failed, path=%s", path.c_str());
        ErrorHandler::SetError(FILEINDEX_ERR_PATH);
        return false;
    }
    if (!AddCustomEvent(kEventFolderSettingChanged, fullPath, changes, pending)) {
        FILEIDX_LOG("AddCustomEvent failed");
        return false;
    }
    return true;
}

std::vector<std::string> ResolvableFullPaths(const std::vector<std::string>& paths) {
    std::vector<std::string> fullPaths;
    for (const auto& path : paths) {
        std::string share;
        std::string fullPath;
        if (GetShareNameByPath(share, path) && ShareFullPath(share, path, fullPath)) fullPaths.push_back(fullPath);
    }
    return fullPaths;
}

bool RegisterShareMonitor(Folders& folders, const std::string& share) {
    std::string queuePath;
    return ShareQueuePath(share, queuePath) && RegisterShareMonitor(folders, share, queuePath);
}


}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
