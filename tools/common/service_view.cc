#include "service_view.h"

#include <cerrno>
#include <cstring>
#include <map>
#include <set>

#include "fileindex/fileindex.h"

namespace tools {

Json::Value DaemonState() {
    Json::Value daemon(Json::objectValue);
    daemon["socket"] = QIRA::FILEINDEX::DaemonSocketPath();
    const bool answers = QIRA::FILEINDEX::DaemonAnswers();
    daemon["answers"] = answers;
    daemon["reason"] = answers ? Json::Value() : Json::Value(std::strerror(errno));
    return daemon;
}

std::vector<std::string> SharesOf(const std::vector<QIRA::FILEINDEX::Folder>& folders) {
    std::set<std::string> shares;
    for (const auto& folder : folders) {
        std::string share;
        if (QIRA::FILEINDEX::GetShareNameByPath(share, folder.path)) shares.insert(share);
    }
    return {shares.begin(), shares.end()};
}

Json::Value WatchedShares(const std::vector<QIRA::FILEINDEX::Folder>& folders) {
    Json::Value watched(Json::arrayValue);
    for (const auto& share : SharesOf(folders)) {
        Json::Value entry(Json::objectValue);
        entry["share"] = share;
        Json::Value description;
        if (QIRA::FILEINDEX::DescribeMonitorQueue(share, description)) {
            entry["queue"] = description["queue"];
            entry["folders"] = Json::Value(Json::arrayValue);
            for (const auto& config : description["config"]) entry["folders"].append(config["path"]);
        } else {
            entry["error"] = "the registration cannot be built (a folder's path does not resolve)";
        }
        const Json::Value problems = QIRA::FILEINDEX::QueueFileProblems(share);
        if (!problems.empty()) entry["queue_problems"] = problems;
        watched.append(entry);
    }
    return watched;
}

std::string QueueProblemText(const Json::Value& problems) {
    static const std::map<std::string, std::string> kWhat = {
        {"@eaDir", "its \"@eaDir\""}, {"queue", "its queue"}, {"companion", "its queue's companion"}};
    std::string text;
    for (const auto& role : problems.getMemberNames()) {
        text += (text.empty() ? "" : "; ") + kWhat.at(role) + " is " + problems[role].asString() + ", not a queue file";
    }
    return text.empty() ? text : text + " (the indexing daemon sets it aside)";
}

std::string NotDoneReason(const std::string& word, const std::vector<QIRA::FILEINDEX::Folder>& folders,
                          const Json::Value& daemon, bool& stuck) {
    std::string left;
    if (word != "finished") left = "indexing is " + word;
    for (const auto& share : SharesOf(folders)) {
        if (left.empty() && QIRA::FILEINDEX::StatusMgr::ShareIsNeedReindex(share)) {
            left = "share " + share + " waits for a full reindex";
        }
        const std::string problem = QueueProblemText(QIRA::FILEINDEX::QueueFileProblems(share));
        if (!problem.empty()) left += (left.empty() ? "" : "; ") + ("share " + share + ": " + problem);
    }
    stuck = !folders.empty() && !daemon["answers"].asBool();
    if (stuck) {
        return (left.empty() ? "folders are indexed" : left) + " and the indexing daemon does not answer at " +
               daemon["socket"].asString() + " (" + daemon["reason"].asString() + ")";
    }
    return left;
}

}  // namespace tools
