#include "search_view.h"

#include <algorithm>
#include <chrono>

#include "fileindex/fileindex.h"
#include "fileindex/json.h"
#include "search_index.h"
#include "search_query.h"
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
    Json::Value fields;
    entry["fields"] = QIRA::FILEINDEX::fromString(fields, hit.fields) && fields.isObject() ? fields : Json::Value(Json::objectValue);
    return entry;
}

// The order of hits from several shares, as each share sorted its own.
bool Before(const std::string& sort, const SearchHit& a, const SearchHit& b) {
    if (sort == "date") return a.mtime != b.mtime ? a.mtime > b.mtime : a.path < b.path;
    if (sort == "name") {
        const std::string nameA = a.path.substr(a.path.rfind('/') + 1), nameB = b.path.substr(b.path.rfind('/') + 1);
        return nameA != nameB ? nameA < nameB : a.path < b.path;
    }
    return a.rank < b.rank;
}

// Adds one share's facets to the sum, then keeps the commonest values of each.
void AddFacets(Json::Value& sum, const Json::Value& facets) {
    for (const auto& name : facets.getMemberNames()) {
        for (const auto& value : facets[name].getMemberNames()) {
            sum[name][value] = static_cast<Json::Int64>(sum[name][value].asInt64() + facets[name][value].asInt64());
        }
    }
}

Json::Value TopFacets(const Json::Value& sum) {
    Json::Value top(Json::objectValue);
    for (const auto& name : {"type", "year", "artist", "camera"}) {
        std::vector<std::pair<long long, std::string>> counts;
        for (const auto& value : sum[name].getMemberNames()) counts.emplace_back(-sum[name][value].asInt64(), value);
        std::sort(counts.begin(), counts.end());
        top[name] = Json::Value(Json::objectValue);
        for (size_t i = 0; i < counts.size() && i < static_cast<size_t>(kMaxFacetValues); ++i) {
            top[name][counts[i].second] = static_cast<Json::Int64>(-counts[i].first);
        }
    }
    return top;
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
               Json::Value& facets, Cause& cause) {
    IndexProblem problem = IndexProblem::None;
    const auto index = OpenShareIndex(target.share, target.shareDir, kSearchBudget, problem, cause);
    if (!index) return false;
    std::string error;
    const int wanted = request.offset + request.limit;
    // Fewer hits than asked for are all there are: no need to count them.
    if (index->Search(request.query, request.type, wanted, hits, error, request.sort) &&
        (hits.size() < static_cast<size_t>(wanted) ? (total = static_cast<long long>(hits.size()), true)
                                                    : index->CountHits(request.query, request.type, total, error)) &&
        (!request.facets || index->Facets(request.query, request.type, facets, error))) {
        return true;
    }
    cause = IndexCause(index->LastProblem(), target.share, error);
    return false;
}

}  // namespace

bool IsSearchType(const std::string& type) {
    return type.empty() || IsSearchTypeName(type);
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
    if (error.empty() && request.sort != "relevance" && request.sort != "date" && request.sort != "name") {
        error = "unknown sort \"" + request.sort + "\"; use relevance, date or name";
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
    Json::Value facetSum(Json::objectValue);
    out = Json::Value(Json::objectValue);
    out["incomplete"] = Json::Value(Json::arrayValue);
    bool searched = false;
    for (const auto& target : targets) {
        std::vector<SearchHit> found;
        long long count = 0;
        Json::Value facets(Json::objectValue);
        Cause failed;
        if (!SearchOne(request, target, found, count, facets, failed)) {
            if (out["incomplete"].empty()) cause = failed;
            out["incomplete"].append(CauseJson(target.share, failed));
            continue;
        }
        searched = true;
        total += count;
        AddFacets(facetSum, facets);
        if (target.rebuilding) {
            out["incomplete"].append(CauseJson(target.share, {"INDEX_REBUILDING", 0,
                                                              "the index of share " + target.share +
                                                                  " is being rebuilt: some files may be missing",
                                                              200}));
        }
        for (auto& hit : found) hits.emplace_back(target.share, std::move(hit));
    }
    if (!searched && !targets.empty()) return false;
    std::stable_sort(hits.begin(), hits.end(),
                     [&request](const auto& a, const auto& b) { return Before(request.sort, a.second, b.second); });
    hits.erase(hits.begin(), hits.begin() + std::min(hits.size(), static_cast<size_t>(request.offset)));
    if (hits.size() > static_cast<size_t>(request.limit)) hits.resize(static_cast<size_t>(request.limit));
    out["total"] = static_cast<Json::Int64>(total);
    out["offset"] = request.offset;
    out["hits"] = Json::Value(Json::arrayValue);
    for (const auto& [share, hit] : hits) out["hits"].append(HitJson(share, hit));
    if (request.facets) out["facets"] = TopFacets(facetSum);
    return true;
}

bool SearchShares(const SearchRequest& request, Json::Value& out, Cause& cause) {
    std::vector<SearchTarget> targets;
    return SearchTargets(request, targets, cause) && SearchIndexes(request, targets, out, cause);
}

}  // namespace tools
