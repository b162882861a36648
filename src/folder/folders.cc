// folder.conf: load, save, lookups, upsert and delete of the folder map.
#include "fileindex/folders.h"

#include "fileindex/error.h"
#include "fileindex/json.h"
#include "fileindex/utils.h"
#include "log.h"
#include "path_rules.h"
#include "root.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

const char* const kFlagKeys[] = {"document", "audio", "video", "photo"};

// Each flag is true when it is missing on either side or differs.
Json::Value FlagDifference(const Json::Value& a, const Json::Value& b) {
    Json::Value diff(Json::objectValue);
    for (const char* key : kFlagKeys) {
        diff[key] = !a.isMember(key) || !b.isMember(key) || a[key].asBool() != b[key].asBool();
    }
    return diff;
}

}  // namespace

Folders::~Folders() { folders.clear(); }

std::string Folders::GetLockPath() const { return detail::RootPath("/tmp/fileidx_cfg_folder.lock"); }

std::string Folders::GetPath() const { return detail::RootPath("/usr/qira/etc/fileindex/folder.conf"); }

bool Folders::Load() {
    if (!LoadJson()) return false;
    if (!body.isObject()) {
        FILEIDX_LOG("Malformed folders: %s", toString(body).c_str());
        ErrorHandler::SetError(FILEINDEX_ERR_MALFORMED_FOLDERS);
        return false;
    }
    for (auto it = body.begin(); it != body.end(); ++it) {
        const std::string key = it.name();
        if (folders.count(key) != 0) continue;
        Folder folder;
        folder.Load(key, *it);
        folders.emplace(key, folder);
    }
    return true;
}

bool Folders::Save() {
    body = Json::Value(Json::objectValue);
    for (const auto& entry : folders) {
        if (!entry.second.AddToJson(body)) return false;
    }
    return SaveJson();
}

bool Folders::Get(Json::Value& out, const std::string& path) {
    const auto found = folders.find(path);
    if (found == folders.end()) {
        FILEIDX_LOG("No such folder: %s", path.c_str());
        ErrorHandler::SetError(FILEINDEX_ERR_NO_SUCH_FOLDER);
        return false;
    }
    out = found->second.asJson();
    return true;
}

bool Folders::List(std::vector<Folder>& out) { return List(out, std::string()); }

bool Folders::List(std::vector<Folder>& out, const std::string& share) {
    out.clear();
    for (const auto& entry : folders) {
        std::string name;
        if (!share.empty() && (!GetShareNameByPath(name, entry.second.path) || name != share)) continue;
        out.push_back(entry.second);
    }
    return true;
}

bool Folders::Upsert(Json::Value& changed, const Json::Value& request) {
    std::vector<Folder> before;
    List(before);
    std::string path;
    std::string fullPath;
    if (!RetrieveStringFromJsonObj(path, "path", request) || !detail::IsCanonicalSharePath(path) ||
        !GetFullPath(fullPath, path) || !detail::FitsPathMax(fullPath.size())) {
        FILEIDX_LOG("Bad param: %s", toString(request).c_str());
        ErrorHandler::SetError(FILEINDEX_ERR_BAD_PARAM);
        return false;
    }
    const auto existing = folders.find(path);
    Json::Value newCfg;
    if (existing != folders.end()) {
        Folder updated = existing->second;
        updated.Load(path, request);
        existing->second = updated;
        newCfg = updated.asJson();
    } else {
        Folder created;
        created.Reload(path, request);
        folders.emplace(path, created);
        if (folders.size() > MAX_FOLDER_COUNT) {
            FILEIDX_LOG("Exceed max folder size");
            ErrorHandler::SetError(FILEINDEX_ERR_EXCEED_MAX_FOLDER);
            return false;
        }
        newCfg = created.asJson();
    }
    changed = FlagDifference(GetMostSuitableCfg(before, fullPath), newCfg);
    return true;
}

bool Folders::Delete(Json::Value& changed, const std::string& path) {
    std::vector<Folder> before;
    if (!List(before)) return false;
    folders.erase(path);
    std::vector<Folder> after;
    if (!List(after)) return false;
    std::string fullPath;
    if (!GetFullPath(fullPath, path)) return true;
    changed = Json::Value(Json::objectValue);
    changed[path] = FlagDifference(GetMostSuitableCfg(before, fullPath), GetMostSuitableCfg(after, fullPath));
    return true;
}

}  // namespace FILEINDEX
}  // namespace QIRA
