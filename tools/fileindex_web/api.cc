#include "api.h"

#include <algorithm>
#include <functional>
#include <mutex>
#include <optional>

#include "captured_log.h"
#include "envelope.h"
#include "fileindex/fileindex.h"
#include "banner.h"
#include "daemon_progress.h"
#include "file_explain.h"
#include "folder_page.h"
#include "folder_view.h"
#include "pending_rate.h"
#include "pause.h"
#include "saved_files.h"
#include "search_view.h"
#include "service_view.h"
#include "share_path_check.h"
#include "token.h"

namespace web {
namespace {

using QIRA::FILEINDEX::ErrorHandler;
using QIRA::FILEINDEX::IndexMgr;
using QIRA::FILEINDEX::StatusMgr;

// The library keeps one error code per process: requests enter it one at a time.
std::mutex g_library;

void Send(Response& res, int status, const Json::Value& body) {
    res.status = status;
    res.SetContent(QIRA::FILEINDEX::toString(body), "application/json");
}

// A request refused before the library is called, with the cause the console found.
void Refuse(Response& res, const tools::Cause& cause, const std::string& message) {
    std::lock_guard<std::mutex> lock(g_library);
    tools::ClearCapturedLog();
    Send(res, cause.httpStatus, tools::FailureEnvelope(cause, message, {}, false));
}

void Refuse(Response& res, int status, const std::string& message) {
    Refuse(res, tools::Cause{"REFUSED", 0, message, status}, message);
}

// Runs one library operation and answers with the envelope: on failure its cause decides the
// status, a held lock answers 409 with Retry-After, and files saved before the failure are named.
// `found` is a cause the call itself may set before it fails.
void Run(Response& res, const std::string& operation, const std::function<bool(Json::Value&)>& call,
         const std::optional<tools::Cause>& found = std::nullopt) {
    std::lock_guard<std::mutex> lock(g_library);
    const tools::SavedFiles before;
    ErrorHandler::SetError(QIRA::FILEINDEX::FILEINDEX_ERR_NONE);
    tools::ClearCapturedLog();
    Json::Value result(Json::objectValue);
    if (call(result)) return Send(res, 200, tools::SuccessEnvelope(result, false));
    const tools::Cause cause = found ? *found : tools::CauseOfFailure();
    if (cause.number == QIRA::FILEINDEX::FILEINDEX_ERR_LOCK) res.SetHeader("Retry-After", "1");
    const auto saved = before.Changed();
    Send(res, cause.httpStatus, tools::FailureEnvelope(cause, tools::FailureMessage(operation, cause, saved), saved, false));
}

// Whether the request carries the token; else answers 403 saying why it is needed and where the
// token is kept.
bool HasToken(const Request& req, Response& res, const Token& token, const std::string& why) {
    if (req.HasHeader("X-Fileindex-Token") && TokenMatches(req.Header("X-Fileindex-Token"), token.value)) return true;
    Refuse(res, 403, why + ": put the console's token in \"Token for changes\" at the top of the page; it is kept in " +
                         token.file + " on the appliance (scripts send it in X-Fileindex-Token)");
    return false;
}

// Writes: the token, the same origin and a JSON body. False after answering the refusal.
bool AcceptWrite(const Request& req, Response& res, const Token& token, Json::Value& body) {
    if (!HasToken(req, res, token, "this request changes something")) {
        return false;
    }
    const std::string origin = req.Header("Origin");
    if ((!origin.empty() && origin != "http://" + req.Header("Host")) ||
        req.Header("Sec-Fetch-Site") == "cross-site") {
        Refuse(res, 403, "a write from another origin is refused");
        return false;
    }
    if (req.body.empty()) {
        body = Json::Value(Json::objectValue);
        return true;
    }
    if (req.Header("Content-Type").rfind("application/json", 0) != 0) {
        Refuse(res, 415, "the request body must be JSON (Content-Type: application/json)");
        return false;
    }
    if (!QIRA::FILEINDEX::fromString(body, req.body)) {
        Refuse(res, 400, "the request body is not valid JSON");
        return false;
    }
    return true;
}

using Write = std::function<bool(const Json::Value& body, Json::Value& result)>;

void Post(HttpServer& server, const Token& token, const std::string& route, const std::string& operation,
          const Write& write) {
    server.Post(route, [token, operation, write](const Request& req, Response& res) {
        Json::Value body;
        if (!AcceptWrite(req, res, token, body)) return;
        Run(res, operation, [&](Json::Value& result) { return write(body, result); });
    });
}

std::string Param(const Request& req, const std::string& name, const std::string& fallback = "") {
    return req.HasParam(name) ? req.Param(name) : fallback;
}

unsigned long Number(const Request& req, const std::string& name, unsigned long fallback) {
    const std::string text = Param(req, name);
    if (text.empty() || text.find_first_not_of("0123456789") != std::string::npos || text.size() > 9) return fallback;
    return std::stoul(text);
}

Json::Value Additional(const std::string& list) {
    Json::Value additional(Json::arrayValue);
    size_t start = 0;
    while (start < list.size()) {
        const size_t comma = list.find(',', start);
        const std::string item = list.substr(start, comma == std::string::npos ? std::string::npos : comma - start);
        if (!item.empty()) additional.append(item);
        if (comma == std::string::npos) break;
        start = comma + 1;
    }
    return additional;
}

// The drain seen across status answers, for the banner's rate and time left.
tools::PendingRate g_pendingRate;

bool ServiceStatus(Json::Value& result) {
    std::string word;
    long long resumeTime = -1;
    std::vector<QIRA::FILEINDEX::Folder> folders;
    if (!StatusMgr::GetStatus(word) || !StatusMgr::GetPauseInfo(resumeTime) || !IndexMgr::List(folders) ||
        !QIRA::FILEINDEX::GetProgress(result["progress"])) {
        return false;
    }
    result["status"] = word;
    result["pause"] = tools::PauseState(resumeTime);
    result["progress"]["pause"] = result["pause"];
    result["daemon"] = tools::DaemonState();
    const Json::Value daemonProgress = tools::ReadDaemonProgress();
    tools::BannerFacts facts =
        tools::GatherBannerFacts(word, resumeTime, result["daemon"], folders, result["progress"], daemonProgress);
    facts.rate = g_pendingRate.Update(facts.pending);
    result["banner"] = tools::Banner(facts);
    result["not_done"] = facts.notDone.empty() ? Json::Value() : Json::Value(facts.notDone);
    for (auto& share : result["progress"]["shares"]) tools::AddDaemonProgress(share, daemonProgress);
    result["shares"] = Json::Value(Json::arrayValue);
    for (const auto& share : tools::SharesOf(folders)) {
        Json::Value flags(Json::objectValue);
        flags["share"] = share;
        flags["no_space"] = StatusMgr::ShareIsNoSpace(share);
        flags["need_reindex"] = StatusMgr::ShareIsNeedReindex(share);
        flags["queue_problems"] = QIRA::FILEINDEX::QueueFileProblems(share);
        result["shares"].append(flags);
    }
    return true;
}

// The first path of an upsert or reindex request that is no share path of a known share; false
// after answering the refusal.
bool AcceptPaths(Response& res, const Json::Value& paths, const std::string& operation) {
    for (const auto& path : paths) {
        tools::Cause cause;
        if (path.isString() && !tools::CheckSharePath(path.asString(), cause)) {
            Refuse(res, cause, tools::FailureMessage(operation, cause, {}));
            return false;
        }
    }
    return true;
}

Json::Value PathsOf(const Json::Value& folders) {
    Json::Value paths(Json::arrayValue);
    for (const auto& folder : folders) {
        if (folder.isObject()) paths.append(folder["path"]);
    }
    return paths;
}

// Hours of an acceptable pause; -1 when not a whole number, negative, or ending past 2038.
int PauseHours(const Json::Value& body) {
    const Json::Value& hours = body["hours"];
    return hours.isIntegral() && tools::PauseEndFits(hours.asLargestInt()) ? static_cast<int>(hours.asLargestInt()) : -1;
}

std::string ShareOf(const Json::Value& body) {
    return body.isObject() && body["share"].isString() ? body["share"].asString() : "";
}

}  // namespace

void GuardHost(HttpServer& server, std::shared_ptr<const HostCheck> check) {
    server.SetGuard([check](const Request& req, Response& res) {
        if (check->Allows(req.Header("Host"))) return false;
        const std::string message = "this console answers only the names it listens on (see --allow-host)";
        Refuse(res, tools::Cause{"HOST_REFUSED", 0, message, 421}, message);
        return true;
    });
}

void AddApiRoutes(HttpServer& server, const Token& token) {
    server.Get("/api/folders", [](const Request& req, Response& res) {
        for (const auto& name : Additional(Param(req, "additional"))) {
            if (!tools::IsListingFact(name.asString())) {
                return Refuse(res, 400, "unknown additional fact \"" + name.asString() + "\"; use status, is_valid, indexed_files");
            }
        }
        Run(res, "list folders", [&](Json::Value& result) {
            return tools::ListFolderPage(result, Number(req, "offset", 0), Number(req, "limit", 50), Param(req, "sort_by", "path"),
                                         Param(req, "sort_direction", "ASC") == "DESC", Additional(Param(req, "additional")));
        });
    });
    server.Get("/api/folder", [](const Request& req, Response& res) {
        Run(res, "get folder", [&](Json::Value& result) { return IndexMgr::Get(result, Param(req, "path")); });
    });
    server.Get("/api/explain", [](const Request& req, Response& res) {
        std::optional<tools::Cause> unknownShare;
        Run(
            res, "explain",
            [&](Json::Value& result) {
                if (!QIRA::FILEINDEX::ExplainPath(Param(req, "path"), result)) return false;
                if (result["refused_by"] != "share_path") {
                    tools::CompleteExplanation(result);
                    return true;
                }
                unknownShare = tools::Cause{"SHARE_UNKNOWN", 0, result["problem"].asString(), 404};
                return false;
            },
            unknownShare);
    });
    server.Get("/api/progress", [](const Request&, Response& res) {
        Run(res, "progress", [](Json::Value& result) { return QIRA::FILEINDEX::GetProgress(result); });
    });
    server.Get("/api/status", [](const Request&, Response& res) { Run(res, "status", ServiceStatus); });
    // Answered beside other requests: the library is held only while the shares are found, and
    // the indexes, which a share's users can write, are read without it.
    server.GetSlow("/api/search", [token](const Request& req, Response& res) {
        if (!HasToken(req, res, token, "a search reads the files' text")) return;
        tools::SearchRequest request;
        request.query = Param(req, "q");
        request.type = Param(req, "type");
        request.share = Param(req, "share");
        request.limit = static_cast<int>(std::min<unsigned long>(Number(req, "limit", 20), 200));
        request.offset = static_cast<int>(std::min<unsigned long>(Number(req, "offset", 0), tools::kMaxSearchOffset + 1UL));
        if (!Param(req, "sort").empty()) request.sort = Param(req, "sort");
        request.facets = Param(req, "facets") == "1";
        std::vector<tools::SearchTarget> targets;
        tools::Cause cause;
        bool found = false;
        {
            std::lock_guard<std::mutex> lock(g_library);
            found = tools::SearchTargets(request, targets, cause);
        }
        Json::Value result;
        if (!found || !tools::SearchIndexes(request, targets, result, cause)) {
            return Refuse(res, cause, tools::FailureMessage("search", cause, {}));
        }
        Send(res, 200, tools::SuccessEnvelope(result, false));
    });

    server.Post("/api/folders", [token](const Request& req, Response& res) {
        Json::Value body;
        if (!AcceptWrite(req, res, token, body) || !AcceptPaths(res, PathsOf(body), "add or change folders")) return;
        Run(res, "add or change folders", [&](Json::Value& result) {
            if (!IndexMgr::Upsert(body)) return false;
            result["warnings"] = tools::IndexabilityWarnings(body);
            return true;
        });
    });
    Post(server, token, "/api/folders/delete", "delete folders",
         [](const Json::Value& body, Json::Value&) { return IndexMgr::Delete(body); });
    server.Post("/api/reindex", [token](const Request& req, Response& res) {
        Json::Value body;
        if (!AcceptWrite(req, res, token, body) || !AcceptPaths(res, body, "reindex")) return;
        Run(res, "reindex", [&](Json::Value&) { return IndexMgr::Reindex(body); });
    });
    Post(server, token, "/api/resume", "resume", [](const Json::Value&, Json::Value& result) {
        result["pause"] = tools::PauseState(-1);
        return StatusMgr::Resume();
    });
    server.Post("/api/pause", [token](const Request& req, Response& res) {
        Json::Value body;
        if (!AcceptWrite(req, res, token, body)) return;
        const int hours = PauseHours(body);
        if (hours < 0) return Refuse(res, 400, "\"hours\" must be a whole number, 0 or more, ending before 2038-01-19");
        Run(res, "pause", [hours](Json::Value& result) {
            long long resumeTime = -1;
            const bool paused = StatusMgr::Pause(hours);
            StatusMgr::GetPauseInfo(resumeTime);
            result["pause"] = tools::PauseState(resumeTime);
            return paused;
        });
    });
    server.Post("/api/shares/revive", [token](const Request& req, Response& res) {
        Json::Value body;
        if (!AcceptWrite(req, res, token, body)) return;
        if (ShareOf(body).empty()) return Refuse(res, 400, "\"share\" must name a share");
        Run(res, "revive share", [&](Json::Value&) { return StatusMgr::ShareRevive(ShareOf(body)); });
    });
    server.Post("/api/shares/need-reindex", [token](const Request& req, Response& res) {
        Json::Value body;
        if (!AcceptWrite(req, res, token, body)) return;
        if (ShareOf(body).empty() || !body["need_reindex"].isBool()) {
            return Refuse(res, 400, "\"share\" must name a share and \"need_reindex\" be true or false");
        }
        Run(res, "set need-reindex", [&](Json::Value&) {
            return StatusMgr::ShareSetNeedReindex(ShareOf(body), body["need_reindex"].asBool());
        });
    });
}

}  // namespace web
