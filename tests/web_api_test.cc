// The console's JSON API over HTTP: a real fileindex-web process on a free loopback port.
#include "testkit.h"

#include <atomic>
#include <chrono>
#include <thread>

#include <httplib.h>

namespace {

class WebApiTest : public testkit::IndexFixture {
protected:
    void SetUp() override {
        IndexFixture::SetUp();
        testkit::WriteFile(FolderConf(), R"({"/music/a": {"name": "A"}, "/photo/a": {"name": "P"}})");
        log_ = Path("/web.log");
        port_ = testkit::StartListening({FILEINDEX_WEB, "--listen", "127.0.0.1:0", "--allow-host", "Console.Example"}, log_, pid_);
        ASSERT_NE(port_, 0) << testkit::ReadFile(log_);
        token_ = testkit::ReadFile(Path("/usr/qira/etc/fileindex/web.token"));
        token_.pop_back();
        client_ = std::make_unique<httplib::Client>("127.0.0.1", port_);
    }
    void TearDown() override {
        client_.reset();
        EXPECT_EQ(testkit::Stop(pid_), 0);
        IndexFixture::TearDown();
    }
    struct Answer {
        int status = 0;
        Json::Value body;
        std::string retryAfter;
    };
    Answer Get(const std::string& path) { return Of(client_->Get(path.c_str())); }
    Answer Post(const std::string& path, const std::string& body, httplib::Headers headers = {}) {
        if (headers.empty()) headers = {{"X-Fileindex-Token", token_}};
        return Of(client_->Post(path.c_str(), headers, body, "application/json"));
    }
    static Answer Of(const httplib::Result& result) {
        Answer answer;
        if (!result) return answer;
        answer.status = result->status;
        answer.retryAfter = result->get_header_value("Retry-After");
        if (result->get_header_value("Content-Type") == "application/json") answer.body = testkit::ParseJson(result->body);
        return answer;
    }
    // A connected loopback socket to the console.
    int Connect() const {
        const int fd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_port = htons(static_cast<uint16_t>(port_));
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        EXPECT_EQ(connect(fd, reinterpret_cast<sockaddr*>(&address), sizeof address), 0);
        return fd;
    }
    // The status line of the answer to a request sent as it stands.
    std::string RawStatusLine(const std::string& request) const {
        const int fd = Connect();
        EXPECT_EQ(write(fd, request.data(), request.size()), static_cast<ssize_t>(request.size()));
        std::string answer;
        char buffer[4096];
        for (ssize_t got; answer.find("\r\n") == std::string::npos && (got = read(fd, buffer, sizeof buffer)) > 0;) {
            answer.append(buffer, static_cast<size_t>(got));
        }
        close(fd);
        return answer.substr(0, answer.find("\r\n"));
    }
    // The envelope: the same members whatever the outcome.
    static void ExpectShape(const Answer& answer, bool ok) {
        EXPECT_EQ(answer.body.getMemberNames(), (std::vector<std::string>{"error", "log", "message", "ok", "result", "saved"}));
        EXPECT_EQ(answer.body["ok"].asBool(), ok);
    }

