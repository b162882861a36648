// Searching the indexed shares, as fileindexctl and the console offer it.
//
// Who may search what: a search reads a share's index only where the caller may read the share's
// directory itself (its user could list the files anyway); the console answers a search only
// with its token, as it does for changes.
#pragma once

#include <string>
#include <vector>

#include <json/value.h>

#include "cause.h"

namespace tools {

struct SearchRequest {
    std::string query;
    std::string type;   // "document", "audio", "video", "photo", or "" for all
    std::string share;  // one share, or "" for every share holding indexed folders
    int limit = 20;
    int offset = 0;  // best hits skipped, at most kMaxSearchOffset
    std::string sort = "relevance";  // or "date" (newest first) or "name"
    bool facets = false;             // count the hits per type, year, artist and camera
};

// Paging reaches this far into the hits and no further: each share's best offset + limit hits
// are read and merged.
constexpr int kMaxSearchOffset = 10000;

// A share to search, as the library knows it.
struct SearchTarget {
    std::string share;
    std::string shareDir;  // "" when the share does not resolve
    bool rebuilding = false;  // marked need-reindex: the index is being rebuilt
};

// Checks the request and finds its shares through the library (folder.conf, the share table,
// status.conf). False with `cause` for a bad query (BAD_QUERY: ParseSearchQuery's error, an
// offset out of range, an unknown sort) or an unknown type.
bool SearchTargets(const SearchRequest& request, std::vector<SearchTarget>& targets, Cause& cause);

// Searches the targets' indexes, calling nothing of the library (the console runs it beside
// other requests). {"total", "offset", "hits": [{"share", "path", "type", "size", "mtime",
// "mtime_utc", "fields", "snippet": [{"text", "match"}]}], "facets" (when asked: SearchIndex::Facets
// summed over the shares, at most kMaxFacetValues each), "incomplete": [{"share", "cause",
// "message"}]}: "total" counts every hit of the shares searched, "hits" holds those from "offset"
// on, at most the request's limit, in the request's order across the shares, every text valid
// UTF-8; a path that is not UTF-8 carries its bytes in "path_hex".
// "incomplete" names each share whose index could not be read (INDEX_MISSING, INDEX_DAMAGED,
// SEARCH_TIMED_OUT, NOT_PERMITTED: the caller may not read the share's directory) or is being
// rebuilt (INDEX_REBUILDING, searched all the same). False with `cause` when shares were asked
// for and none could be searched: the first share's cause.
bool SearchIndexes(const SearchRequest& request, const std::vector<SearchTarget>& targets, Json::Value& out,
                   Cause& cause);

// Both in turn.
bool SearchShares(const SearchRequest& request, Json::Value& out, Cause& cause);

// The types a search may ask for.
bool IsSearchType(const std::string& type);

}  // namespace tools
