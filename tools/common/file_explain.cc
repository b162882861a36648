#include "file_explain.h"

#include <sys/stat.h>

#include <algorithm>
#include <chrono>

#include "fileindex/fileindex.h"
#include "file_types.h"
#include "pause.h"
#include "service_view.h"
#include "share_index.h"

namespace tools {
namespace {

constexpr std::chrono::seconds kIndexBudget{1};

std::string KindOf(const Json::Value& fullPath) {
    struct stat st;
    if (!fullPath.isString() || lstat(fullPath.asCString(), &st) != 0) return "missing";
    return S_ISREG(st.st_mode) ? "file" : S_ISDIR(st.st_mode) ? "directory" : "other";
}

// Entries of the share's index at or beneath the share path, none while the share has no index
// yet, and the path's own entry when it has one (`found`); false with `problem` when the index
// cannot be read.
bool IndexedEntries(const std::string& share, const std::string& path, long long& count, IndexedFile& entry, bool& found,
                    std::string& problem) {
    std::string shareDir;
    if (!QIRA::FILEINDEX::GetFullPath(shareDir, "/" + share)) shareDir.clear();
    IndexProblem kind = IndexProblem::None;
    Cause cause;
    const auto index = OpenShareIndex(share, shareDir, kIndexBudget, kind, cause);
    count = index ? index->CountUnder(path) : kind == IndexProblem::Missing ? 0 : -1;
    found = count > 0 && index->Entry(path, entry);
    if (count >= 0) return true;
    problem = index ? "the index of share " + share + " could not be read in time or is damaged" : cause.text;
    return false;
}

Json::Value FileFacts(const Json::Value& e) {
    Json::Value file(Json::objectValue);
    file["kind"] = KindOf(e["full_path"]);
    long long count = 0;
    IndexedFile entry;
    bool found = false;
    std::string problem;
    const bool read = IndexedEntries(e["share"].asString(), e["path"].asString(), count, entry, found, problem);
    // The kind the index gave it by its content, else the one its name tells.
    const std::string type = file["kind"] == "directory" ? "" : found ? entry.type : FileTypeOf(e["path"].asString());
    file["type"] = type.empty() ? Json::Value() : Json::Value(type);
    const Json::Value& folder = e["governing_folder"];
    file["type_switched_on"] = type.empty() || folder.isNull() ? Json::Value() : folder[type];
    file["in_index"] = read ? Json::Value(count > 0) : Json::Value();
    file["indexed_files"] = static_cast<Json::Int64>(std::max(count, 0LL));
    file["index_problem"] = read ? Json::Value() : Json::Value(problem);
    file["fields"] = found ? entry.fields : Json::Value();
    file["extraction_problem"] = found && !entry.problem.empty() ? Json::Value(entry.problem) : Json::Value();
    return file;
}

Json::Value ServiceFacts() {
    Json::Value service(Json::objectValue);
    std::string word;
    long long resumeTime = -1;
    service["status"] = QIRA::FILEINDEX::StatusMgr::GetStatus(word) ? Json::Value(word) : Json::Value();
    service["paused"] = QIRA::FILEINDEX::StatusMgr::GetPauseInfo(resumeTime) && PauseState(resumeTime)["paused"].asBool();
    service["daemon_answers"] = DaemonState()["answers"];
    return service;
}

std::string Pending(const Json::Value& e) {
    const auto pending = e["pending"]["queue"].asUInt64() + e["pending"]["companion"].asUInt64();
    return std::to_string(pending) + (pending == 1 ? " change" : " changes");
}

// The first thing that keeps the path out of search, in the order a user would look.
std::string Verdict(const Json::Value& e) {
    const Json::Value& file = e["file"];
    const Json::Value& folder = e["governing_folder"];
    if (e["refused_by"] == "canonical_path" && file["kind"] == "missing") return "not indexed: nothing is at that path";
    if (!e["refused_by"].isNull()) return "not indexed: " + e["problem"].asString();
    if (folder.isNull()) return "not indexed: no indexed folder holds it";
    if (file["kind"] == "file" && file["type"].isNull()) return "not indexed: its name is of no type the index keeps";
    if (file["type_switched_on"] == false) {
        return "not indexed: folder " + folder["path"].asString() + " does not index " + file["type"].asString() + " files";
    }
    if (file["in_index"] == true) return "in the index";
    const bool pending = e["pending"]["queue"].asUInt64() + e["pending"]["companion"].asUInt64() > 0;
    if (file["in_index"].isNull()) return "the index could not be read: " + file["index_problem"].asString();
    if (e["service"]["paused"].asBool()) return "not in the index yet: indexing is paused" + (pending ? " with " + Pending(e) + " waiting" : "");
    if (!e["service"]["daemon_answers"].asBool()) return "not in the index yet: the indexing daemon does not answer";
    if (pending) return "not in the index yet: " + Pending(e) + " waiting";
    return "not in the index yet: the indexing daemon has not reached it";
}

}  // namespace

void CompleteExplanation(Json::Value& explanation) {
    explanation["file"] = FileFacts(explanation);
    explanation["service"] = ServiceFacts();
    explanation["verdict"] = Verdict(explanation);
}

}  // namespace tools
