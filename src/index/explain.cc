// Why a share path is or is not indexed: the indexability rules one by one, the governing folder,
// the share's flags and what is pending for the path.
#include "fileindex/explain.h"

#include "fileindex/entry_rules.h"

#include "fileindex/folders.h"
#include "fileindex/index_mgr.h"
#include "fileindex/service_state.h"
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
constexpr char kEntryRule[] = "entry";
constexpr char kEntryDescription[] =
    "what the indexing daemon keeps out beneath a share: too deep, a system name, or a skipped directory on the way";

std::string Quoted(const Json::Value& value) { return "\"" + value.asString() + "\""; }

// What the refusing rule found, in words.
std::string ProblemOf(const detail::RuleVerdict& verdict) {
    const Json::Value& facts = verdict.facts;
    const std::string& rule = verdict.rule;
    const std::string share = Quoted(facts["share"]);
    if (rule == kSharePathRule) return "no share is named " + share;
    if (rule == kEntryRule) return EntryRefusalWords(facts["refusal"].asCString());
    if (rule == "recycle_bin") return "the path lies in the share's recycle bin";
    if (rule == "snapshot") return "the path lies in a snapshot";
    if (rule == "file_system") {
        return "its file system is " + facts["class"].asString() + " (type " + std::to_string(facts["type"].asInt()) + ")";
    }
    if (rule == "share_of_path") return "no share holds the full path";
    if (rule == "share_record") return "the platform does not know share " + share;
    if (rule == "skipped_share_name") return "share " + share + " is never indexed";
    if (rule == "encrypted_share") {
        return facts.isMember("encrypted") ? "share " + share + " is encrypted"
                                           : "the encryption flag of share " + share + " cannot be read";
    }
    if (rule == "read_only_share") {
        return facts["readable"].asBool() ? "share " + share + " is read-only"
                                          : "the read-only flag of share " + share + " cannot be read";
    }
    if (rule == "mount_point") return "the path is a mount point in a share without encryption";
    if (facts.isMember("exists")) return "the directory does not exist";
    if (facts["real_path"].isNull()) return "its real path cannot be worked out: " + facts["error"].asString();
    return "it is not its own real path, " + facts["real_path"].asString() +
           ": a symbolic link, \"..\", or a doubled or trailing slash";
}

Json::Value RulesJson(const std::vector<detail::RuleVerdict>& verdicts, Json::Value& refusedBy, Json::Value& problem) {
    Json::Value rules(Json::arrayValue);
    refusedBy = Json::Value();
    problem = Json::Value();
    for (const auto& verdict : verdicts) {
        Json::Value rule(Json::objectValue);
        rule["rule"] = verdict.rule;
        rule["description"] = verdict.description;
        rule["verdict"] = verdict.verdict;
        rule["facts"] = verdict.facts;
        rules.append(rule);
        if (refusedBy.isNull() && verdict.verdict == "refuse") {
            refusedBy = verdict.rule;
            problem = ProblemOf(verdict);
        }
    }
    return rules;
}

// The rules the indexing daemon applies to every entry on the way from the share directory.
detail::RuleVerdict EntryVerdict(const std::string& share, const std::string& fullPath) {
    Json::Value facts(Json::objectValue);
    std::string shareDir;
    const char* refusal = detail::ShareFullPath(share, "/" + share, shareDir) ? EntryRefusal(shareDir, fullPath, true)
                                                                             : "not_beneath";
    facts["refusal"] = refusal != nullptr ? Json::Value(refusal) : Json::Value();
    facts["max_depth"] = MaxEntryDepth();
    return {kEntryRule, kEntryDescription, refusal != nullptr ? "refuse" : "pass", facts};
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
        verdicts.push_back(EntryVerdict(share, fullPath));
    } else {
        for (const auto& [rule, description] : detail::IndexabilityRules()) {
            verdicts.push_back({rule, description, "not_evaluated", Json::Value()});
        }
        verdicts.push_back({kEntryRule, kEntryDescription, "not_evaluated", Json::Value()});
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
    pending["wrong_kind"] = QueueFileProblems(share);
    const std::string prefix = fullPath + "/";
    for (const auto& [role, file] : {std::pair{"queue", queuePath}, std::pair{"companion", queuePath + ".tmp"}}) {
        bool refused = false;
        pending[role] = static_cast<Json::Int64>(detail::CountRecordsUnder(file, prefix, &refused));
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
    out["rules"] = RulesJson(Verdicts(share, fullPath, resolved), out["refused_by"], out["problem"]);
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
