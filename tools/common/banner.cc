#include "banner.h"

#include <chrono>
#include <cmath>
#include <ctime>

#include "daemon_progress.h"
#include "fileindex/fileindex.h"
#include "service_view.h"
#include "share_index.h"
#include "time_text.h"

namespace tools {
namespace {

constexpr std::chrono::seconds kCountBudget{1};

std::string Count(unsigned long long n, const char* one, const char* many) {
    return std::to_string(n) + " " + (n == 1 ? one : many);
}

std::string PausedText(const BannerFacts& facts) {
    std::string text = facts.resumeTime == 0
                           ? "Paused until resumed"
                           : "Paused until " + FormatUtc(facts.resumeTime) + " (" +
                                 DurationText(facts.resumeTime - static_cast<long long>(time(nullptr))) + " left)";
    return text + (facts.pending > 0 ? "; " + Count(facts.pending, "change waits", "changes wait") : "");
}

std::string WorkingText(const BannerFacts& facts, Json::Value& secondsLeft) {
    if (facts.pending == 0) return facts.notDone;
    std::string text = Count(facts.pending, "change", "changes") + " left to index";
    if (facts.rate <= 0) return text + ", time left unknown";
    const auto seconds = static_cast<long long>(std::ceil(static_cast<double>(facts.pending) / facts.rate));
    secondsLeft = static_cast<Json::Int64>(seconds);
    char rate[32];
    snprintf(rate, sizeof rate, "%.1f", facts.rate);
    return text + ", " + rate + " per second, about " + DurationText(seconds) + " left";
}

}  // namespace

unsigned long long PendingOf(const Json::Value& progress, const Json::Value& daemonProgress) {
    unsigned long long pending = 0;
    for (const auto& share : progress["shares"]) {
        pending += Left(share["files"].asUInt64(), daemonProgress["shares"][share["share"].asString()]["applied_files"]);
    }
    return pending;
}

std::string DurationText(long long seconds) {
    if (seconds < 60) return std::to_string(std::max(seconds, 0LL)) + " s";
    const long long minutes = (seconds + 59) / 60;
    if (minutes < 60) return std::to_string(minutes) + " min";
    return std::to_string(minutes / 60) + " h" + (minutes % 60 ? " " + std::to_string(minutes % 60) + " min" : "");
}

BannerFacts GatherBannerFacts(const std::string& word, long long resumeTime, const Json::Value& daemon,
                              const std::vector<QIRA::FILEINDEX::Folder>& folders, const Json::Value& progress,
                              const Json::Value& daemonProgress) {
    bool stuck = false;
    return {word, resumeTime, daemon["answers"].asBool(), folders.size(), PendingOf(progress, daemonProgress),
            NotDoneReason(word, folders, daemon, stuck), FilesIndexed(SharesOf(folders)), 0};
}

Json::Value Banner(const BannerFacts& facts) {
    Json::Value banner(Json::objectValue);
    banner["files_indexed"] = facts.filesIndexed;
    banner["pending"] = static_cast<Json::UInt64>(facts.pending);
    banner["resume_time"] = Json::Value();
    banner["rate"] = facts.rate > 0 ? Json::Value(std::round(facts.rate * 10) / 10) : Json::Value();
    banner["seconds_left"] = Json::Value();
    const bool paused = facts.resumeTime == 0 || (facts.resumeTime > 0 && time(nullptr) < facts.resumeTime);
    if (facts.folders == 0) {
        banner["state"] = "no_folders";
        banner["text"] = "No folder is indexed yet";
    } else if (!facts.daemonAnswers) {
        banner["state"] = "daemon_down";
        banner["text"] = "The indexing daemon does not answer: " +
                         (facts.pending > 0 ? Count(facts.pending, "change waits", "changes wait") : std::string("no change is indexed")) +
                         " and a search may miss recent changes. Start the fileindexd service";
    } else if (paused) {
        banner["state"] = "paused";
        banner["text"] = PausedText(facts);
        if (facts.resumeTime > 0) banner["resume_time"] = static_cast<Json::Int64>(facts.resumeTime);
    } else if (facts.pending > 0 || !facts.notDone.empty()) {
        banner["state"] = "working";
        banner["text"] = WorkingText(facts, banner["seconds_left"]);
    } else {
        banner["state"] = "up_to_date";
        banner["text"] = facts.filesIndexed.isNull() ? std::string("Up to date")
                                                     : "Up to date: " + Count(facts.filesIndexed.asUInt64(), "file", "files") + " indexed";
    }
    return banner;
}

Json::Value FilesIndexed(const std::vector<std::string>& shares) {
    unsigned long long files = 0;
    for (const auto& share : shares) {
        std::string shareDir;
        if (!QIRA::FILEINDEX::GetFullPath(shareDir, "/" + share)) shareDir.clear();
        IndexProblem problem = IndexProblem::None;
        Cause cause;
        const auto index = OpenShareIndex(share, shareDir, kCountBudget, problem, cause);
        if (!index && problem == IndexProblem::Missing) continue;
        const long long count = index ? index->Count() : -1;
        if (count < 0) return Json::Value();
        files += static_cast<unsigned long long>(count);
    }
    return static_cast<Json::UInt64>(files);
}

}  // namespace tools
