// The index manager: what is indexed, folder upsert / delete / reindex, share lifecycle and the
// notification daemon's monitor queues.
#pragma once

#include "fileindex/export.h"

#include <string>
#include <vector>

#include <json/value.h>

#include "fileindex/folder.h"

namespace QIRA {
namespace FILEINDEX {

class FILEINDEX_EXPORT IndexMgr {
public:
    IndexMgr() = delete;

    // --- Queries (folder.conf read without lock, except Get) ---
    static bool List(std::vector<Folder>& out);
    // An offset above the number of folders yields an empty page.
    static bool List(Json::Value& out, unsigned long offset, unsigned long limit, const std::string& sort_by,
                     const std::string& sort_direction, const Json::Value& additional);
    static bool Get(Json::Value& out, const std::string& path);
    static bool IsShareIndexed(const std::string& share);
    static bool IsPathIndexed(const std::string& path);
    static bool IsPathContainIndexed(const std::string& path);
    static bool IsFullPathIndexed(const std::string& full_path);
    static bool IsPathIndexed(const std::string& path, const std::vector<Folder>& list);
    static bool IsPathContainIndexed(const std::string& path, const std::vector<Folder>& list);
    static bool IsFullPathIndexed(const std::string& full_path, const std::vector<Folder>& list);

    // --- Folder changes ---
    // `folders`: array of folder objects {"path", "name", "document", "audio", "video", "photo"}.
    static bool Upsert(const Json::Value& folders);
    static bool Set(const Json::Value& folders);
    static bool Add(const Json::Value& folders);
    static bool Update(const std::string& path, const Json::Value& changes);
    // `paths`: array of share-path strings; any other element fails with error 1 ("Bad param")
    // before anything changes.
    static bool Delete(const Json::Value& paths);
    // `paths`: array of share-path strings.
    static bool Reindex(const Json::Value& paths);

    // --- Share lifecycle ---
    static bool ShareRemove(const std::string& share);
    static bool ShareRename(const std::string& oldName, const std::string& newName);
    static bool SharePause(const std::string& share);
    static bool ShareResume(const std::string& share);
    // Removes the share's queue files and index database through a handle on the share's own
    // "@eaDir", opened without following a link; nothing outside that directory can be touched.
    // Unlike the original design, which ran "/bin/rm -rf" on each path, no path is resolved again
    // and no program is run. A database tree deeper than 64 levels is removed only to that depth.
    static bool CleanShareIndexData(const std::string& share);

    // --- Monitor queues of qiranotifyd ---
    static bool UpsertQIRANotifydCfg(const std::string& share);
    static bool DeleteQIRANotifydCfg(const std::string& share);
};

}  // namespace FILEINDEX
}  // namespace QIRA
