// The console's JSON API over HTTP: a real fileindex-web process on a free loopback port.
#include "testkit.h"

#include <regex>

#include <httplib.h>

namespace {

class WebApiTest : public testkit::IndexFixture {
protected:
    void SetUp() override {
        IndexFixture::SetUp();
        testkit::WriteFile(FolderConf(), R"({"/music/a": {"name": "A"}, "/photo/a": {"name": "P"}})");
        log_ = Path("/web.log");
        pid_ = testkit::Start({FILEINDEX_WEB, "--listen", "127.0.0.1:0"}, log_);
        std::smatch port;
        ASSERT_TRUE(testkit::WaitFor([&] {
            const std::string log = testkit::ReadFile(log_);
            return std::regex_search(log, port, std::regex("listening on http://127.0.0.1:([0-9]+)/"));
        }));
        const std::string log = testkit::ReadFile(log_);
        std::regex_search(log, port, std::regex("listening on http://127.0.0.1:([0-9]+)/"));
        port_ = std::stoi(port[1]);
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
        {"POST", "/api/folders/delete", R"(["/music/b"])", 200},
        {"POST", "/api/folders/delete", R"([5])", 400},
        {"POST", "/api/reindex", R"(["/music/a"])", 200},
        {"POST", "/api/reindex", R"(["/nosuch/a"])", 404},
        {"POST", "/api/reindex", R"(["/music/a/../../x"])", 400},
        {"GET", "/api/status", "", 200},
        {"POST", "/api/pause", R"({"hours": 2})", 200},
        {"POST", "/api/pause", R"({"hours": -1})", 400},
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
    EXPECT_EQ(Get("/api/folders?offset=1&limit=1&sort_by=name&sort_direction=DESC").body["result"]["folder"][0]["name"].asString(),
              "A");
    EXPECT_EQ(Get("/api/explain?path=/music/a").body["result"]["governing_folder"]["name"].asString(), "A");
    const Answer failed = Post("/api/folders/delete", R"([5])");
    EXPECT_EQ(failed.body["error"], J(R"({"name": "FILEINDEX_ERR_BAD_PARAM", "number": 1})"));
    EXPECT_EQ(failed.body["log"], J(R"(["Bad param: 5"])"));
    const Answer refused = Post("/api/reindex", R"(["/music/a/../../x"])");
    EXPECT_EQ(refused.body["error"], J(R"({"name": "BAD_PATH", "number": 0})"));
    EXPECT_EQ(refused.body["message"].asString(),
              "reindex failed: BAD_PATH: \"/music/a/../../x\" has an empty, \".\" or \"..\" component; give the folder's own path");
}

// What the console shows beside the library's answers: the daemon's state, why indexing is not
// done, why a folder cannot be indexed, and a warning for such a folder when it is added.
TEST_F(WebApiTest, StatusAndListingTellTheDaemonsStateAndWhyAFolderIsNotIndexable) {
    Json::Value status = Get("/api/status").body["result"];
    EXPECT_EQ(status["daemon"], J(R"({"socket": ")" + DaemonSocketPath() + R"(", "answers": true, "reason": null})"));
    EXPECT_TRUE(status["not_done"].isNull());
    EXPECT_EQ(status["pause"]["resume_time_utc"], status["progress"]["pause"]["resume_time_utc"]);
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
    EXPECT_EQ(status["not_done"].asString(), "indexing is processing and the indexing daemon does not answer at " +
                                                 DaemonSocketPath() + " (No such file or directory)");
}

TEST_F(WebApiTest, WritesNeedTheTokenTheSameOriginAndAJsonBody) {
    const std::string body = R"([{"path": "/music/b"}])";
    EXPECT_EQ(Post("/api/folders", body, {{"X-Fileindex-Token", "wrong"}}).status, 403);
    EXPECT_EQ(Post("/api/folders", body, {{"X-Fileindex-Token", token_}, {"Origin", "http://evil.example"}}).status, 403);
    EXPECT_EQ(Post("/api/folders", body, {{"X-Fileindex-Token", token_}, {"Sec-Fetch-Site", "cross-site"}}).status, 403);
    EXPECT_EQ(Of(client_->Post("/api/folders", {{"X-Fileindex-Token", token_}}, body, "text/plain")).status, 415);
    EXPECT_EQ(Post("/api/folders", "[{", {{"X-Fileindex-Token", token_}}).status, 400);
    EXPECT_EQ(Post("/api/folders", std::string(100 * 1024, ' '), {{"X-Fileindex-Token", token_}}).status, 413);
    EXPECT_FALSE(Conf().isMember("/music/b"));
    const std::string origin = "http://127.0.0.1:" + std::to_string(port_);
    EXPECT_EQ(Post("/api/folders", body, {{"X-Fileindex-Token", token_}, {"Origin", origin}}).status, 200);
    EXPECT_TRUE(Conf().isMember("/music/b"));
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
    const auto page = client_->Get("/");
    ASSERT_TRUE(page);
    EXPECT_EQ(page->status, 200);
    EXPECT_NE(page->body.find("<title>File indexing</title>"), std::string::npos);
    for (const char* escape : {"/../CMakeLists.txt", "/%2e%2e/CMakeLists.txt", "/static/../../LICENSE", "/..%2fLICENSE"}) {
        SCOPED_TRACE(escape);
        const auto result = client_->Get(escape);
        ASSERT_TRUE(result) << escape;
        EXPECT_EQ(result->status, 404) << escape;
    }
}

TEST_F(WebApiTest, SlowAndManyClientsDoNotBlockTheServer) {
    std::vector<int> idle;
    for (int i = 0; i < 20; ++i) {  // connections that never send a request
        const int fd = socket(AF_INET, SOCK_STREAM, 0);
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_port = htons(static_cast<uint16_t>(port_));
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        ASSERT_EQ(connect(fd, reinterpret_cast<sockaddr*>(&address), sizeof address), 0);
        idle.push_back(fd);
    }
    httplib::Client client("127.0.0.1", port_);
    client.set_read_timeout(2, 0);  // the idle connections hold no worker this one would wait for
    const auto result = client.Get("/api/status");
    ASSERT_TRUE(result);
    EXPECT_EQ(result->status, 200);
    for (const int fd : idle) close(fd);
}

}  // namespace
