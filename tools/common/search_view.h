// Searching the indexed shares, as fileindexctl and the console offer it.
#pragma once

#include <string>

#include <json/value.h>

namespace tools {

struct SearchRequest {
    std::string query;
    std::string type;   // "document", "audio", "video", "photo", or "" for all
    std::string share;  // one share, or "" for every share holding indexed folders
    int limit = 20;
};

// {"hits": [{"share", "path", "type", "size", "mtime", "mtime_utc", "snippet": [{"text",
// "match"}]}]}, best first across the shares. False with `error` for a query without words or an
// unknown type; a share not indexed yet has no hits.
bool SearchShares(const SearchRequest& request, Json::Value& out, std::string& error);

// The types a search may ask for.
bool IsSearchType(const std::string& type);

}  // namespace tools
