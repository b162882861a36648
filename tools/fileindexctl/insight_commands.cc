// explain PATH | progress [--watch] | wait: why a path is (not) indexed and how far indexing has got.
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cmath>
#include <iostream>
#include <map>
#include <thread>

#include "commands.h"
#include "daemon_progress.h"
#include "file_explain.h"
#include "fileindex/fileindex.h"
#include "pause.h"
#include "service_view.h"
#include "text_safety.h"
#include "time_text.h"

namespace fileindexctl {
namespace {

using Clock = std::chrono::steady_clock;

std::string Facts(const Json::Value& facts) {
    std::string text;
    if (!facts.isObject()) return text;
    for (const auto& name : facts.getMemberNames()) {
        const Json::Value& value = facts[name];
        text += (text.empty() ? "" : ", ") + name + "=" +
                (value.isString() ? value.asString() : value.isNull() ? "-" : QIRA::FILEINDEX::toString(value));
    }
    return text;
}

std::string YesNo(bool yes) { return yes ? "yes" : "no"; }

std::string Join(const Json::Value& items) {
    std::string text;
    for (const auto& item : items) text += (text.empty() ? "" : ", ") + item.asString();
    return text;
}

std::string Switches(const Json::Value& folder) {
    return "document " + YesNo(folder["document"].asBool()) + ", audio " + YesNo(folder["audio"].asBool()) + ", video " +
           YesNo(folder["video"].asBool()) + ", photo " + YesNo(folder["photo"].asBool());
}

// "artist Miles Davis, year 1959": the fields read from a file, as the index holds them.
std::string FieldsText(const Json::Value& fields) {
    std::string text;
    for (const auto& name : fields.getMemberNames()) {
        const Json::Value& value = fields[name];
        const std::string shown = value.isString() ? value.asString() : QIRA::FILEINDEX::toString(value);
        text += (text.empty() ? "" : ", ") + tools::EscapeForTerminal(name) + " " + tools::EscapeForTerminal(shown);
    }
    return text;
}

// The verdict first, then the facts behind it; the rules that passed only with `allRules`.
void PrintExplanation(const Json::Value& e, bool allRules) {
    std::cout << e["path"].asString() << ": " << e["verdict"].asString()
              << (e["refused_by"].isNull() ? "" : " (refused by " + e["refused_by"].asString() + ")") << "\n";
    std::cout << "  share " << e["share"].asString() << ", full path "
              << (e["full_path"].isNull() ? "(not resolved)" : e["full_path"].asString()) << "\n";
    const Json::Value& folder = e["governing_folder"];
    std::cout << "governing folder: ";
    if (folder.isNull()) {
        std::cout << "none\n";
    } else {
        const std::string name = folder["name"].asString().empty() ? "unnamed" : "\"" + folder["name"].asString() + "\"";
        std::cout << folder["path"].asString() << " (" << name << "; " << Switches(folder) << ")\n";
    }
    const Json::Value& file = e["file"];
    std::cout << "the " << file["kind"].asString() << ": type "
              << (file["type"].isNull() ? "none" : file["type"].asString() + (file["type_switched_on"] == false ? " (switched off)" : ""))
              << "; in the index: "
              << (file["in_index"].isNull() ? "unknown (" + file["index_problem"].asString() + ")"
                                             : file["kind"] == "directory" ? std::to_string(file["indexed_files"].asUInt64()) + " files"
                                                                           : YesNo(file["in_index"].asBool()))
              << "\n";
    if (file["fields"].isObject() && !file["fields"].empty()) std::cout << "read from it: " << FieldsText(file["fields"]) << "\n";
    if (file["extraction_problem"].isString()) {
        std::cout << "indexed by name only: " << tools::EscapeForTerminal(file["extraction_problem"].asString()) << "\n";
    }
    const Json::Value& service = e["service"];
    std::cout << "service: " << service["status"].asString() << (service["paused"].asBool() ? ", paused" : "")
              << (service["daemon_answers"].asBool() ? "" : ", the indexing daemon does not answer")
              << "; pending for the path: " << e["pending"]["queue"].asUInt64() << " in the queue, "
              << e["pending"]["companion"].asUInt64() << " in its companion"
              << (e["pending"]["unread"].empty() ? "" : " (not read, sparse or too large: " + Join(e["pending"]["unread"]) + ")")
              << "\n";
    std::cout << "share flags: out of space " << YesNo(e["share_flags"]["no_space"].asBool()) << ", need reindex "
              << YesNo(e["share_flags"]["need_reindex"].asBool()) << "\n";
    const std::string problem = tools::QueueProblemText(e["pending"]["wrong_kind"]);
    if (!problem.empty()) std::cout << "the share's queue: " << problem << "\n";
    Table rules = {{"VERDICT", "RULE", "REFUSES", "FACTS"}};
    size_t folded = 0;
    for (const auto& rule : e["rules"]) {
        if (rule["verdict"] == "refuse" || allRules) {
            rules.push_back({rule["verdict"].asString(), rule["rule"].asString(), rule["description"].asString(), Facts(rule["facts"])});
        } else {
            ++folded;
        }
    }
    if (rules.size() > 1) {
        std::cout << "\n";
        Output{}.Emit(Json::Value(), rules);
    }
    if (folded > 0) std::cout << folded << " more rules passed or were not needed (--rules shows them)\n";
}

// Adds to `now` the drain rate (files per second) and the estimated seconds left of every share
// and folder, from the previous sample taken `seconds` before.
void AddRates(Json::Value& now, const Json::Value& before, double seconds) {
    std::map<std::string, unsigned long long> previous;
    for (const auto& share : before["shares"]) {
        previous[share["share"].asString()] = share["files_left"].asUInt64();
        for (const auto& folder : share["folders"]) previous[folder["path"].asString()] = folder["files_left"].asUInt64();
    }
    const auto rate = [&](Json::Value& entry, const std::string& key) {
        const double pending = static_cast<double>(entry["files_left"].asUInt64());
        const auto found = previous.find(key);
        const double drained = found == previous.end() ? 0 : static_cast<double>(found->second) - pending;
        const double perSecond = seconds > 0 && drained > 0 ? drained / seconds : 0;
        entry["rate"] = std::round(perSecond * 10) / 10;
        entry["eta_seconds"] = pending == 0 ? Json::Value(0) : perSecond > 0 ? Json::Value(std::ceil(pending / perSecond)) : Json::Value();
    };
    for (auto& share : now["shares"]) {
        rate(share, share["share"].asString());
        for (auto& folder : share["folders"]) rate(folder, folder["path"].asString());
    }
}

std::string Eta(const Json::Value& eta) { return eta.isNull() ? "-" : std::to_string(eta.asLargestInt()) + "s"; }

std::string FilesLeftText(const Json::Value& entry) {
    const std::string left = std::to_string(entry["files_left"].asUInt64());
    return entry["unread"].empty() ? left : left + " + " + Join(entry["unread"]) + " not read";
}

std::string UpToDateText(const Json::Value& entry) {
    return entry["files_left"].asUInt64() == 0 && entry["up_to_date"].isInt64() ? tools::FormatLocalTime(entry["up_to_date"].asInt64()) : "-";
}

Table ProgressTable(const Json::Value& sample) {
    Table table = {{"SHARE / FOLDER", "FILES LEFT", "RATE/S", "TIME LEFT", "UP TO DATE SINCE"}};
    const auto row = [&](const std::string& name, const Json::Value& entry) {
        table.push_back({name, FilesLeftText(entry), QIRA::FILEINDEX::toString(entry["rate"]), Eta(entry["eta_seconds"]),
                         UpToDateText(entry)});
    };
    for (const auto& share : sample["shares"]) {
        row(share["share"].asString(), share);
        for (const auto& folder : share["folders"]) row("  " + folder["path"].asString(), folder);
    }
    return table;
}

// One screen of the watch: a bar per share against the largest backlog seen since the start.
void DrawScreen(const Json::Value& sample, std::map<std::string, unsigned long long>& largest) {
    std::cout << "\033[H\033[J" << (sample["pause"]["paused"].asBool() ? "indexing paused" : "indexing")
              << (sample["daemon"]["answers"].asBool() ? "" : "; the indexing daemon does not answer at " +
                                                                 sample["daemon"]["socket"].asString())
              << "\n\n";
    for (const auto& share : sample["shares"]) {
        const std::string name = share["share"].asString();
        const unsigned long long left = share["files_left"].asUInt64();
        largest[name] = std::max(largest[name], left);
        const int width = 30;
        const int done = largest[name] == 0 ? width : static_cast<int>(width * (largest[name] - left) / largest[name]);
        std::cout << name << " [" << std::string(done, '#') << std::string(width - done, '-') << "] " << left
                  << (left == 1 ? " file" : " files") << " left, " << QIRA::FILEINDEX::toString(share["rate"])
                  << "/s, time left " << Eta(share["eta_seconds"])
                  << "\n";
    }
    std::cout.flush();
}

// One sample: the library's progress with the pause's UTC twin and the daemon's state, and why
// indexing cannot get done by waiting, when it cannot.
bool Sample(Context& ctx, Json::Value& sample, std::string& stuckReason) {
    std::string word;
    std::vector<QIRA::FILEINDEX::Folder> folders;
    if (!ctx.Attempt([&] {
            return QIRA::FILEINDEX::GetProgress(sample) && QIRA::FILEINDEX::StatusMgr::GetStatus(word) &&
                   QIRA::FILEINDEX::IndexMgr::List(folders);
        })) {
        return false;
    }
    sample["pause"] = tools::PauseState(sample["pause"]["resume_time"].asInt64());
    sample["daemon"] = tools::DaemonState();
    const Json::Value daemonProgress = tools::ReadDaemonProgress();
    for (auto& share : sample["shares"]) tools::AddDaemonProgress(share, daemonProgress);
    bool stuck = false;
    const std::string reason = tools::NotDoneReason(word, folders, sample["daemon"], stuck);
    stuckReason = stuck ? reason : "";
    return true;
}

int Stuck(Context& ctx, const std::string& operation, const std::string& reason) {
    return ctx.Fail(operation, {"DAEMON_UNREACHABLE", 0, reason, 502}, kExitUnknown);
}

int Progress(Context& ctx, bool watch, double interval, int samples) {
    Json::Value before, now;
    std::string stuck;
    if (!Sample(ctx, before, stuck)) return ctx.Fail("progress");
    auto taken = Clock::now();
    const bool screen = watch && !ctx.out.json && isatty(STDOUT_FILENO);
    std::map<std::string, unsigned long long> largest;
    for (int sample = 1; samples == 0 || sample <= samples; ++sample) {
        std::this_thread::sleep_for(std::chrono::duration<double>(interval));
        if (!Sample(ctx, now, stuck)) return ctx.Fail("progress");
        const auto at = Clock::now();
        AddRates(now, before, std::chrono::duration<double>(at - taken).count());
        if (!watch) {
            if (!stuck.empty()) return Stuck(ctx, "progress", stuck);
            ctx.out.Emit(now, ProgressTable(now));
            return 0;
        }
        if (screen) {
            DrawScreen(now, largest);
        } else {
            std::cout << QIRA::FILEINDEX::toString(now) << std::endl;  // one JSON line per sample
        }
        before = now;
        taken = at;
    }
    return 0;
}

// 0 once indexing is done, 3 when the time runs out first, 2 when it cannot get done because no
// daemon answers.
int Wait(Context& ctx, double timeout) {
    const auto deadline = Clock::now() + std::chrono::duration<double>(timeout);
    while (true) {
        std::string word;
        std::vector<QIRA::FILEINDEX::Folder> folders;
        if (!ctx.Attempt([&] {
                return QIRA::FILEINDEX::StatusMgr::GetStatus(word) && QIRA::FILEINDEX::IndexMgr::List(folders);
            })) {
            ctx.Fail("wait");
            return kExitUnknown;
        }
        bool stuck = false;
        const std::string reason = tools::NotDoneReason(word, folders, tools::DaemonState(), stuck);
        Json::Value result(Json::objectValue);
        result["status"] = word;
        if (reason.empty()) {
            ctx.out.Emit(result, word);
            return 0;
        }
        if (stuck) return Stuck(ctx, "wait", reason);
        if (Clock::now() >= deadline) {
            result["reason"] = reason;
            ctx.out.Emit(result, "not done after " + std::to_string(static_cast<long>(timeout)) + "s: " + reason);
            return kExitTimeOut;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(100));
    }
}

}  // namespace

void AddInsightCommands(CLI::App& app, Context& ctx) {
    auto path = std::make_shared<std::string>();
    auto allRules = std::make_shared<bool>(false);
    auto* explain = app.add_subcommand("explain", "Whether a file or folder is in the index, and what keeps it out");
    explain->add_option("path", *path, "Share path, e.g. /music/live/song.mp3")->required();
    explain->add_flag("--rules", *allRules, "Show every rule, not only those that refuse");
    explain->callback([&ctx, path, allRules] {
        Json::Value out;
        if (!ctx.Attempt([&] { return QIRA::FILEINDEX::ExplainPath(*path, out); })) {
            ctx.status = ctx.Fail("explain");
            return;
        }
        if (out["refused_by"] == "share_path") {
            ctx.status = ctx.Fail("explain", {"SHARE_UNKNOWN", 0, out["problem"].asString(), 404});
            return;
        }
        tools::CompleteExplanation(out);
        if (ctx.out.json) {
            ctx.out.Emit(out, "");
        } else {
            PrintExplanation(out, *allRules);
        }
    });

    auto watch = std::make_shared<bool>(false);
    auto interval = std::make_shared<double>(1.0);
    auto samples = std::make_shared<int>(0);
    auto* progress = app.add_subcommand("progress", "Files left per share and folder, drain rate and time left");
    progress->add_flag("--watch", *watch, "Refresh until interrupted (a JSON line per sample when not on a terminal)");
    progress->add_option("--interval", *interval, "Seconds between samples")->check(CLI::Range(0.05, 3600.0));
    progress->add_option("--samples", *samples, "With --watch: stop after this many samples (0 = never)")
        ->check(CLI::NonNegativeNumber);
    progress->callback([&ctx, watch, interval, samples] { ctx.status = Progress(ctx, *watch, *interval, *samples); });

    auto timeout = std::make_shared<double>(600);
    auto* wait = app.add_subcommand("wait", "Wait until indexing is finished: exit 0, 3 on time-out, 2 on errors");
    wait->add_option("--timeout", *timeout, "Seconds to wait")->check(CLI::NonNegativeNumber);
    wait->callback([&ctx, timeout] { ctx.status = Wait(ctx, *timeout); });
}

}  // namespace fileindexctl
