// Reading a folder's stored members, shared by Folder::Load and the folder list's load.
#pragma once

#include <json/value.h>

#include "fileindex/folder.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {

// Takes "name" and the four flags from `obj` where they have exactly the right JSON type.
void MergeFolderFields(Folder& folder, const Json::Value& obj);

// True when a folder whose full path is `folderFullPath` governs `fullPath`: the folder itself or
// beneath it, compared with one "/" appended to both; an unresolved (empty) folder never does.
bool Governs(const std::string& folderFullPath, const std::string& fullPath);

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
