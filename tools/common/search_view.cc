#include "search_view.h"

#include <algorithm>
#include <chrono>

#include "fileindex/fileindex.h"
#include "search_index.h"
#include "service_view.h"
#include "share_index.h"
#include "text_safety.h"
#include "time_text.h"

namespace tools {
namespace {

// How long one share's search may take.
constexpr std::chrono::seconds kSearchBudget{2};
const char kReplacement[] = "\xEF\xBF\xBD";  // U+FFFD

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
        piece["text"] = ValidUtf8(text, kReplacement);
        piece["match"] = match;
        snippet.append(piece);
    }
    return snippet;
}

Json::Value HitJson(const std::string& share, const SearchHit& hit) {
    Json::Value entry(Json::objectValue);
    entry["share"] = share;
    entry["path"] = ValidUtf8(hit.path, kReplacement);
    if (!IsValidUtf8(hit.path) || hit.path.find('\0') != std::string::npos) entry["path_hex"] = Hex(hit.path);
    entry["type"] = hit.type;
    entry["size"] = static_cast<Json::Int64>(hit.size);
    entry["mtime"] = static_cast<Json::Int64>(hit.mtime);
    entry["mtime_utc"] = FormatUtc(hit.mtime);
    entry["snippet"] = SnippetJson(hit.snippet);
    return entry;
}

Json::Value CauseJson(const std::string& share, const Cause& cause) {
    Json::Value entry(Json::objectValue);
    entry["share"] = share;
    entry["cause"] = cause.name;
    entry["message"] = cause.text;
    return entry;
}

// One share's best hits up to the end of the page asked for, and how many it has in all; false
// with `cause` when its index cannot be read.
bool SearchOne(const SearchRequest& request, const SearchTarget& target, std::vector<SearchHit>& hits, long long& total,
               Cause& cause) {
    IndexProblem problem = IndexProblem::None;
    const auto index = OpenShareIndex(target.share, target.shareDir, kSearchBudget, problem, cause);
    if (!index) return false;
    std::string error;
    if (index->Search(request.query, request.type, request.offset + request.limit, hits, error) &&
        index->CountHits(request.query, request.type, total, error)) {
        return true;
    }
    cause = IndexCause(index->LastProblem(), target.share, error);
    return false;
}

}  // namespace

bool IsSearchType(const std::string& type) {
    return type.empty() || type == "document" || type == "audio" || type == "video" || type == "photo";
}

bool SearchTargets(const SearchRequest& request, std::vector<SearchTarget>& targets, Cause& cause) {
    if (!IsSearchType(request.type)) {
        cause = {"BAD_QUERY", 0, "unknown type \"" + request.type + "\"; use document, audio, video or photo", 400};
        return false;
    }
    std::string error = QueryError(request.query);
    if (error.empty() && (request.offset < 0 || request.offset > kMaxSearchOffset)) {
        error = "the offset must be 0 to " + std::to_string(kMaxSearchOffset);
    }
    if (!error.empty()) {
        cause = {"BAD_QUERY", 0, error, 400};
        return false;
    }
    targets.clear();
    for (const auto& share : SharesToSearch(request.share)) {
        SearchTarget target{share, "", QIRA::FILEINDEX::StatusMgr::ShareIsNeedReindex(share)};
        if (!QIRA::FILEINDEX::GetFullPath(target.shareDir, "/" + share)) target.shareDir.clear();
        targets.push_back(target);
    }
    return true;
}

bool SearchIndexes(const SearchRequest& request, const std::vector<SearchTarget>& targets, Json::Value& out,
                   Cause& cause) {
    std::vector<std::pair<std::string, SearchHit>> hits;
    long long total = 0;
    out = Json::Value(Json::objectValue);
    out["incomplete"] = Json::Value(Json::arrayValue);
    bool searched = false;
    for (const auto& target : targets) {
        std::vector<SearchHit> found;
        long long count = 0;
        Cause failed;
        if (!SearchOne(request, target, found, count, failed)) {
            if (out["incomplete"].empty()) cause = failed;
            out["incomplete"].append(CauseJson(target.share, failed));
            continue;
        }
        searched = true;
        total += count;
        if (target.rebuilding) {
            out["incomplete"].append(CauseJson(target.share, {"INDEX_REBUILDING", 0,
                                                              "the index of share " + target.share +
                                                                  " is being rebuilt: some files may be missing",
                                                              200}));
        }
        for (auto& hit : found) hits.emplace_back(target.share, std::move(hit));
    }
    if (!searched && !targets.empty()) return false;
    std::stable_sort(hits.begin(), hits.end(), [](const auto& a, const auto& b) { return a.second.rank < b.second.rank; });
    hits.erase(hits.begin(), hits.begin() + std::min(hits.size(), static_cast<size_t>(request.offset)));
    if (hits.size() > static_cast<size_t>(request.limit)) hits.resize(static_cast<size_t>(request.limit));
    out["total"] = static_cast<Json::Int64>(total);
    out["offset"] = request.offset;
    out["hits"] = Json::Value(Json::arrayValue);
    for (const auto& [share, hit] : hits) out["hits"].append(HitJson(share, hit));
    return true;
}

bool SearchShares(const SearchRequest& request, Json::Value& out, Cause& cause) {
    std::vector<SearchTarget> targets;
    return SearchTargets(request, targets, cause) && SearchIndexes(request, targets, out, cause);
}

}  // namespace tools
