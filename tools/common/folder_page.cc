#include "folder_page.h"

#include <algorithm>
#include <chrono>
#include <map>
#include <memory>

#include "fileindex/fileindex.h"
#include "folder_view.h"
#include "share_index.h"

namespace tools {
namespace {

using QIRA::FILEINDEX::IndexMgr;

constexpr char kIndexedFiles[] = "indexed_files";
constexpr std::chrono::seconds kCountBudget{1};

// The share's index as a search reads it, or null (`missing` when the share has none yet).
std::unique_ptr<SearchIndex> OpenForCounting(const std::string& share, bool& missing) {
    std::string shareDir;
    if (!QIRA::FILEINDEX::GetFullPath(shareDir, "/" + share)) shareDir.clear();
    IndexProblem problem = IndexProblem::None;
    Cause cause;
    auto index = OpenShareIndex(share, shareDir, kCountBudget, problem, cause);
    missing = problem == IndexProblem::Missing;
    return index;
}

// Each folder's files in its share's index, every share's index opened once; none for a share
// without an index yet.
void AddIndexedFiles(Json::Value& listing) {
    std::map<std::string, std::pair<std::unique_ptr<SearchIndex>, bool>> indexes;
    for (auto& folder : listing["folder"]) {
        const std::string path = folder["path"].asString();
        std::string share;
        QIRA::FILEINDEX::GetShareNameByPath(share, path);
        auto found = indexes.find(share);
        if (found == indexes.end()) {
            bool missing = false;
            auto index = OpenForCounting(share, missing);
            found = indexes.emplace(share, std::make_pair(std::move(index), missing)).first;
        }
        const auto& [index, missing] = found->second;
        const long long count = index ? index->CountUnder(path) : missing ? 0 : -1;
        folder["additional"][kIndexedFiles] = count < 0 ? Json::Value() : Json::Value(static_cast<Json::Int64>(count));
    }
}

// The facts of `additional` that the library knows.
Json::Value LibraryFacts(const Json::Value& additional, bool& indexedFiles) {
    Json::Value facts(Json::arrayValue);
    indexedFiles = false;
    for (const auto& name : additional) {
        if (name == kIndexedFiles) indexedFiles = true;
        else facts.append(name);
    }
    return facts;
}

// The library pages DESC as its first records reversed, so descending pages are cut from the
// ascending order here.
bool DescendingPage(Json::Value& out, unsigned long offset, unsigned long limit, const std::string& sortBy,
                    const Json::Value& additional) {
    Json::Value counted;
    if (!IndexMgr::List(counted, 0, 0, sortBy, "ASC", additional)) return false;
    const unsigned long total = counted["total"].asUInt64();
    const unsigned long end = offset < total ? total - offset : 0;
    const unsigned long count = std::min(limit, end);
    if (!IndexMgr::List(out, end - count, count, sortBy, "ASC", additional)) return false;
    Json::Value reversed(Json::arrayValue);
    for (auto i = out["folder"].size(); i-- > 0;) reversed.append(out["folder"][i]);
    out["folder"] = reversed;
    out["offset"] = static_cast<Json::UInt64>(offset);
    return true;
}

}  // namespace

bool IsListingFact(const std::string& name) { return name == "status" || name == "is_valid" || name == kIndexedFiles; }

bool ListFolderPage(Json::Value& out, unsigned long offset, unsigned long limit, const std::string& sortBy, bool descending,
                    const Json::Value& additional) {
    bool indexedFiles = false;
    const Json::Value facts = LibraryFacts(additional, indexedFiles);
    const bool listed = descending ? DescendingPage(out, offset, limit, sortBy, facts)
                                   : IndexMgr::List(out, offset, limit, sortBy, "ASC", facts);
    if (!listed) return false;
    AddRefusingRules(out);
    if (indexedFiles) AddIndexedFiles(out);
    return true;
}

}  // namespace tools
