// Share and path services: path conversion, indexability rules, daemon channel, custom events,
// no-space notice and configuration migration.
//
// Free functions without state. None takes a configuration lock, except AddCustomEvent's
// fallback (the status lock, to mark the share) and the migration (through what it calls).
// Error codes: 2 when a share cannot be resolved (GetFullPath, GetShareNamePathByFullPath,
// CanPathBeIndexed), 1 for a path or share name holding a NUL byte (the platform would see it cut
// at the NUL); the rest report through their result and the log only.
#pragma once

#include "fileindex/export.h"

#include <string>
#include <vector>

#include <json/value.h>

#include "fileindex/folder.h"

struct _tag_QIRASHARE;

namespace QIRA {
namespace FILEINDEX {

// --- Path and share resolution -------------------------------------------------------------
// A share path is "/share/dir..."; the first character is dropped without being checked.
FILEINDEX_EXPORT bool GetShareNameByPath(std::string& shareName, const std::string& path);
// Share path to full path: the share's own path up to its last "/" followed by `path`.
FILEINDEX_EXPORT bool GetFullPath(std::string& fullPath, const std::string& path);
FILEINDEX_EXPORT bool GetShareNamePathByFullPath(std::string& shareName, std::string& sharePath, const std::string& fullPath);
FILEINDEX_EXPORT std::string ReplaceShareName(const std::string& path, const std::string& newShareName);
FILEINDEX_EXPORT bool StringStartWith(const std::string& str, const std::string& prefix);
// lstat based: a symbolic link is neither a file nor a directory here.
FILEINDEX_EXPORT bool IsFileExist(const std::string& path);
FILEINDEX_EXPORT bool IsDirExist(const std::string& path);
// Assign and return true only when `obj` is an object whose member `key` has exactly that type.
FILEINDEX_EXPORT bool RetrieveBoolFromJsonObj(bool& value, const std::string& key, const Json::Value& obj);
FILEINDEX_EXPORT bool RetrieveStringFromJsonObj(std::string& value, const std::string& key, const Json::Value& obj);

// --- Indexability rules ----------------------------------------------------------------------
FILEINDEX_EXPORT bool IsSystemPreservedFileName(const std::string& name);
// True means: do not index this full path.
FILEINDEX_EXPORT bool IsSkipIndex(const std::string& fullPath);
FILEINDEX_EXPORT bool CanShareBeIndexed(_tag_QIRASHARE* share);
FILEINDEX_EXPORT bool CanPathBeIndexed(const std::string& path);
FILEINDEX_EXPORT bool CanFullPathBeIndexed(const std::string& fullPath);
// False only when the platform says there is no room for 10 MiB (no space or quota exceeded).
FILEINDEX_EXPORT bool IsShareSpaceEnough(const std::string& shareName);
// The JSON form of the last folder in `folders` whose full path contains `fullPath` ("/"
// boundary); an empty object when none does.
FILEINDEX_EXPORT Json::Value GetMostSuitableCfg(std::vector<Folder> folders, const std::string& fullPath);

// --- Daemon command channel ------------------------------------------------------------------
// Sends {"type": type, "data": data} to fileindexd; true when the whole frame was written.
// The 1-second send time-out is set before the connect, so a daemon that listens but never
// accepts fails the call within a second instead of holding the caller and its lock.
FILEINDEX_EXPORT bool SendCammandToDaemon(const std::string& type, const Json::Value& data);

// --- Custom event queue ----------------------------------------------------------------------
constexpr int kEventReindex = 0x10000;
constexpr int kEventFolderSettingChanged = 0x20000;
// Appends {"event", "path", "data"} to the queue of the share holding the full path `path`, as
// one whole line under the queue's exclusive lock; true without writing when the queue or its
// ".tmp" companion already holds a reindex record for exactly `path`. The event lands whole or the
// share is marked need-reindex and false is returned, never neither: a queue whose lock stays held
// is retried with a growing back-off for about one second in all before it is given up, and a
// short write is cut back and given up too, because an event that vanished while the call reported
// success could never be reindexed. A record longer than the queue's readers take (64 KiB) is
// given up the same way. Lock: the queue's, and the status lock to mark the share.
// Sets no error code. The queue, its "@eaDir" and the companion are opened without following
// links.
FILEINDEX_EXPORT bool AddCustomEvent(const int& event, const std::string& path, const Json::Value& data);

// --- No-space notice and migration -----------------------------------------------------------
FILEINDEX_EXPORT bool NotifyNoSpace();
FILEINDEX_EXPORT bool Updater_lum60_beta2();

}  // namespace FILEINDEX
}  // namespace QIRA