    std::string log_;
    pid_t pid_ = -1;
    int port_ = 0;
    std::string token_;
    std::unique_ptr<httplib::Client> client_;
};

TEST_F(WebApiTest, EveryRouteAnswersWithTheLibrarysResultOrFailure) {
    const long long lastHour = (INT32_MAX - time(nullptr)) / 3600;  // a pause ends before 2038-01-19
    struct Case {
        std::string method, route, body;
        int status;
    };
    const std::vector<Case> cases = {
        {"GET", "/api/folders?offset=1&limit=1&sort_by=name&sort_direction=DESC&additional=status,is_valid", "", 200},
        {"GET", "/api/folders?additional=bogus", "", 400},
        {"GET", "/api/folder?path=/music/a", "", 200},
        {"GET", "/api/folder?path=/music/none", "", 404},
        {"POST", "/api/folders", R"([{"path": "/music/b", "audio": true}])", 200},
        {"POST", "/api/folders", R"([{"path": "/music/../etc"}])", 400},
        {"POST", "/api/folders", R"([{"path": "/nosuch/a"}])", 404},
        {"POST", "/api/folders/delete", R"(["/music/b"])", 200},
        {"POST", "/api/folders/delete", R"([5])", 400},
        {"POST", "/api/reindex", R"(["/music/a"])", 200},
        {"POST", "/api/reindex", R"(["/nosuch/a"])", 404},
        {"POST", "/api/reindex", R"(["/music/a/../../x"])", 400},
        {"GET", "/api/status", "", 200},
        {"POST", "/api/pause", R"({"hours": 2})", 200},
        {"POST", "/api/pause", R"({"hours": -1})", 400},
        {"POST", "/api/pause", R"({"hours": 1.5})", 400},
        {"POST", "/api/pause", R"({"hours": -4294967295})", 400},
        {"POST", "/api/pause", R"({"hours": 4294967297})", 400},
        {"POST", "/api/pause", R"({"hours": "2"})", 400},
        {"POST", "/api/pause", R"({"hours": 0})", 200},
        {"POST", "/api/pause", "{\"hours\": " + std::to_string(lastHour - 1) + "}", 200},
        {"POST", "/api/pause", "{\"hours\": " + std::to_string(lastHour + 1) + "}", 400},
        {"POST", "/api/resume", "", 200},
        {"GET", "/api/explain?path=/music/a", "", 200},
        {"GET", "/api/explain?path=/nosuch/a", "", 404},
        {"GET", "/api/progress", "", 200},
        {"POST", "/api/shares/revive", R"({"share": "music"})", 200},
        {"POST", "/api/shares/revive", R"({})", 400},
        {"POST", "/api/shares/need-reindex", R"({"share": "music", "need_reindex": false})", 200},
        {"POST", "/api/shares/need-reindex", R"({"share": "music"})", 400},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.method + " " + c.route + " " + c.body);
        const Answer answer = c.method == "GET" ? Get(c.route) : Post(c.route, c.body);
        EXPECT_EQ(answer.status, c.status) << testkit::ReadFile(log_);
        ExpectShape(answer, c.status == 200);
        EXPECT_EQ(answer.body["message"].asString().empty(), c.status == 200);
    }
    EXPECT_EQ(Get("/api/explain?path=/music/a").body["result"]["governing_folder"]["name"].asString(), "A");
    // Numbers of up to nine digits are taken; a longer one stands for its default.
    EXPECT_EQ(Get("/api/folders?offset=999999999&limit=1").body["result"]["offset"].asUInt(), 999999999u);
    EXPECT_EQ(Get("/api/folders?offset=1000000000&limit=1").body["result"]["folder"].size(), 1u);
    const Answer failed = Post("/api/folders/delete", R"([5])");
    EXPECT_EQ(failed.body["error"], J(R"({"name": "FILEINDEX_ERR_BAD_PARAM", "number": 1})"));
    EXPECT_EQ(failed.body["log"], J(R"(["Bad param: 5"])"));
    const Answer refused = Post("/api/reindex", R"(["/music/a/../../x"])");
    EXPECT_EQ(refused.body["error"], J(R"({"name": "BAD_PATH", "number": 0})"));
    EXPECT_EQ(refused.body["message"].asString(),
              "reindex failed: BAD_PATH: \"/music/a/../../x\" has an empty, \".\" or \"..\" component; give the folder's own path");
}

// Pages follow each other in both directions, the same pages the command-line tool shows.
TEST_F(WebApiTest, FolderPagesFollowEachOtherInBothDirectionsAsInTheTool) {
    // Names sort the other way round from paths.
    testkit::WriteFile(FolderConf(), R"({"/music/a": {"name": "e"}, "/music/b": {"name": "d"}, "/music/c": {"name": "c"},
                                         "/photo/a": {"name": "b"}, "/photo/b": {"name": "a"}})");
    const auto paths = [](const Json::Value& listing) {
        std::string shown;
        for (const auto& folder : listing["folder"]) shown += folder["path"].asString() + " ";
        return shown;
    };
    const std::vector<std::string> byPath = {"/music/a", "/music/b", "/music/c", "/photo/a", "/photo/b"};
    const std::vector<std::tuple<std::string, std::vector<std::string>, bool>> orders = {
        {"", {}, false}, {"&sort_direction=DESC", {"--desc"}, true}, {"&sort_by=name", {"--sort", "name"}, true}};
    for (const auto& [query, options, reversed] : orders) {
        std::vector<std::string> order = byPath;
        if (reversed) std::reverse(order.begin(), order.end());
        for (const size_t limit : {1, 2, 3, 5}) {
            for (const size_t offset : {0, 1, 2, 4, 5}) {
                SCOPED_TRACE(query + " limit " + std::to_string(limit) + " offset " + std::to_string(offset));
                std::string expected;
                for (size_t i = offset; i < std::min(offset + limit, order.size()); ++i) expected += order[i] + " ";
                const std::string page = "offset=" + std::to_string(offset) + "&limit=" + std::to_string(limit);
                const Json::Value listing = Get("/api/folders?" + page + query).body["result"];
                EXPECT_EQ(paths(listing), expected);
                EXPECT_EQ(listing["offset"].asUInt64(), offset);
                std::vector<std::string> args = {FILEINDEXCTL, "--json", "folder", "list", "--offset", std::to_string(offset), "--limit",
                                                 std::to_string(limit)};
                args.insert(args.end(), options.begin(), options.end());
                EXPECT_EQ(paths(testkit::ParseJson(testkit::Run(args).out)["result"]), expected);
            }
        }
    }
}

