#include "share_index.h"

#include <fcntl.h>
#include <unistd.h>

namespace tools {

Cause IndexCause(IndexProblem problem, const std::string& share, const std::string& error) {
    switch (problem) {
        case IndexProblem::Missing:
            return {"INDEX_MISSING", 0, "share " + share + " has no index yet: " + error, 404};
        case IndexProblem::Damaged:
            return {"INDEX_DAMAGED", 0,
                    "the index of share " + share + " is damaged or not this service's (" + error +
                        "); the indexing daemon sets it aside and rebuilds it",
                    503};
        case IndexProblem::TimedOut:
            return {"SEARCH_TIMED_OUT", 0, "the search of share " + share + " took too long: " + error, 503};
        default:
            return {"INDEX_UNREADABLE", 0, "the index of share " + share + " cannot be read: " + error, 503};
    }
}

std::unique_ptr<SearchIndex> OpenShareIndex(const std::string& share, const std::string& shareDir, std::chrono::seconds budget,
                                            IndexProblem& problem, Cause& cause) {
    problem = IndexProblem::None;
    if (shareDir.empty()) {
        cause = {"SHARE_UNKNOWN", 0, "no share is named \"" + share + "\"", 404};
        return nullptr;
    }
    if (faccessat(AT_FDCWD, shareDir.c_str(), R_OK | X_OK, AT_EACCESS) != 0) {
        cause = {"NOT_PERMITTED", 0, "you may not read the directory of share " + share, 403};
        return nullptr;
    }
    std::string error;
    auto index = SearchIndex::Open(shareDir, false, problem, error);
    if (!index) {
        cause = IndexCause(problem, share, error);
        return nullptr;
    }
    index->SetDeadline(std::chrono::steady_clock::now() + budget);
    return index;
}

}  // namespace tools
