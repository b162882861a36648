// Reindex: validate every path, revive out-of-space shares, queue reindex events.
#include <set>

#include "fileindex/index_mgr.h"
#include "fileindex/json.h"
#include "fileindex/status_mgr.h"
#include "fileindex/utils.h"
#include "custom_event.h"
#include "index_support.h"
#include "path_rules.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

bool Malformed(const Json::Value& value) {
    FILEIDX_LOG("Malformed jsArrPath: %s", toString(value).c_str());
    ErrorHandler::SetError(FILEINDEX_ERR_BAD_PARAM);
    return false;
}

// A full path that does not fit the system's path length is malformed; one that does not resolve
// is left to the event pass, which reports it.
bool FullPathTooLong(const std::string& share, const std::string& path) {
    std::string fullPath;
    return detail::ShareFullPath(share, path, fullPath) && !detail::FitsPathMax(fullPath.size());
}

// Nothing changes unless every element is a canonical share path in an indexed share.
bool Validate(const Json::Value& paths, std::set<std::string>& noSpaceShares) {
    for (const auto& element : paths) {
        if (!element.isString() || !detail::IsCanonicalSharePath(element.asString())) return Malformed(element);
        std::string share;
        GetShareNameByPath(share, element.asString());  // cannot fail on a canonical path
        if (!IndexMgr::IsShareIndexed(share)) return false;
        if (FullPathTooLong(share, element.asString())) return Malformed(element);
        if (StatusMgr::ShareIsNoSpace(share)) noSpaceShares.insert(share);
    }
    return true;
}

bool QueueReindexEvents(const Json::Value& paths) {
    std::vector<std::string> sharePaths;
    for (const auto& element : paths) sharePaths.push_back(element.asString());
    detail::PendingReindex pending(detail::ResolvableFullPaths(sharePaths));
    for (const auto& element : paths) {
        const std::string path = element.asString();
        std::string fullPath;
        if (!GetFullPath(fullPath, path)) {
            FILEIDX_LOG("GetFullPath failed, path=%s", path.c_str());
            ErrorHandler::SetError(FILEINDEX_ERR_PATH);
            return false;
        }
        if (!detail::AddCustomEvent(kEventReindex, fullPath, Json::Value(), pending)) {
            FILEIDX_LOG("AddCustomEvent failed, path=%s", path.c_str());
            return false;
        }
    }
    return true;
}

}  // namespace

bool IndexMgr::Reindex(const Json::Value& paths) {
    if (!paths.isArray()) return Malformed(paths);
    std::set<std::string> noSpaceShares;
    if (!Validate(paths, noSpaceShares)) return false;
    for (const auto& share : noSpaceShares) {
        if (!StatusMgr::ShareRevive(share)) FILEIDX_LOG("ShareRevice failed, share=%s", share.c_str());
    }
    return QueueReindexEvents(paths);
}

}  // namespace FILEINDEX
}  // namespace QIRA
