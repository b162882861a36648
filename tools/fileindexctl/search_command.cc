// search QUERY: the indexed files whose name, path, text or fields hold the words and that pass
// the filters, best first (or by date or name), with the fields of their kind and, when asked,
// the counts per type, year, artist and camera.
#include <unistd.h>

#include <algorithm>
#include <iostream>

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

// What a hit is about, from the fields of its kind: "Miles Davis, Kind of Blue, 1959, 9:05";
// "FUJIFILM X-T3, taken 2019-06-14 10:20:30"; "Quarterly Report, Ann Smith, 12 pages".
std::string AboutText(const Json::Value& fields) {
    std::vector<std::string> parts;
    const auto text = [&](const char* name) {
        if (fields[name].isString()) parts.push_back(fields[name].asString());
    };
    for (const char* name : {"title", "artist", "album"}) text(name);
    if (fields["year"].isIntegral()) parts.push_back(std::to_string(fields["year"].asInt64()));
    if (fields["duration"].isIntegral()) {
        const long long seconds = fields["duration"].asInt64();
        char clock[32];
        snprintf(clock, sizeof clock, "%lld:%02lld", seconds / 60, seconds % 60);
        parts.push_back(clock);
    }
    const auto word = [&](const char* name) { return fields[name].isString() ? fields[name].asString() : std::string(); };
    const std::string camera = word("camera_make") + (word("camera_make").empty() ? "" : " ") + word("camera_model");
    if (!camera.empty()) parts.push_back(camera);
    if (fields["taken"].isString()) parts.push_back("taken " + fields["taken"].asString());
    text("author");
    if (fields["pages"].isIntegral()) parts.push_back(std::to_string(fields["pages"].asInt64()) + " pages");
    std::string about;
    for (const auto& part : parts) about += (about.empty() ? "" : ", ") + tools::EscapeForTerminal(part);
    return about;
}

// "type: audio 2, document 1", one line per facet with counts.
std::string FacetsText(const Json::Value& facets) {
    std::string lines;
    for (const char* name : {"type", "year", "artist", "camera"}) {
        std::vector<std::pair<long long, std::string>> counts;
        for (const auto& value : facets[name].getMemberNames()) counts.emplace_back(-facets[name][value].asInt64(), value);
        std::sort(counts.begin(), counts.end());
        std::string line;
        for (const auto& [count, value] : counts) line += (line.empty() ? "" : ", ") + tools::EscapeForTerminal(value) + " " + std::to_string(-count);
        if (!line.empty()) lines += std::string(name) + ": " + line + "\n";
    }
    return lines;
}

int Search(Context& ctx, const tools::SearchRequest& request) {
    Json::Value out;
    tools::Cause cause;
    if (!tools::SearchShares(request, out, cause)) {
        return ctx.Fail("search", cause, cause.name == "BAD_QUERY" ? tools::kExitUsage : tools::kExitFailure);
    }
    for (const auto& share : out["incomplete"]) ctx.out.Warn(share["message"].asString());
    Table table = {{"PATH", "TYPE", "SIZE", "MODIFIED", "ABOUT", "MATCH"}};
    for (const auto& hit : out["hits"]) {
        // The name's own bytes, escaped: a name cannot move the cursor or split a row.
        const std::string path = hit.isMember("path_hex") ? tools::FromHex(hit["path_hex"].asString()) : hit["path"].asString();
        table.push_back({tools::EscapeForTerminal(path), hit["type"].asString(), std::to_string(hit["size"].asInt64()),
                         FormatLocalTime(hit["mtime"].asInt64()), AboutText(hit["fields"]), SnippetText(hit["snippet"])});
    }
    table.push_back({Footer(out)});
    ctx.out.Emit(out, table);
    if (request.facets && !ctx.out.json) std::cout << FacetsText(out["facets"]);
    return 0;
}

}  // namespace

void AddSearchCommand(CLI::App& app, Context& ctx) {
    auto request = std::make_shared<tools::SearchRequest>();
    auto words = std::make_shared<std::vector<std::string>>();
    auto* search = app.add_subcommand("search", "Find indexed files by words (each a prefix) and filters field:value");
    search->add_option("query", *words, "Words and filters, e.g. miles davis type:audio year:1959")->required();
    search->add_option("--type", request->type, "Only this type")->check(CLI::IsMember({"document", "audio", "video", "photo"}));
    search->add_option("--share", request->share, "Only this share")->check(ShareName);
    search->add_option("--limit", request->limit, "Hits at most")->check(CLI::Range(1, 1000));
    search->add_option("--offset", request->offset, "Best hits to skip")->check(CLI::Range(0, tools::kMaxSearchOffset));
    search->add_option("--sort", request->sort, "relevance (the default), date (newest first) or name")
        ->check(CLI::IsMember({"relevance", "date", "name"}));
    search->add_flag("--facets", request->facets, "Count the hits per type, year, artist and camera");
    search->callback([&ctx, request, words] {
        for (const auto& word : *words) request->query += (request->query.empty() ? "" : " ") + word;
        ctx.status = Search(ctx, *request);
    });
}

}  // namespace fileindexctl
