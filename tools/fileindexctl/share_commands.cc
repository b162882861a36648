// share remove | rename | pause | resume | clean | revive | no-space | need-reindex | paths.
#include "commands.h"
#include "fileindex/fileindex.h"

namespace fileindexctl {
namespace {

using QIRA::FILEINDEX::IndexMgr;
using QIRA::FILEINDEX::StatusMgr;

void AddShareAction(CLI::App& share, Context& ctx, const char* verb, const char* help, bool (*action)(const std::string&)) {
    auto name = std::make_shared<std::string>();
    auto* cmd = share.add_subcommand(verb, help);
    cmd->add_option("share", *name, "Share name")->required()->check(ShareName);
    cmd->callback([&ctx, name, verb, action] {
        if (!ctx.Attempt([&] { return action(*name); })) {
            ctx.status = ctx.Fail(std::string("share ") + verb);
            return;
        }
        Json::Value result(Json::objectValue);
        result["share"] = *name;
        ctx.out.Emit(result, "ok");
    });
}

void AddFlagCommand(CLI::App& share, Context& ctx, const char* verb, const char* help,
                    bool (*set)(const std::string&, bool)) {
    auto name = std::make_shared<std::string>();
    auto state = std::make_shared<std::string>();
    auto* cmd = share.add_subcommand(verb, help);
    cmd->add_option("share", *name, "Share name")->required()->check(ShareName);
    cmd->add_option("state", *state, "on or off")->required()->check(CLI::IsMember({"on", "off"}));
    cmd->callback([&ctx, name, state, verb, set] {
        if (!ctx.Attempt([&] { return set(*name, *state == "on"); })) {
            ctx.status = ctx.Fail(std::string("share ") + verb);
            return;
        }
        Json::Value result(Json::objectValue);
        result["share"] = *name;
        result[std::string(verb) == "no-space" ? "no_space" : "need_reindex"] = *state == "on";
        ctx.out.Emit(result, "ok");
    });
}

int Paths(Context& ctx, const std::string& share) {
    char db[4096];
    char queue[4096];
    if (!ctx.Attempt([&] {
            return FILEIDXDBPathGet(share.c_str(), db, sizeof db) >= 0 &&
                   FILEIDXQueuePathGet(share.c_str(), queue, sizeof queue) >= 0;
        })) {
        return ctx.Fail("share paths");
    }
    Json::Value out(Json::objectValue);
    out["database"] = db;
    out["queue"] = queue;
    ctx.out.Emit(out, Table{{"database", db}, {"queue", queue}});
    return 0;
}

}  // namespace

void AddShareCommands(CLI::App& app, Context& ctx) {
    auto* share = app.add_subcommand("share", "Shares holding indexed folders");
    share->require_subcommand(1);
    AddShareAction(*share, ctx, "remove", "The share was removed: drop its folders", &IndexMgr::ShareRemove);
    AddShareAction(*share, ctx, "pause", "The share went offline: stop its worker and monitor", &IndexMgr::SharePause);
    AddShareAction(*share, ctx, "resume", "The share is back: restart its monitor and worker", &IndexMgr::ShareResume);
    AddShareAction(*share, ctx, "clean", "Delete the share's queue files and index database",
                   &IndexMgr::CleanShareIndexData);
    AddShareAction(*share, ctx, "revive", "Clear the out-of-space flag and revive the worker", &StatusMgr::ShareRevive);
    AddFlagCommand(*share, ctx, "no-space", "Set or clear the out-of-space flag", &StatusMgr::ShareSetNoSpace);
    AddFlagCommand(*share, ctx, "need-reindex", "Set or clear the need-reindex flag", &StatusMgr::ShareSetNeedReindex);

    auto oldName = std::make_shared<std::string>();
    auto newName = std::make_shared<std::string>();
    auto* rename = share->add_subcommand("rename", "The share was renamed: move its folders");
    rename->add_option("old", *oldName, "Old share name")->required()->check(ShareName);
    rename->add_option("new", *newName, "New share name")->required()->check(ShareName);
    rename->callback([&ctx, oldName, newName] {
        if (!ctx.Attempt([&] { return IndexMgr::ShareRename(*oldName, *newName); })) {
            ctx.status = ctx.Fail("share rename");
            return;
        }
        Json::Value result(Json::objectValue);
        result["share"] = *oldName;
        result["renamed_to"] = *newName;
        ctx.out.Emit(result, "ok");
    });

    auto name = std::make_shared<std::string>();
    auto* paths = share->add_subcommand("paths", "The share's index database and event queue paths");
    paths->add_option("share", *name, "Share name")->required()->check(ShareName);
    paths->callback([&ctx, name] { ctx.status = Paths(ctx, *name); });
}

}  // namespace fileindexctl
