// service status | pause | resume, and the migration step.
#include <ctime>

#include "banner.h"
#include "commands.h"
#include "daemon_progress.h"
#include "fileindex/fileindex.h"
#include "pause.h"
#include "service_view.h"

namespace fileindexctl {
namespace {

using QIRA::FILEINDEX::StatusMgr;

std::string PauseText(long long resumeTime) {
    if (resumeTime == 0) return "paused until resumed";
    if (resumeTime > 0 && time(nullptr) < resumeTime) return "paused until " + FormatLocalTime(resumeTime);
    return "running";
}

// The shares of the indexed folders, with their flags.
void ShareFlags(const std::vector<QIRA::FILEINDEX::Folder>& folders, Json::Value& noSpace, Json::Value& needReindex) {
    for (const auto& share : tools::SharesOf(folders)) {
        if (StatusMgr::ShareIsNoSpace(share)) noSpace.append(share);
        if (StatusMgr::ShareIsNeedReindex(share)) needReindex.append(share);
    }
}

std::string Join(const Json::Value& items) {
    std::string text;
    for (const auto& item : items) text += (text.empty() ? "" : ", ") + item.asString();
    return text.empty() ? "-" : text;
}

std::string DaemonText(const Json::Value& daemon) {
    return daemon["answers"].asBool() ? "answers at " + daemon["socket"].asString()
                                      : "does not answer at " + daemon["socket"].asString() + " (" +
                                            daemon["reason"].asString() + ")";
}

void AddWatchedRows(const Json::Value& watched, Table& table) {
    for (const auto& share : watched) {
        std::string folders = share.isMember("error") ? share["error"].asString() : Join(share["folders"]);
        table.push_back({"watched in " + share["share"].asString(), folders});
        if (share.isMember("queue_problems")) {
            table.push_back({"queue of " + share["share"].asString(), tools::QueueProblemText(share["queue_problems"])});
        }
    }
}

int Status(Context& ctx) {
    std::string word;
    long long resumeTime = -1;
    std::vector<QIRA::FILEINDEX::Folder> folders;
    if (!ctx.Attempt([&] {
            return StatusMgr::GetStatus(word) && StatusMgr::GetPauseInfo(resumeTime) &&
                   QIRA::FILEINDEX::IndexMgr::List(folders);
        })) {
        return ctx.Fail("service status");
    }
    Json::Value out(Json::objectValue);
    out["status"] = word;
    out["daemon"] = tools::DaemonState();
    out["pause"] = tools::PauseState(resumeTime);
    out["no_space"] = Json::Value(Json::arrayValue);
    out["need_reindex"] = Json::Value(Json::arrayValue);
    ShareFlags(folders, out["no_space"], out["need_reindex"]);
    out["watched"] = tools::WatchedShares(folders);
    Json::Value progress;
    QIRA::FILEINDEX::GetProgress(progress);  // a report that cannot be read counts nothing pending
    out["banner"] =
        tools::Banner(tools::GatherBannerFacts(word, resumeTime, out["daemon"], folders, progress, tools::ReadDaemonProgress()));
    Table table = {{"indexing", out["banner"]["text"].asString()},
                   {"status", word},
                   {"daemon", DaemonText(out["daemon"])},
                   {"pause", PauseText(resumeTime)},
                   {"out of space", Join(out["no_space"])},
                   {"need reindex", Join(out["need_reindex"])}};
    AddWatchedRows(out["watched"], table);
    ctx.out.Emit(out, table);
    return 0;
}

}  // namespace

void AddServiceCommands(CLI::App& app, Context& ctx) {
    // The first question, so it has a short name of its own beside "service status".
    app.add_subcommand("status", "Whether indexing is done, and the service's state")->callback([&ctx] { ctx.status = Status(ctx); });
    auto* service = app.add_subcommand("service", "The indexing service");
    service->require_subcommand(1);
    service->add_subcommand("status", "Whether indexing is done, and the service's state")->callback([&ctx] {
        ctx.status = Status(ctx);
    });

    auto hours = std::make_shared<int>(0);
    auto* pause = service->add_subcommand("pause", "Pause indexing");
    pause->add_option("--hours", *hours, "Hours to pause (0 = until resumed)")->check(PauseHours);
    pause->callback([&ctx, hours] {
        if (!ctx.Attempt([&] { return StatusMgr::Pause(*hours); })) {
            ctx.status = ctx.Fail("service pause");
            return;
        }
        long long resumeTime = -1;
        StatusMgr::GetPauseInfo(resumeTime);
        Json::Value out(Json::objectValue);
        out["pause"] = tools::PauseState(resumeTime);
        ctx.out.Emit(out, PauseText(resumeTime));
    });
    service->add_subcommand("resume", "Resume indexing")->callback([&ctx] {
        if (!ctx.Attempt([] { return StatusMgr::Resume(); })) {
            ctx.status = ctx.Fail("service resume");
            return;
        }
        Json::Value out(Json::objectValue);
        out["pause"] = tools::PauseState(-1);
        ctx.out.Emit(out, "running");
    });

    app.add_subcommand("migrate", "Bring a system upgraded from the older release into the running state")
        ->callback([&ctx] {
            if (!ctx.Attempt([] { return QIRA::FILEINDEX::Updater_lum60_beta2(); })) {
                ctx.status = ctx.Fail("migrate");
                return;
            }
            ctx.out.Emit(Json::Value(Json::objectValue), "ok");
        });
}

}  // namespace fileindexctl