// What the console shows beside the library's answers: the daemon's state, why indexing is not
// done, why a folder cannot be indexed, and a warning for such a folder when it is added.
TEST_F(WebApiTest, StatusAndListingTellTheDaemonsStateAndWhyAFolderIsNotIndexable) {
    Json::Value status = Get("/api/status").body["result"];
    EXPECT_EQ(status["daemon"], J(R"({"socket": ")" + DaemonSocketPath() + R"(", "answers": true, "reason": null})"));
    EXPECT_TRUE(status["not_done"].isNull());
    EXPECT_EQ(status["banner"]["text"].asString(), "Up to date: 0 files indexed");
    for (const auto& share : status["progress"]["shares"]) {  // nothing published by a daemon: nothing applied, no date
        EXPECT_EQ(share["applied"], Json::Value(0));
        EXPECT_EQ(share["files_left"], share["files"]);
        EXPECT_TRUE(share["up_to_date"].isNull());
    }
    const Answer added = Post("/api/folders", R"([{"path": "/music/ghost"}])");
    EXPECT_EQ(added.body["result"]["warnings"][0].asString(),
              "/music/ghost cannot be indexed now: the directory does not exist (canonical_path); it stays listed as not "
              "valid until that changes");
    const Json::Value listing = Get("/api/folders?additional=status").body["result"];
    EXPECT_EQ(listing["folder"][0]["additional"], J(R"({"status": "finished"})"));
    EXPECT_EQ(listing["folder"][1]["additional"], J(R"({"status": "paused", "refused_by": "canonical_path"})"));
    daemon_.reset();
    status = Get("/api/status").body["result"];
    EXPECT_FALSE(status["daemon"]["answers"].asBool());
    EXPECT_EQ(status["banner"]["state"].asString(), "daemon_down");
    EXPECT_EQ(status["not_done"].asString(), "indexing is processing and the indexing daemon does not answer at " +
                                                 DaemonSocketPath() + " (No such file or directory)");
    MakeDir(QueueOf("music") + ".tmp");  // a share's user made a directory where the companion goes
    status = Get("/api/status").body["result"];
    EXPECT_EQ(status["not_done"].asString(), "indexing is processing; share music: its queue's companion is a directory, not a "
                                             "queue file (the indexing daemon sets it aside) and the indexing daemon does not "
                                             "answer at " + DaemonSocketPath() + " (No such file or directory)");
    EXPECT_EQ(status["shares"][0]["queue_problems"], J(R"({"companion": "a directory"})"));
}

