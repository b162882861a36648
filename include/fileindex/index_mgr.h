// IndexMgr: what is indexed. Queries, folder upsert / delete / reindex, the life of shares and
// the notification daemon's monitor queues.
//
// Every operation loads folder.conf afresh and keeps nothing between calls. Writers (Upsert,
// Delete, ShareRemove, ShareRename) hold the exclusive folder.conf lock from before the load
// until they return, across every side effect; the lock is fail-fast (error 9 at once when
// another process or another thread of this process holds it). A writer saves folder.conf once,
// before its side effects (monitor registrations, service start or stop, Spotlight, daemon
// commands, queue events): a false return after the save leaves folder.conf changed, with no
// rollback; the steps after the failed one did not run. Failures log to the system log; error
// codes are listed per operation; a failure may set none, and then the log tells the cause.
// Paths are share paths ("/share/dir"); full paths are on the volume.
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

    // --- Queries: folder.conf read without a lock (except Get); errors 6 or 8 when it cannot be
    // read, and then the membership questions answer false. A path or share name holding a NUL
    // byte: false, error 1. ---
    static bool List(std::vector<Folder>& out);
    // The sorted, paged listing {"total", "offset", "folder"}. An offset above the number of
    // folders yields an empty page; DESC is the first `limit` records reversed (the offset only
    // shortens the page). Unknown additional facts set error 1 and are left out.
    static bool List(Json::Value& out, unsigned long offset, unsigned long limit, const std::string& sort_by,
                     const std::string& sort_direction, const Json::Value& additional);
    // Takes the exclusive lock briefly (error 9 when held); error 4 for an unknown path.
    static bool Get(Json::Value& out, const std::string& path);
    static bool IsShareIndexed(const std::string& share);
    static bool IsPathIndexed(const std::string& path);
    static bool IsPathContainIndexed(const std::string& path);
    static bool IsFullPathIndexed(const std::string& full_path);
    // The same questions over a list the caller holds; no file access.
    static bool IsPathIndexed(const std::string& path, const std::vector<Folder>& list);
    static bool IsPathContainIndexed(const std::string& path, const std::vector<Folder>& list);
    static bool IsFullPathIndexed(const std::string& full_path, const std::vector<Folder>& list);

    // --- Folder changes (writers, see above) ---
    // `folders`: an array of {"path", "name", "document", "audio", "video", "photo"}. A path must
    // be a canonical share path (no empty, "." or ".." component, no trailing "/", within
    // PATH_MAX); others fail with error 1, since a path stored in another spelling would never
    // match the paths that queries and events compare it with.
    // Errors: 1 (bad request, nothing saved), 5 (too many folders, nothing saved), 6/8/9 (before
    // anything changes), 7 (save failed), 2 (a path stopped resolving after the save); a
    // registration, service or daemon failure sets none (folder.conf already saved), and so does
    // a changed-setting event that could not be queued (its share is then marked need-reindex).
    static bool Upsert(const Json::Value& folders);
    static bool Set(const Json::Value& folders);
    static bool Add(const Json::Value& folders);
    // Queues the changed-setting event 131072 for the folder's full path. No lock. Error 2 when
    // the path does not resolve; a queue failure sets none (the share is marked need-reindex).
    static bool Update(const std::string& path, const Json::Value& changes);
    // `paths`: an array of share-path strings; any other element, or one holding a NUL byte,
    // fails with error 1 ("Bad param") before anything changes. Errors otherwise as Upsert.
    static bool Delete(const Json::Value& paths);
    // `paths`: an array of canonical share paths in shares that hold indexed folders; anything
    // else fails (error 1 for a malformed element, none for a share without folders) before
    // anything is revived or queued. No lock of folder.conf; revives out-of-space shares (status
    // lock, briefly) and queues event 65536 per path; error 2 for a path that stops resolving,
    // events queued before it stay. An event that cannot be queued (AddCustomEvent: a queue held
    // for about a second, or unwritable) fails the call with no error code, its share marked
    // need-reindex.
    static bool Reindex(const Json::Value& paths);

    // --- Share lifecycle ---
    // Drop (ShareRemove) or move (ShareRename) every folder of the share: writers as above,
    // saved once at the end, so a failure changes nothing. A share name holding a NUL byte:
    // error 1. ShareRemove stops fileindexd and Spotlight when no folder is left (failures only
    // logged). Neither touches status.conf, the daemon or the monitor queues.
    static bool ShareRemove(const std::string& share);
    static bool ShareRename(const std::string& oldName, const std::string& newName);
    // Daemon command, then monitor removal (Pause); monitor set-up, then daemon command (Resume).
    // No lock; no error code of their own.
    static bool SharePause(const std::string& share);
    static bool ShareResume(const std::string& share);
    // Removes the share's queue files and index database through a handle on the share's own
    // "@eaDir", opened without following a link; nothing outside that directory can be touched.
    // No path is resolved again and no program is run, so a link a share's user plants in
    // "@eaDir" cannot turn the removal elsewhere. A database tree deeper than 64 levels is removed
    // only to that depth.
    // No lock; false only when the share's storage paths cannot be formed.
    static bool CleanShareIndexData(const std::string& share);

    // --- Monitor queues of qiranotifyd: read folder.conf without a lock (writers call them
    // while they hold it); no error code of their own. ---
    static bool UpsertQIRANotifydCfg(const std::string& share);
    static bool DeleteQIRANotifydCfg(const std::string& share);
};

}  // namespace FILEINDEX
}  // namespace QIRA
