// search QUERY: the indexed files whose name, path or text hold the words, best first.
#include <unistd.h>

#include <algorithm>

#include "commands.h"
#include "cli.h"
#include "search_view.h"
#include "text_safety.h"

namespace fileindexctl {
namespace {

// The snippet with its matches in brackets, or in bold on a terminal.
std::string SnippetText(const Json::Value& snippet) {
    const bool terminal = isatty(STDOUT_FILENO);
    std::string text;
    for (const auto& piece : snippet) {
        std::string part = piece["text"].asString();
        std::replace(part.begin(), part.end(), '\n', ' ');
        part = tools::EscapeForTerminal(part);
        if (!piece["match"].asBool()) text += part;
        else text += terminal ? "\033[1m" + part + "\033[0m" : "[" + part + "]";
    }
    return text;
}

// "(N found)" when every hit is shown; else which hits are shown, of how many, and how to go on.
std::string Footer(const Json::Value& out) {
    const long long shown = out["hits"].size(), offset = out["offset"].asInt64(), total = out["total"].asInt64();
    if (offset == 0 && shown == total) return "(" + std::to_string(total) + " found)";
    if (shown == 0) return "(none from " + std::to_string(offset + 1) + " on; " + std::to_string(total) + " found)";
    const std::string range = "(" + std::to_string(offset + 1) + "-" + std::to_string(offset + shown) + " of " + std::to_string(total);
    return range + (offset + shown < total ? "; --offset " + std::to_string(offset + shown) + " for more)" : ")");
}

int Search(Context& ctx, const tools::SearchRequest& request) {
    Json::Value out;
    tools::Cause cause;
    if (!tools::SearchShares(request, out, cause)) {
        return ctx.Fail("search", cause, cause.name == "BAD_QUERY" ? tools::kExitUsage : tools::kExitFailure);
    }
    for (const auto& share : out["incomplete"]) ctx.out.Warn(share["message"].asString());
    Table table = {{"PATH", "TYPE", "SIZE", "MODIFIED", "MATCH"}};
    for (const auto& hit : out["hits"]) {
        // The name's own bytes, escaped: a name cannot move the cursor or split a row.
        const std::string path = hit.isMember("path_hex") ? tools::FromHex(hit["path_hex"].asString()) : hit["path"].asString();
        table.push_back({tools::EscapeForTerminal(path), hit["type"].asString(), std::to_string(hit["size"].asInt64()),
                         FormatLocalTime(hit["mtime"].asInt64()), SnippetText(hit["snippet"])});
    }
    table.push_back({Footer(out)});
    ctx.out.Emit(out, table);
    return 0;
}

}  // namespace

void AddSearchCommand(CLI::App& app, Context& ctx) {
    auto request = std::make_shared<tools::SearchRequest>();
    auto words = std::make_shared<std::vector<std::string>>();
    auto* search = app.add_subcommand("search", "Find indexed files by name, path or text (each word a prefix)");
    search->add_option("query", *words, "Words to find, e.g. holid beach")->required();
    search->add_option("--type", request->type, "Only this type")->check(CLI::IsMember({"document", "audio", "video", "photo"}));
    search->add_option("--share", request->share, "Only this share")->check(ShareName);
    search->add_option("--limit", request->limit, "Hits at most")->check(CLI::Range(1, 1000));
    search->add_option("--offset", request->offset, "Best hits to skip")->check(CLI::Range(0, tools::kMaxSearchOffset));
    search->callback([&ctx, request, words] {
        for (const auto& word : *words) request->query += (request->query.empty() ? "" : " ") + word;
        ctx.status = Search(ctx, *request);
    });
}

}  // namespace fileindexctl