// Every write route holds each check on both sides of its boundary: the token (absent, empty, a
// prefix, one character more or changed, in the query string), the origin (foreign, one that
// merely begins with the console's, "null") and the body (JSON only, at most 64 KiB).
TEST_F(WebApiTest, EveryWriteRouteNeedsTheTokenTheSameOriginAndAJsonBody) {
    const std::string origin = "http://127.0.0.1:" + std::to_string(port_);
    std::string changed = token_;
    changed.back() = changed.back() == 'a' ? 'b' : 'a';
    struct Case {
        std::string name;
        httplib::Headers headers;
        std::string query, contentType, body;
        int status;
    };
    const std::string pause = R"({"hours": 2})";
    const std::vector<Case> cases = {
        {"no token", {}, "", "application/json", pause, 403},
        {"empty token", {{"X-Fileindex-Token", ""}}, "", "application/json", pause, 403},
        {"a prefix", {{"X-Fileindex-Token", token_.substr(0, token_.size() - 1)}}, "", "application/json", pause, 403},
        {"one more", {{"X-Fileindex-Token", token_ + "0"}}, "", "application/json", pause, 403},
        {"changed", {{"X-Fileindex-Token", changed}}, "", "application/json", pause, 403},
        {"in the query", {}, "?token=" + token_, "application/json", pause, 403},
        {"foreign origin", {{"X-Fileindex-Token", token_}, {"Origin", "http://evil.example"}}, "", "application/json", pause, 403},
        {"origin prefix", {{"X-Fileindex-Token", token_}, {"Origin", origin + ".evil.example"}}, "", "application/json", pause, 403},
        {"null origin", {{"X-Fileindex-Token", token_}, {"Origin", "null"}}, "", "application/json", pause, 403},
        {"cross-site fetch", {{"X-Fileindex-Token", token_}, {"Sec-Fetch-Site", "cross-site"}}, "", "application/json", pause, 403},
        {"text/plain", {{"X-Fileindex-Token", token_}}, "", "text/plain", pause, 415},
        {"text/json", {{"X-Fileindex-Token", token_}}, "", "text/json", pause, 415},
        {"not JSON", {{"X-Fileindex-Token", token_}}, "", "application/json", "{", 400},
        {"over 64 KiB", {{"X-Fileindex-Token", token_}}, "", "application/json", std::string(64 * 1024 + 1, ' '), 413},
    };
    const std::vector<std::string> routes = {"/api/folders", "/api/folders/delete", "/api/reindex", "/api/pause",
                                             "/api/resume", "/api/shares/revive", "/api/shares/need-reindex"};
    const std::string folders = testkit::ReadFile(FolderConf()), status = testkit::ReadFile(StatusConf());
    for (const auto& route : routes) {
        for (const auto& c : cases) {
            SCOPED_TRACE(route + ": " + c.name);
            EXPECT_EQ(Of(client_->Post((route + c.query).c_str(), c.headers, c.body, c.contentType.c_str())).status, c.status);
        }
    }
    EXPECT_EQ(testkit::ReadFile(FolderConf()), folders);
    EXPECT_EQ(testkit::ReadFile(StatusConf()), status);
    const httplib::Headers allowed = {{"X-Fileindex-Token", token_}, {"Origin", origin}};
    EXPECT_EQ(Of(client_->Post("/api/pause", allowed, std::string(64 * 1024 - pause.size(), ' ') + pause, "application/json")).status,
              200);
    EXPECT_NE(testkit::ReadFile(StatusConf()), status);  // a body of exactly 64 KiB is taken
    // A missing token is named where the page takes it and where it is kept.
    EXPECT_EQ(Post("/api/resume", "{}", {{"Origin", origin}}).body["message"].asString(),
              "this request changes something: put the console's token in \"Token for changes\" at the top of the page; it is kept "
              "in " + Path("/usr/qira/etc/fileindex/web.token") + " on the appliance (scripts send it in X-Fileindex-Token)");
}

// A page elsewhere whose name points at 127.0.0.1 reads nothing: a Host that is not the console's
// own is refused before any route, the page, the files, reads and writes alike. Every kind of
// answer carries the headers a reviewer expects of an admin page.
TEST_F(WebApiTest, OnlyTheConsolesOwnNamesAreAnsweredAndEveryAnswerIsGuarded) {
    const std::string port = std::to_string(port_);
    const std::vector<std::pair<std::string, bool>> hosts = {
        {"127.0.0.1:" + port, true},          {"localhost:" + port, true},
        {"LocalHost:" + port, true},          {"console.example:" + port, true},
        {"evil.example:" + port, false},      {"evil.example", false},
        {"127.0.0.1", false},                 {"127.0.0.1:" + std::to_string(port_ + 1), false},
        {"127.0.0.1:" + port + "0", false},   {"console.example", false},
        {"127.0.0.1:" + port + ".evil.example", false},
    };
    const std::vector<std::pair<std::string, int>> routes = {{"/", 200}, {"/app.js", 200}, {"/api/folders", 200}, {"/api/nosuch", 404}};
    for (const auto& [host, answered] : hosts) {
        for (const auto& [route, status] : routes) {
            SCOPED_TRACE(host + " " + route);
            const auto result = client_->Get(route.c_str(), {{"Host", host}});
            ASSERT_TRUE(result);
            EXPECT_EQ(result->status, answered ? status : 421);
            if (!answered) {
                EXPECT_EQ(Of(result).body["error"]["name"].asString(), "HOST_REFUSED");
            }
            EXPECT_EQ(result->get_header_value("Content-Security-Policy"),
                      "default-src 'self'; script-src 'self'; style-src 'self'; object-src 'none'; base-uri 'none'; "
                      "form-action 'self'; frame-ancestors 'none'");
            EXPECT_EQ(result->get_header_value("X-Content-Type-Options"), "nosniff");
            EXPECT_EQ(result->get_header_value("Referrer-Policy"), "no-referrer");
            EXPECT_EQ(result->get_header_value("Cache-Control"), "no-store");
        }
        SCOPED_TRACE(host + " POST /api/pause");
        const Answer write = Post("/api/pause", R"({"hours": 1})", {{"X-Fileindex-Token", token_}, {"Host", host}});
        EXPECT_EQ(write.status, answered ? 200 : 421);
    }
    EXPECT_EQ(RawStatusLine("GET /api/folders HTTP/1.0\r\n\r\n"), "HTTP/1.1 421 Misdirected Request");
    const std::string page = client_->Get("/")->body;
    EXPECT_NE(page.find("<title>File indexing</title>"), std::string::npos);
    EXPECT_EQ(page.find("<script>"), std::string::npos);  // no inline script for the policy to block
    EXPECT_EQ(page.find(" style="), std::string::npos);
}

