// Share and path services: path conversion, indexability rules, daemon channel, custom events,
// no-space notice and configuration migration.
#pragma once

#include <string>
#include <vector>

#include <json/value.h>

#include "fileindex/folder.h"

struct _tag_QIRASHARE;

namespace QIRA {
namespace FILEINDEX {

// --- Path and share resolution -------------------------------------------------------------
// A share path is "/share/dir..."; the first character is dropped without being checked.
bool GetShareNameByPath(std::string& shareName, const std::string& path);
// Share path to full path: the share's own path up to its last "/" followed by `path`.
bool GetFullPath(std::string& fullPath, const std::string& path);
bool GetShareNamePathByFullPath(std::string& shareName, std::string& sharePath, const std::string& fullPath);
std::string ReplaceShareName(const std::string& path, const std::string& newShareName);
bool StringStartWith(const std::string& str, const std::string& prefix);
// lstat based: a symbolic link is neither a file nor a directory here.
bool IsFileExist(const std::string& path);
bool IsDirExist(const std::string& path);
// Assign and return true only when `obj` is an object whose member `key` has exactly that type.
bool RetrieveBoolFromJsonObj(bool& value, const std::string& key, const Json::Value& obj);
bool RetrieveStringFromJsonObj(std::string& value, const std::string& key, const Json::Value& obj);

// --- Indexability rules ----------------------------------------------------------------------
bool IsSystemPreservedFileName(const std::string& name);
// True means: do not index this full path.
bool IsSkipIndex(const std::string& fullPath);
bool CanShareBeIndexed(_tag_QIRASHARE* share);
bool CanPathBeIndexed(const std::string& path);
bool CanFullPathBeIndexed(const std::string& fullPath);
// False only when the platform says there is no room for 10 MiB (no space or quota exceeded).
bool IsShareSpaceEnough(const std::string& shareName);
// The JSON form of the last folder in `folders` whose full path contains `fullPath` ("/"
// boundary); an empty object when none does.
Json::Value GetMostSuitableCfg(std::vector<Folder> folders, const std::string& fullPath);

// --- Daemon command channel ------------------------------------------------------------------
// Sends {"type": type, "data": data} to fileindexd; true when the whole frame was written.
// Unlike the original design, which set it after connecting, the 1-second send time-out is set
// before the connect, so a daemon that listens but never accepts fails the call within a second.
bool SendCammandToDaemon(const std::string& type, const Json::Value& data);

// --- Custom event queue ----------------------------------------------------------------------
constexpr int kEventReindex = 0x10000;
constexpr int kEventFolderSettingChanged = 0x20000;
// Appends {"event", "path", "data"} to the queue of the share holding the full path `path`.
// When the event cannot be queued the share is marked for reindexing and false is returned.
// The queue, its "@eaDir" and the ".tmp" companion are opened without following links.
bool AddCustomEvent(const int& event, const std::string& path, const Json::Value& data);

// --- No-space notice and migration -----------------------------------------------------------
bool NotifyNoSpace();
bool Updater_lum60_beta2();

}  // namespace FILEINDEX
}  // namespace QIRA
