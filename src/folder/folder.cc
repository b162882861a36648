// One indexed folder and its JSON forms.
#include "fileindex/folder.h"

#include "fileindex/error.h"
#include "fileindex/json.h"
#include "fileindex/status_mgr.h"
#include "fileindex/utils.h"
#include "folder_fields.h"
#include "path_rules.h"
#include "log.h"

namespace QIRA {
namespace FILEINDEX {

namespace detail {

void MergeFolderFields(Folder& folder, const Json::Value& obj) {
    RetrieveStringFromJsonObj(folder.name, "name", obj);
    RetrieveBoolFromJsonObj(folder.document, "document", obj);
    RetrieveBoolFromJsonObj(folder.audio, "audio", obj);
    RetrieveBoolFromJsonObj(folder.video, "video", obj);
    RetrieveBoolFromJsonObj(folder.photo, "photo", obj);
}

bool Governs(const std::string& folderFullPath, const std::string& fullPath) {
    return !folderFullPath.empty() && IsWithin(fullPath, folderFullPath);
}

}  // namespace detail

bool Folder::Load(const std::string& newPath, const Json::Value& obj) {
    detail::MergeFolderFields(*this, obj);
    return SetPath(newPath);
}

bool Folder::Reload(const std::string& newPath, const Json::Value& obj) {
    name.clear();
    path.clear();
    document = audio = video = photo = false;
    return Load(newPath, obj);
}

bool Folder::SetPath(const std::string& newPath) {
    path = newPath;
    full_path.clear();  // empty, not stale, when the share does not resolve
    return QIRA::FILEINDEX::GetFullPath(full_path, path);
}

std::string Folder::GetFullPath() const {
    if (!full_path.empty()) return full_path;
    std::string resolved;
    if (!QIRA::FILEINDEX::GetFullPath(resolved, path)) FILEIDX_LOG("Failed to get full path from %s", path.c_str());
    return resolved;
}

Json::Value Folder::asJson() const {
    Json::Value obj(Json::objectValue);
    obj["path"] = path;
    obj["name"] = name;
    obj["document"] = document;
    obj["audio"] = audio;
    obj["video"] = video;
    obj["photo"] = photo;
    return obj;
}

Json::Value Folder::asJson(const Json::Value& additional) const {
    Json::Value obj = asJson();
    if (!GetAdditional(obj["additional"], additional)) FILEIDX_LOG("GetAdditional failed");
    return obj;
}

bool Folder::AddToJson(Json::Value& obj) const {
    if (!obj.isObject()) return false;
    obj[path] = asJson();
    return true;
}

bool Folder::GetAdditional(Json::Value& out, const std::string& key) const {
    if (key == "status") {
        out = StatusMgr::GetFolderStatus(path);
    } else if (key == "is_valid") {
        out = CanPathBeIndexed(path);
    } else {
        FILEIDX_LOG("Unknown additional: %s", key.c_str());
        ErrorHandler::SetError(FILEINDEX_ERR_BAD_PARAM);
        return false;
    }
    return true;
}

bool Folder::GetAdditional(Json::Value& out, const Json::Value& keys) const {
    out = Json::Value(Json::objectValue);
    if (!keys.isArray()) {
        FILEIDX_LOG("Bad param: %s", toString(keys).c_str());
        ErrorHandler::SetError(FILEINDEX_ERR_BAD_PARAM);
        return false;
    }
    for (const auto& key : keys) {
        if (!key.isString()) {
            FILEIDX_LOG("Bad param: %s", toString(key).c_str());
            ErrorHandler::SetError(FILEINDEX_ERR_BAD_PARAM);
            return false;
        }
        const std::string name = key.asString();
        Json::Value& fact = out[name];
        fact = Json::Value();
        if (!GetAdditional(fact, name)) FILEIDX_LOG("Failed to get additional: %s", name.c_str());
    }
    return true;
}

}  // namespace FILEINDEX
}  // namespace QIRA