// The token is kept where only its owner can read it, and one that others could read is refused.
TEST_F(WebApiTest, TheTokenFileIsTheOwnersAlone) {
    EXPECT_EQ(testkit::ModeOf(Path("/usr/qira/etc/fileindex/web.token")), S_IFREG | 0600u);
    for (const mode_t mode : {0640, 0604, 0620}) {
        SCOPED_TRACE(mode);
        ASSERT_EQ(chmod(Path("/usr/qira/etc/fileindex/web.token").c_str(), mode), 0);
        const std::string log = Path("/refused-" + std::to_string(mode) + ".log");
        const pid_t pid = testkit::Start({FILEINDEX_WEB, "--listen", "127.0.0.1:0"}, log);
        ASSERT_TRUE(testkit::WaitFor([&] {
            const std::string text = testkit::ReadFile(log);
            return text.find("mode 0600)") != std::string::npos || text.find("listening") != std::string::npos;
        }));
        if (testkit::ReadFile(log).find("listening") != std::string::npos) {
            ADD_FAILURE() << "the console started with a token file of mode " << mode;
            testkit::Stop(pid);
            continue;
        }
        EXPECT_NE(testkit::ReadFile(log).find("cannot read or make the token"), std::string::npos) << testkit::ReadFile(log);
        int status = 0;
        ASSERT_EQ(waitpid(pid, &status, 0), pid);  // it is on its way out
        EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 1);
    }
}

TEST_F(WebApiTest, AHeldLockIsRetryableAndStaticFilesStayInTheirDirectory) {
    {
        testkit::ChildHolding holder([] { return Folders().Lock(true); });
        ASSERT_TRUE(holder.Took());
        const Answer busy = Post("/api/folders", R"([{"path": "/music/b"}])");
        EXPECT_EQ(busy.status, 409);
        EXPECT_EQ(busy.retryAfter, "1");
        EXPECT_EQ(busy.body["error"]["name"].asString(), "FILEINDEX_ERR_LOCK");
    }
    EXPECT_EQ(Post("/api/folders", R"([{"path": "/music/b"}])").status, 200);
    for (const char* escape : {"/../CMakeLists.txt", "/%2e%2e/CMakeLists.txt", "/static/../../LICENSE", "/..%2fLICENSE"}) {
        SCOPED_TRACE(escape);
        const auto result = client_->Get(escape);
        ASSERT_TRUE(result) << escape;
        EXPECT_EQ(result->status, 404) << escape;
    }
}

// Connections that never finish their request, more than a small pool of workers, cannot keep a
// real request from its answer: each sends a header byte now and then, so that none of them is
// dropped for idleness while the real request waits.
TEST_F(WebApiTest, TricklingClientsDoNotBlockTheServer) {
    std::vector<int> slow;
    for (int i = 0; i < 100; ++i) {
        slow.push_back(Connect());
        const std::string start = "GET /api/status HTTP/1.1\r\nHost: 127.0.0.1\r\nX-Slow: ";
        ASSERT_EQ(write(slow.back(), start.data(), start.size()), static_cast<ssize_t>(start.size()));
    }
    std::atomic<bool> answered{false};
    std::thread trickle([&] {
        while (!answered) {
            for (const int fd : slow) (void)send(fd, "a", 1, MSG_NOSIGNAL);
            std::this_thread::sleep_for(std::chrono::milliseconds(5));
        }
    });
    httplib::Client client("127.0.0.1", port_);
    client.set_read_timeout(60, 0);  // a guard against a hang only
    const auto result = client.Get("/api/status");
    answered = true;
    trickle.join();
    ASSERT_TRUE(result);
    EXPECT_EQ(result->status, 200);
    for (const int fd : slow) close(fd);
}

}  // namespace
