// The indexability rules of a full path, in their order, as one list: CanFullPathBeIndexed runs
// it to its first refusal; the explanation runs it through with a trace of every verdict.
#pragma once

#include <string>
#include <vector>

#include <json/value.h>

struct _tag_QIRASHARE;

namespace QIRA {
namespace FILEINDEX {
namespace detail {

struct RuleVerdict {
    std::string rule;         // e.g. "recycle_bin"
    std::string description;  // what the rule refuses
    std::string verdict;      // "pass", "refuse" or "not_evaluated"
    Json::Value facts;        // what the rule looked at
};

// The rule names in their order, with what each refuses.
const std::vector<std::pair<std::string, std::string>>& IndexabilityRules();

// Evaluates the rules for `fullPath` with their platform calls and log lines. Without a trace it
// stops at the first refusal, exactly as CanFullPathBeIndexed does; with one it records each
// rule's verdict and facts and goes on with the rules that can still be evaluated.
bool EvaluateFullPath(const std::string& fullPath, std::vector<RuleVerdict>* trace);

// The checks IsSkipIndex shares with the rules, each with its platform call.
bool InRecycleBin(const std::string& fullPath);   // "#recycle" in it and the share's recycle bin
bool InSnapshot(const std::string& fullPath);     // "#snapshot" in it and inside a snapshot
bool IsUnindexableFsType(int type);               // remote, image, or never indexed (12)

// CanShareBeIndexed's rules (skipped name, encrypted, read-only) for a share record.
bool EvaluateShare(_tag_QIRASHARE* share, std::vector<RuleVerdict>* trace);

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
