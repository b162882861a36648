#include "search_view.h"

#include <algorithm>
#include <vector>

#include "fileindex/fileindex.h"
#include "output.h"
#include "search_index.h"
#include "service_view.h"

namespace tools {
namespace {

// The shares to search: the one asked for, or every share holding indexed folders.
std::vector<std::string> SharesToSearch(const std::string& share) {
    if (!share.empty()) return {share};
    std::vector<QIRA::FILEINDEX::Folder> folders;
    QIRA::FILEINDEX::IndexMgr::List(folders);
    return SharesOf(folders);
}

Json::Value SnippetJson(const std::vector<std::pair<std::string, bool>>& pieces) {
    Json::Value snippet(Json::arrayValue);
    for (const auto& [text, match] : pieces) {
        Json::Value piece(Json::objectValue);
        piece["text"] = text;
        piece["match"] = match;
        snippet.append(piece);
    }
    return snippet;
}

}  // namespace

bool IsSearchType(const std::string& type) {
    return type.empty() || type == "document" || type == "audio" || type == "video" || type == "photo";
}

bool SearchShares(const SearchRequest& request, Json::Value& out, std::string& error) {
    if (!IsSearchType(request.type)) {
        error = "unknown type \"" + request.type + "\"; use document, audio, video or photo";
        return false;
    }
    if (MatchExpression(request.query).empty()) {
        error = "the query holds no word";
        return false;
    }
    std::vector<std::pair<std::string, SearchHit>> hits;
    for (const auto& share : SharesToSearch(request.share)) {
        char dbDir[4096];
        if (FILEIDXDBPathGet(share.c_str(), dbDir, sizeof dbDir) < 0) continue;
        std::string openError;
        const auto index = SearchIndex::Open(dbDir, false, openError);
        std::vector<SearchHit> found;
        if (!index || !index->Search(request.query, request.type, request.limit, found, error)) continue;
        for (auto& hit : found) hits.emplace_back(share, std::move(hit));
    }
    std::stable_sort(hits.begin(), hits.end(), [](const auto& a, const auto& b) { return a.second.rank < b.second.rank; });
    if (hits.size() > static_cast<size_t>(request.limit)) hits.resize(static_cast<size_t>(request.limit));
    out = Json::Value(Json::objectValue);
    out["hits"] = Json::Value(Json::arrayValue);
    for (const auto& [share, hit] : hits) {
        Json::Value entry(Json::objectValue);
        entry["share"] = share;
        entry["path"] = hit.path;
        entry["type"] = hit.type;
        entry["size"] = static_cast<Json::Int64>(hit.size);
        entry["mtime"] = static_cast<Json::Int64>(hit.mtime);
        entry["mtime_utc"] = FormatUtc(hit.mtime);
        entry["snippet"] = SnippetJson(hit.snippet);
        out["hits"].append(entry);
    }
    return true;
}

}  // namespace tools
