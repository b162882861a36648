// Pieces shared by the index manager's operations.
#pragma once

#include <string>
#include <vector>

#include "fileindex/config.h"
#include "fileindex/folders.h"
#include "log.h"
#include "pending_reindex.h"
#include "unlock_on_exit.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {

// The last indexed folder is gone: stop fileindexd, switch Spotlight off and restart samba when
// it was on. Failures are logged only.
void StopIndexingServices();


// UpsertQIRANotifydCfg over the list an operation has just saved, instead of loading it again.
bool RegisterShareMonitor(Folders& folders, const std::string& share, const std::string& queuePath);
bool RegisterShareMonitor(Folders& folders, const std::string& share);

// IndexMgr::IsShareIndexed over the list an operation has just saved.
bool HoldsShare(Folders& folders, const std::string& share);

// IndexMgr::Update with `pending` kept across the events of one operation.
bool QueueSettingChange(const std::string& path, const Json::Value& changes, PendingReindex& pending);

// The full paths of share paths that resolve, without logging or setting the error code: the
// paths an operation is about to queue events for.
std::vector<std::string> ResolvableFullPaths(const std::vector<std::string>& paths);

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
