// JSON conveniences over jsoncpp, used for every file, request, message and queue record.
//
// Reading is strict JSON: no comments, no trailing commas, nothing but white space after the
// value, and at most 256 levels of nesting, so hostile input cannot exhaust the stack. Any
// top-level value is accepted. None of these functions throws.
#pragma once

#include "fileindex/export.h"

#include <string>

#include <json/value.h>

namespace QIRA {
namespace FILEINDEX {

constexpr unsigned kJsonNestingLimit = 256;

// Parses a whole file into `out`; false when it cannot be read or is not valid JSON.
FILEINDEX_EXPORT bool fromFile(Json::Value& out, const std::string& path);
// Replaces the file atomically: a temporary file in the same directory is written, flushed to
// disk and renamed over `path`. Readers see the old or the new document, never a part.
FILEINDEX_EXPORT bool toFile(const Json::Value& value, const std::string& path);
// Parses `text` into `out`; false on any error.
FILEINDEX_EXPORT bool fromString(Json::Value& out, const std::string& text);
// Serialises `value` as one line of compact JSON (UTF-8 kept as it is).
FILEINDEX_EXPORT std::string toString(const Json::Value& value);

}  // namespace FILEINDEX
}  // namespace QIRA
