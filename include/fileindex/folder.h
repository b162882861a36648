// One indexed folder: share path, display name and the four media-type switches.
#pragma once

#include "fileindex/export.h"

#include <string>

#include <json/value.h>

namespace QIRA {
namespace FILEINDEX {

class FILEINDEX_EXPORT Folder {
public:
    std::string full_path;  // cached; empty when the share could not be resolved
    std::string path;       // share path, the key in folder.conf
    std::string name;
    bool document = false;
    bool audio = false;
    bool video = false;
    bool photo = false;

    // Sets `path`, merges the members of `obj` that have the right type, resolves the full path.
    bool Load(const std::string& path, const Json::Value& obj);
    // Clears every field first, so absent members mean empty / false.
    bool Reload(const std::string& path, const Json::Value& obj);
    bool SetPath(const std::string& path);
    std::string GetFullPath() const;

    // {"path", "name", "document", "audio", "video", "photo"}
    Json::Value asJson() const;
    // The same plus "additional" computed for `additional` (an array of fact names).
    Json::Value asJson(const Json::Value& additional) const;
    bool AddToJson(Json::Value& obj) const;

    // "status" (a status word) or "is_valid" (a boolean); any other key sets error 1.
    bool GetAdditional(Json::Value& out, const std::string& key) const;
    // Fills an object with one member per key; a non-array or a non-string key sets error 1.
    bool GetAdditional(Json::Value& out, const Json::Value& keys) const;
};

}  // namespace FILEINDEX
}  // namespace QIRA
