// Folders as the tools show them: why one cannot be indexed, in the listing and after a change.
#pragma once

#include <string>

#include <json/value.h>

namespace tools {

// The rule that refuses to index the share path `path`, or "" when it can be indexed.
std::string RefusingRule(const std::string& path);

// A folder that cannot be indexed carries the library's status word "paused"; this adds the
// refusing rule to such a folder's additional facts as "refused_by", for each folder of the
// listing (or one folder's facts) that has a status.
void AddRefusingRule(Json::Value& additional, const std::string& path);
void AddRefusingRules(Json::Value& listing);

// "not indexable: <rule>" for such a folder, else the status word.
std::string StatusText(const Json::Value& additional);

// For the folders of an upsert request that cannot be indexed now: "<path> cannot be indexed
// now: <problem> (<rule>); ...", one string each.
Json::Value IndexabilityWarnings(const Json::Value& request);

}  // namespace tools
