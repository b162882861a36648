// Why a share path is or is not indexed: the indexability rules one by one, the governing folder,
// the share's flags and what is pending for the path.
#include "fileindex/explain.h"

#include "fileindex/folders.h"
#include "fileindex/index_mgr.h"
#include "fileindex/status_mgr.h"
#include "fileindex/utils.h"
#include "indexability_rules.h"
#include "path_rules.h"
#include "queue_count.h"
#include "queue_file.h"

namespace QIRA {
namespace FILEINDEX {
namespace {

constexpr char kSharePathRule[] = "share_path";

Json::Value RulesJson(const std::vector<detail::RuleVerdict>& verdicts, Json::Value& refusedBy) {
    Json::Value rules(Json::arrayValue);
    refusedBy = Json::Value();
    for (const auto& verdict : verdicts) {
        Json::Value rule(Json::objectValue);
        rule["rule"] = verdict.rule;
        rule["description"] = verdict.description;
        rule["verdict"] = verdict.verdict;
        rule["facts"] = verdict.facts;
        rules.append(rule);
        if (refusedBy.isNull() && verdict.verdict == "refuse") refusedBy = verdict.rule;
    }
    return rules;
}

// The share path's own rule, before those of its full path.
std::vector<detail::RuleVerdict> Verdicts(const std::string& share, const std::string& fullPath, bool resolved) {
    Json::Value facts(Json::objectValue);
    facts["share"] = share;
    facts["found"] = resolved;
    std::vector<detail::RuleVerdict> verdicts = {
        {kSharePathRule, "a share path whose share is unknown", resolved ? "pass" : "refuse", facts}};
    if (resolved) {
        detail::EvaluateFullPath(fullPath, &verdicts);
    } else {
        for (const auto& [rule, description] : detail::IndexabilityRules()) {
            verdicts.push_back({rule, description, "not_evaluated", Json::Value()});
        }
    }
    return verdicts;
}

Json::Value Pending(const std::string& share, const std::string& fullPath) {
    Json::Value pending(Json::objectValue);
    pending["queue"] = 0;
    pending["companion"] = 0;
    pending["unread"] = Json::Value(Json::arrayValue);
    std::string queuePath;
    if (fullPath.empty() || !detail::ShareQueuePath(share, queuePath)) return pending;
    const std::string prefix = fullPath + "/";
    for (const auto& [role, file] : {std::pair{"queue", queuePath}, std::pair{"companion", queuePath + ".tmp"}}) {
        bool refused = false;
        pending[role] = static_cast<Json::Int64>(detail::CountRecordsUnder(file, {prefix}, &refused)[prefix]);
        if (refused) pending["unread"].append(role);
    }
    return pending;
}

}  // namespace

bool ExplainPath(const std::string& path, Json::Value& out) {
    if (!detail::NulFree(path)) return false;
    Folders folders;
    std::vector<Folder> all;
    if (!folders.Load() || !folders.List(all)) return false;
    std::string share;
    GetShareNameByPath(share, path);
    std::string fullPath;
    const bool resolved = !path.empty() && GetFullPath(fullPath, path);

    out = Json::Value(Json::objectValue);
    out["path"] = path;
    out["share"] = share;
    out["full_path"] = resolved ? Json::Value(fullPath) : Json::Value();
    out["rules"] = RulesJson(Verdicts(share, fullPath, resolved), out["refused_by"]);
    out["indexable"] = out["refused_by"].isNull();
    const Json::Value governing = resolved ? GetMostSuitableCfg(all, fullPath) : Json::Value(Json::objectValue);
    out["governing_folder"] = governing.isMember("path") ? governing : Json::Value();
    out["inside_indexed_folder"] = IndexMgr::IsPathIndexed(path, all);
    out["contains_indexed_folder"] = IndexMgr::IsPathContainIndexed(path, all);
    out["share_flags"]["no_space"] = StatusMgr::ShareIsNoSpace(share);
    out["share_flags"]["need_reindex"] = StatusMgr::ShareIsNeedReindex(share);
    out["status"] = StatusMgr::GetFolderStatus(path);
    out["pending"] = Pending(share, resolved ? fullPath : "");
    return true;
}

}  // namespace FILEINDEX
}  // namespace QIRA
