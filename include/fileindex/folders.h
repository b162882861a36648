// Folders: folder.conf, the list of indexed folders keyed by share path, in memory.
//
// Nothing here locks: a writer holds Lock(true) around Load, change and Save (see Config).
// Upsert and Delete change only the in-memory map; nothing is written until Save, so a failed
// change followed by no Save leaves the file as it was. Errors: 6 and 8 from Load, 7 from Save,
// 1, 4 and 5 as listed per operation. Not shared between threads.
#pragma once

#include "fileindex/export.h"

#include <map>
#include <string>
#include <vector>

#include <json/value.h>

#include "fileindex/config.h"
#include "fileindex/folder.h"

namespace QIRA {
namespace FILEINDEX {

constexpr size_t MAX_FOLDER_COUNT = 1000;

class FILEINDEX_EXPORT Folders : public Config {
public:
    ~Folders() override;

    bool Load() override;
    bool Save() override;
    std::string GetLockPath() const override;
    std::string GetPath() const override;

    bool Get(Json::Value& out, const std::string& path);
    bool List(std::vector<Folder>& out);
    bool List(std::vector<Folder>& out, const std::string& share);
    // Sorted, paged listing: {"total", "offset", "folder"}. An offset above the number of
    // folders yields an empty page.
    bool List(Json::Value& out, unsigned long offset, unsigned long limit, const std::string& sort_by,
              const std::string& sort_direction, const Json::Value& additional);
    // Adds or updates one folder in memory; `changed` = which media switches changed, judged by
    // the folder that governed the path before. A request without a string "path", with a path
    // that is not a canonical share path or does not resolve: error 1 ("Bad param"), map
    // unchanged. A path with an empty, "." or ".." component, a trailing "/" or beyond PATH_MAX
    // is refused too, since a folder stored in another spelling of its path would never match the
    // paths that queries and events compare it with. A 1001st folder: error 5, the record stays
    // in memory (do not save).
    bool Upsert(Json::Value& changed, const Json::Value& request);
    // Removes one folder in memory (an unknown path is no error); `changed` = {path: which media
    // switches changed}, left untouched when the path does not resolve.
    bool Delete(Json::Value& changed, const std::string& path);

    size_t Count() const { return folders.size(); }

private:
    std::map<std::string, Folder> folders;
};

}  // namespace FILEINDEX
}  // namespace QIRA
