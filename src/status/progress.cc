// How far indexing has got: per share the lines pending in its queue files, per indexed folder
// the records that concern it, and the pause state.
#include "fileindex/progress.h"

#include <ctime>
#include <map>
#include <vector>

#include "fileindex/folders.h"
#include "fileindex/status_mgr.h"
#include "fileindex/utils.h"
#include "path_rules.h"
#include "queue_count.h"
#include "queue_file.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

Json::Value PauseOf(long long resumeTime) {
    Json::Value pause(Json::objectValue);
    pause["paused"] = resumeTime == 0 || (resumeTime > 0 && time(nullptr) < resumeTime);
    pause["resume_time"] = static_cast<Json::Int64>(resumeTime);
    return pause;
}

Json::Value ShareProgress(const std::string& share, const std::vector<std::string>& folderPaths) {
    Json::Value entry(Json::objectValue);
    entry["share"] = share;
    std::string queuePath;
    if (!detail::ShareQueuePath(share, queuePath)) queuePath.clear();
    const detail::LineCount queueLines = queuePath.empty() ? detail::LineCount() : detail::CountLines(queuePath);
    const detail::LineCount companionLines =
        queuePath.empty() ? detail::LineCount() : detail::CountLines(queuePath + ".tmp");
    const unsigned long long queue = queueLines.lines;
    const unsigned long long companion = companionLines.lines;
    entry["unread"] = Json::Value(Json::arrayValue);
    if (queueLines.refused) entry["unread"].append("queue");
    if (companionLines.refused) entry["unread"].append("companion");
    entry["queue"] = static_cast<Json::Int64>(queue);
    entry["companion"] = static_cast<Json::Int64>(companion);
    entry["pending"] = static_cast<Json::Int64>(queue + companion);
    std::vector<std::string> prefixes(folderPaths.size());
    for (size_t i = 0; i < folderPaths.size(); ++i) {
        std::string fullPath;
        if (detail::ShareFullPath(share, folderPaths[i], fullPath)) prefixes[i] = fullPath + "/";
    }
    std::map<std::string, unsigned long long> inQueue, inCompanion;
    if (queue > 0) inQueue = detail::CountRecordsUnder(queuePath, prefixes);
    if (companion > 0) inCompanion = detail::CountRecordsUnder(queuePath + ".tmp", prefixes);
    entry["folders"] = Json::Value(Json::arrayValue);
    for (size_t i = 0; i < folderPaths.size(); ++i) {
        Json::Value folder(Json::objectValue);
        folder["path"] = folderPaths[i];
        folder["pending"] = static_cast<Json::Int64>(prefixes[i].empty() ? 0 : inQueue[prefixes[i]] + inCompanion[prefixes[i]]);
        entry["folders"].append(folder);
    }
    return entry;
}

}  // namespace

bool GetProgress(Json::Value& out) {
    Folders folders;
    std::vector<Folder> all;
    long long resumeTime = -1;
    if (!folders.Load() || !folders.List(all) || !StatusMgr::GetPauseInfo(resumeTime)) return false;
    std::map<std::string, std::vector<std::string>> byShare;
    for (const auto& folder : all) {
        std::string share;
        if (GetShareNameByPath(share, folder.path)) byShare[share].push_back(folder.path);
    }
    out = Json::Value(Json::objectValue);
    out["pause"] = PauseOf(resumeTime);
    out["shares"] = Json::Value(Json::arrayValue);
    for (const auto& [share, paths] : byShare) out["shares"].append(ShareProgress(share, paths));
    return true;
}

}  // namespace FILEINDEX
}  // namespace QIRA
