// folder list | get | add | set | delete | status, and reindex.
#include <fstream>
#include <iostream>
#include <iterator>
#include <sstream>

#include "commands.h"
#include "fileindex/fileindex.h"
#include "folder_page.h"
#include "folder_view.h"
#include "share_path_check.h"

namespace fileindexctl {
namespace {

using QIRA::FILEINDEX::IndexMgr;

std::string YesNo(const Json::Value& value) {
    if (value.isBool()) return value.asBool() ? "yes" : "no";
    return value.isString() ? value.asString() : "-";
}

Json::Value StringArray(const std::vector<std::string>& items) {
    Json::Value array(Json::arrayValue);
    for (const auto& item : items) array.append(item);
    return array;
}

Json::Value ResultOf(const Json::Value& request) {
    Json::Value result(Json::objectValue);
    result["folders"] = request;
    return result;
}

int List(Context& ctx, unsigned long offset, unsigned long limit, const std::string& sortBy, bool descending,
         const std::vector<std::string>& additional) {
    Json::Value out;
    if (!ctx.Attempt([&] { return tools::ListFolderPage(out, offset, limit, sortBy, descending, StringArray(additional)); })) {
        return ctx.Fail("folder list");
    }
    Table table;
    std::vector<std::string> header = {"PATH", "NAME", "DOCUMENT", "AUDIO", "VIDEO", "PHOTO"};
    for (const auto& key : additional) {
        header.push_back(key == "is_valid" ? "VALID" : key == "status" ? "STATUS" : key == "indexed_files" ? "FILES" : key);
    }
    table.push_back(header);
    for (auto& folder : out["folder"]) {
        std::vector<std::string> row = {folder["path"].asString(), folder["name"].asString(), YesNo(folder["document"]),
                                        YesNo(folder["audio"]),     YesNo(folder["video"]),    YesNo(folder["photo"])};
        for (const auto& key : additional) {
            const Json::Value& fact = folder["additional"][key];
            row.push_back(key == "status" ? tools::StatusText(folder["additional"]) : fact.isIntegral() ? fact.asString() : YesNo(fact));
        }
        table.push_back(row);
    }
    table.push_back({"(" + std::to_string(out["folder"].size()) + " of " + out["total"].asString() + ")"});
    ctx.out.Emit(out, table);
    return 0;
}

// False, after telling the failure, when a path of the request is no share path of a known share.
bool CheckPaths(Context& ctx, const std::string& operation, const std::vector<std::string>& paths) {
    for (const auto& path : paths) {
        tools::Cause cause;
        if (!tools::CheckSharePath(path, cause)) {
            ctx.status = ctx.Fail(operation, cause);
            return false;
        }
    }
    return true;
}

bool ReadRequest(const std::string& source, Json::Value& request) {
    std::string text;
    if (source == "-") {
        text.assign(std::istreambuf_iterator<char>(std::cin), std::istreambuf_iterator<char>());
    } else {
        std::ifstream in(source);
        if (!in) return false;
        text.assign(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
    }
    return QIRA::FILEINDEX::fromString(request, text);
}

struct FolderSettings {
    std::vector<std::string> paths;
    std::string name;
    std::string request;
    bool document = false;
    bool audio = false;
    bool video = false;
    bool photo = false;
};

Json::Value BuildRequest(const FolderSettings& s, const CLI::App& cmd) {
    Json::Value request(Json::arrayValue);
    for (const auto& path : s.paths) {
        Json::Value folder(Json::objectValue);
        folder["path"] = path;
        if (cmd.count("--name") > 0) folder["name"] = s.name;
        for (const auto& [flag, key, value] : {std::tuple{"--document", "document", s.document},
                                               std::tuple{"--audio", "audio", s.audio},
                                               std::tuple{"--video", "video", s.video},
                                               std::tuple{"--photo", "photo", s.photo}}) {
            if (cmd.count(flag) > 0) folder[key] = value;
        }
        request.append(folder);
    }
    return request;
}

void AddUpsertCommand(CLI::App& folder, Context& ctx, const char* verb, const char* help) {
    auto settings = std::make_shared<FolderSettings>();
    auto* cmd = folder.add_subcommand(verb, help);
    cmd->add_option("paths", settings->paths, "Share paths, e.g. /music/live");
    cmd->add_option("--name", settings->name, "Display name");
    cmd->add_flag("--document,!--no-document", settings->document, "Index document files (or not)");
    cmd->add_flag("--audio,!--no-audio", settings->audio, "Index audio files (or not)");
    cmd->add_flag("--video,!--no-video", settings->video, "Index video files (or not)");
    cmd->add_flag("--photo,!--no-photo", settings->photo, "Index photo files (or not)");
    cmd->add_option("--request", settings->request, "JSON array of folder settings from a file ('-' for stdin)");
    cmd->callback([&ctx, settings, cmd, verb] {
        Json::Value request;
        if (!settings->request.empty()) {
            if (!ReadRequest(settings->request, request)) throw CLI::ValidationError("--request", "not a readable JSON file");
        } else if (settings->paths.empty()) {
            throw CLI::RequiredError("paths or --request");
        } else {
            request = BuildRequest(*settings, *cmd);
        }
        const std::string operation = std::string("folder ") + verb;
        std::vector<std::string> paths;
        for (const auto& folder : request) {
            if (folder.isObject() && folder["path"].isString()) paths.push_back(folder["path"].asString());
        }
        if (!CheckPaths(ctx, operation, paths)) return;
        if (!ctx.Attempt([&] { return IndexMgr::Upsert(request); })) {
            ctx.status = ctx.Fail(operation);
            return;
        }
        Json::Value result = ResultOf(request);
        result["warnings"] = tools::IndexabilityWarnings(request);
        for (const auto& warning : result["warnings"]) ctx.out.Warn(warning.asString());
        ctx.out.Emit(result, "ok");
    });
}

// Reindex asks for paths in shares that hold indexed folders; the library refuses others without
// a word.
bool CheckReindexPaths(Context& ctx, const std::vector<std::string>& paths) {
    if (!CheckPaths(ctx, "reindex", paths)) return false;
    for (const auto& path : paths) {
        std::string share;
        QIRA::FILEINDEX::GetShareNameByPath(share, path);
        if (!IndexMgr::IsShareIndexed(share)) {
            ctx.status = ctx.Fail("reindex", {"SHARE_NOT_INDEXED", 0, "share \"" + share + "\" holds no indexed folder", 404});
            return false;
        }
    }
    return true;
}

// A command that hands its share paths to one operation as a JSON array, after `check`.
void AddPathsCommand(CLI::App& parent, Context& ctx, const char* verb, const char* help, const char* operation,
                     bool (*action)(const Json::Value&), bool (*check)(Context&, const std::vector<std::string>&)) {
    auto paths = std::make_shared<std::vector<std::string>>();
    auto* cmd = parent.add_subcommand(verb, help);
    cmd->add_option("paths", *paths, "Share paths")->required();
    cmd->callback([&ctx, paths, operation, action, check] {
        if (check != nullptr && !check(ctx, *paths)) return;
        if (!ctx.Attempt([&] { return action(StringArray(*paths)); })) {
            ctx.status = ctx.Fail(operation);
            return;
        }
        Json::Value result(Json::objectValue);
        result["paths"] = StringArray(*paths);
        ctx.out.Emit(result, "ok");
    });
}

}  // namespace

void AddFolderCommands(CLI::App& app, Context& ctx) {
    auto* folder = app.add_subcommand("folder", "Indexed folders");
    folder->require_subcommand(1);

    auto* list = folder->add_subcommand("list", "List indexed folders");
    auto offset = std::make_shared<unsigned long>(0);
    auto limit = std::make_shared<unsigned long>(1000);
    auto sortBy = std::make_shared<std::string>("path");
    auto descending = std::make_shared<bool>(false);
    auto additional = std::make_shared<std::vector<std::string>>();
    list->add_option("--offset", *offset, "First record of the page");
    list->add_option("--limit", *limit, "Records in the page");
    list->add_option("--sort", *sortBy, "Sort key")
        ->check(CLI::IsMember({"path", "name", "document", "audio", "video", "photo"}));
    list->add_flag("--desc", *descending, "Descending page");
    list->add_option("--additional", *additional, "Facts to add, comma-separated")
        ->delimiter(',')
        ->check(CLI::IsMember({"status", "is_valid", "indexed_files"}));
    list->callback([&ctx, offset, limit, sortBy, descending, additional] {
        ctx.status = List(ctx, *offset, *limit, *sortBy, *descending, *additional);
    });

    auto path = std::make_shared<std::string>();
    auto* get = folder->add_subcommand("get", "Show one folder");
    get->add_option("path", *path, "Share path")->required();
    get->callback([&ctx, path] {
        Json::Value out;
        if (!ctx.Attempt([&] { return IndexMgr::Get(out, *path); })) {
            ctx.status = ctx.Fail("folder get");
            return;
        }
        ctx.out.Emit(out, Table{{"path", out["path"].asString()}, {"name", out["name"].asString()},
                                {"document", YesNo(out["document"])}, {"audio", YesNo(out["audio"])},
                                {"video", YesNo(out["video"])}, {"photo", YesNo(out["photo"])}});
    });

    AddUpsertCommand(*folder, ctx, "add", "Index folders (adds or updates)");
    AddUpsertCommand(*folder, ctx, "set", "Change folder settings (adds or updates)");

    AddPathsCommand(*folder, ctx, "delete", "Stop indexing folders", "folder delete", &IndexMgr::Delete, nullptr);

    auto* status = folder->add_subcommand("status", "Indexing status word of one folder");
    status->add_option("path", *path, "Share path")->required();
    status->callback([&ctx, path] {
        std::string word;
        ctx.Attempt([&] {
            word = QIRA::FILEINDEX::StatusMgr::GetFolderStatus(*path);
            return true;
        });
        Json::Value result(Json::objectValue);
        result["path"] = *path;
        result["status"] = word;
        tools::AddRefusingRule(result, *path);
        result["indexable"] = !result.isMember("refused_by");
        ctx.out.Emit(result, tools::StatusText(result));
    });

    AddPathsCommand(app, ctx, "reindex", "Index paths again from scratch", "reindex", &IndexMgr::Reindex,
                    &CheckReindexPaths);
}

}  // namespace fileindexctl
