// How far indexing has got: per share the lines pending in its queue files, per indexed folder
// the records and files that concern it, and the pause state.
#include "fileindex/progress.h"

#include <ctime>
#include <map>
#include <utility>
#include <vector>

#include "fileindex/folders.h"
#include "fileindex/status_mgr.h"
#include "fileindex/utils.h"
#include "path_rules.h"
#include "queue_file.h"
#include "queue_readings.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

Json::Value PauseOf(long long resumeTime) {
    Json::Value pause(Json::objectValue);
    pause["paused"] = resumeTime == 0 || (resumeTime > 0 && time(nullptr) < resumeTime);
    pause["resume_time"] = static_cast<Json::Int64>(resumeTime);
    return pause;
}

// A queue file's lines and records per prefix; a file that cannot be read holds none.
detail::QueueAnswer ReadQueueFile(const std::string& file, const std::vector<std::string>& prefixes) {
    detail::QueueAnswer answer;
    if (!file.empty()) detail::ReadQueue(file, prefixes, answer);
    return answer;
}

Json::Value ShareProgress(const std::string& share, const std::vector<Folder>& folders) {
    Json::Value entry(Json::objectValue);
    entry["share"] = share;
    std::string queuePath;
    if (!detail::ShareQueuePath(share, queuePath)) queuePath.clear();
    std::vector<std::string> prefixes;  // "<full path>/", empty where a folder does not resolve
    for (const auto& folder : folders) prefixes.push_back(folder.full_path.empty() ? "" : folder.full_path + "/");
    detail::QueueAnswer queue = ReadQueueFile(queuePath, prefixes);
    detail::QueueAnswer companion = ReadQueueFile(queuePath.empty() ? queuePath : queuePath + ".tmp", prefixes);
    entry["unread"] = Json::Value(Json::arrayValue);
    if (queue.refused) entry["unread"].append("queue");
    if (companion.refused) entry["unread"].append("companion");
    entry["queue"] = static_cast<Json::Int64>(queue.lines);
    entry["companion"] = static_cast<Json::Int64>(companion.lines);
    entry["pending"] = static_cast<Json::Int64>(queue.lines + companion.lines);
    entry["files"] = static_cast<Json::Int64>(queue.all.files + companion.all.files);
    entry["folders"] = Json::Value(Json::arrayValue);
    for (size_t i = 0; i < folders.size(); ++i) {
        Json::Value folder(Json::objectValue);
        folder[Json::StaticString("path")] = folders[i].path;
        folder[Json::StaticString("pending")] = static_cast<Json::Int64>(queue.under[i].records + companion.under[i].records);
        folder[Json::StaticString("files")] = static_cast<Json::Int64>(queue.under[i].files + companion.under[i].files);
        entry["folders"].append(std::move(folder));
    }
    return entry;
}

}  // namespace

bool GetProgress(Json::Value& out) {
    Folders folders;
    std::vector<Folder> all;
    long long resumeTime = -1;
    if (!folders.Load() || !folders.List(all) || !StatusMgr::GetPauseInfo(resumeTime)) return false;
    std::map<std::string, std::vector<Folder>> byShare;
    for (auto& folder : all) {
        std::string share;
        if (GetShareNameByPath(share, folder.path)) byShare[share].push_back(std::move(folder));
    }
    out = Json::Value(Json::objectValue);
    out["pause"] = PauseOf(resumeTime);
    out["shares"] = Json::Value(Json::arrayValue);
    for (const auto& [share, shareFolders] : byShare) out["shares"].append(ShareProgress(share, shareFolders));
    return true;
}

}  // namespace FILEINDEX
}  // namespace QIRA
