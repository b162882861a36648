// folder.conf: load, save, lookups, upsert and delete of the folder map.
#include "fileindex/folders.h"

#include "fileindex/error.h"
#include "fileindex/json.h"
#include "fileindex/utils.h"
#include "folder_conf_reader.h"
#include "folder_fields.h"
#include "full_path_resolver.h"
#include "log.h"
#include "strict_json.h"
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

// GetMostSuitableCfg over the map itself, with the same resolutions (and their log lines) of
// folders whose full path is not known.
Json::Value MostSuitableCfg(const std::map<std::string, Folder>& folders, const std::string& fullPath) {
    const Folder* chosen = nullptr;
    for (const auto& entry : folders) {
        const Folder& folder = entry.second;
        const bool governs = folder.full_path.empty() ? detail::Governs(folder.GetFullPath(), fullPath)
                                                      : detail::Governs(folder.full_path, fullPath);
        if (governs) chosen = &folder;
    }
    return chosen ? chosen->asJson() : Json::Value(Json::objectValue);
}

// Adds the folders read from the file, keeping those already in the map, each full path resolved
// with one look-up per share.
void AddLoaded(std::map<std::string, Folder>& folders, std::map<std::string, Folder>& read) {
    detail::FullPathResolver resolver;
    for (auto& [key, folder] : read) {
        if (folders.count(key) != 0) continue;
        folder.path = key;
        resolver.Resolve(key, folder.full_path);
    }
    folders.merge(read);  // moves the nodes; a folder already held stays as it is
}

}  // namespace

Folders::~Folders() { folders.clear(); }

std::string Folders::GetLockPath() const { return detail::RootPath("/tmp/fileidx_cfg_folder.lock"); }

std::string Folders::GetPath() const { return detail::RootPath("/usr/qira/etc/fileindex/folder.conf"); }

bool Folders::Load() {
    std::string text;
    std::map<std::string, Folder> read;
    if (IsFileExist(GetPath()) && detail::ReadWholeFile(GetPath(), text) && detail::ReadFolderConfFast(text, read)) {
        AddLoaded(folders, read);
        return true;
    }
    if (!LoadJson()) return false;
    if (!body.isObject()) {
        FILEIDX_LOG("Malformed folders: %s", toString(body).c_str());
        ErrorHandler::SetError(FILEINDEX_ERR_MALFORMED_FOLDERS);
        return false;
    }
    for (auto it = body.begin(); it != body.end(); ++it) {
        Folder folder;
        detail::MergeFolderFields(folder, *it);
        read.emplace(it.name(), std::move(folder));
    }
    AddLoaded(folders, read);
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
    std::string path;
    std::string fullPath;
    if (!RetrieveStringFromJsonObj(path, "path", request) || !detail::IsCanonicalSharePath(path) ||
        !GetFullPath(fullPath, path) || !detail::FitsPathMax(fullPath.size())) {
        FILEIDX_LOG("Bad param: %s", toString(request).c_str());
        ErrorHandler::SetError(FILEINDEX_ERR_BAD_PARAM);
        return false;
    }
    const auto existing = folders.find(path);
    Folder upserted;
    if (existing != folders.end()) {
        upserted = existing->second;
        upserted.Load(path, request);
    } else {
        upserted.Reload(path, request);
        if (folders.size() >= MAX_FOLDER_COUNT) {
            folders.emplace(path, upserted);  // kept in memory; the caller must not save
            FILEIDX_LOG("Exceed max folder size");
            ErrorHandler::SetError(FILEINDEX_ERR_EXCEED_MAX_FOLDER);
            return false;
        }
    }
    const Json::Value oldCfg = MostSuitableCfg(folders, fullPath);  // the list before the change
    changed = FlagDifference(oldCfg, upserted.asJson());
    folders[path] = std::move(upserted);
    return true;
}

bool Folders::Delete(Json::Value& changed, const std::string& path) {
    const auto found = folders.find(path);
    std::string fullPath;
    if (!GetFullPath(fullPath, path)) {
        if (found != folders.end()) folders.erase(found);
        return true;
    }
    const Json::Value before = MostSuitableCfg(folders, fullPath);
    if (found != folders.end()) folders.erase(found);
    changed = Json::Value(Json::objectValue);
    changed[path] = FlagDifference(before, MostSuitableCfg(folders, fullPath));
    return true;
}

}  // namespace FILEINDEX
}  // namespace QIRA
