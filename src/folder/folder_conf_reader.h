// folder.conf read with simdjson where it gives jsoncpp's answer for sure.
//
// The reading the file is held to is strict JSON through jsoncpp (Config::LoadJson). The fast
// reading answers only for a file that simdjson accepts, whose top level is an object without
// repeated names and not deeply nested; anything else is left to the strict reading.
#pragma once

#include <map>
#include <string>

#include "fileindex/folder.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {

// The folders of folder.conf text as Folders::Load reads them (name and flags merged over an
// empty record; path and full path not set), keyed by member name. False when not sure.
bool ReadFolderConfFast(const std::string& text, std::map<std::string, Folder>& folders);

// The same through jsoncpp's strict reading; false when the text is not JSON or not an object.
bool ReadFolderConfStrict(const std::string& text, std::map<std::string, Folder>& folders);

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
