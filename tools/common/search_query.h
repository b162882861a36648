// A search as people type it: words, each the start of a word of a file's name, path, text or
// text fields, and filters "field:value", all required.
//
//   type:document|audio|video|photo
//   title: author: artist: album: genre: camera:   a word, or "words in quotes", each the start
//                                                  of a word of the field (camera: make or model)
//   year: pages:                                   N, a..b (both ends included), >N, <N
//   size:                                          the same, N in bytes or with K, M, G, T (1024s)
//   duration:                                      the same, N in seconds or with s, m, h, or h:mm:ss
//   taken: modified:                               the same, N a date YYYY, YYYY-MM or YYYY-MM-DD
//                                                  (UTC), the whole period: >2019 is from 2020 on
#pragma once

#include <string>
#include <variant>
#include <vector>

namespace tools {

using QueryParam = std::variant<std::string, long long>;

struct SearchQuery {
    std::string match;                // the FTS5 expression of the words; "" when there are none
    std::string where = "1";          // conditions on the files row "f", each "?" a parameter
    std::vector<QueryParam> params;   // in the order of the "?"
    bool Empty() const { return match.empty() && params.empty() && where == "1"; }
};

// The four kinds a file is indexed as.
bool IsSearchTypeName(const std::string& type);

// False with `error` naming the part that is wrong: the bounds of a query (bytes, words), an
// unknown field, a value a field cannot take, or nothing to search for.
bool ParseSearchQuery(const std::string& text, SearchQuery& query, std::string& error);

}  // namespace tools
