// Reindex: validation first, revival of out-of-space shares, events in request order.
#include "testkit.h"

namespace {

class ReindexTest : public testkit::IndexFixture {
protected:
    void SetUp() override {
        IndexFixture::SetUp();
        testkit::WriteFile(FolderConf(), R"({"/music/a": {}, "/photo/a": {}})");
    }
    Json::Value Event(const std::string& path) {
        return J("{\"event\": 65536, \"path\": \"" + path + "\", \"data\": null}");
    }
};

TEST_F(ReindexTest, EventsInRequestOrderUntilOneFails) {
    ASSERT_TRUE(IndexMgr::Reindex(J(R"(["/music/b", "/music/a", "/music/c"])")));
    EXPECT_EQ(Queue("music"), (std::vector<Json::Value>{Event(music_ + "/b"), Event(music_ + "/a"), Event(music_ + "/c")}));
    // A second request for the same path is covered by the pending reindex.
    ASSERT_TRUE(IndexMgr::Reindex(J(R"(["/music/a"])")));
    EXPECT_EQ(Queue("music").size(), 3u);
    EXPECT_TRUE(IndexMgr::Reindex(J("[]")));
    EXPECT_TRUE(Messages().empty());
    // An event that cannot be queued stops the request, keeping the earlier events.
    MakeDir(QueueOf("photo"));
    EXPECT_FALSE(IndexMgr::Reindex(J(R"(["/music/d", "/photo/a", "/music/e"])")));
    EXPECT_TRUE(testkit::Logged("AddCustomEvent failed, path=/photo/a"));
    EXPECT_EQ(Queue("music").size(), 4u);
}

TEST_F(ReindexTest, ValidationFailsBeforeAnyRevivalOrEvent) {
    testkit::WriteFile(StatusConf(), R"({"no_space": {"music": true}})");
    const std::string status = testkit::ReadFile(StatusConf());
    EXPECT_FALSE(IndexMgr::Reindex(J(R"(["/music/a", 5])")));
    EXPECT_EQ(testkit::LogMessages(), std::vector<std::string>{"Malformed jsArrPath: 5"});
    EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_BAD_PARAM);
    testkit::ClearLog();
    EXPECT_FALSE(IndexMgr::Reindex(J(R"({"paths": []})")));
    EXPECT_EQ(testkit::LogMessages(), std::vector<std::string>{"Malformed jsArrPath: {\"paths\":[]}"});
    testkit::ClearLog();
    testkit::ClearError();
    AddShare("empty");
    EXPECT_FALSE(IndexMgr::Reindex(J(R"(["/music/a", "/empty/x"])")));  // share without folders: silent
    EXPECT_TRUE(testkit::LogLines().empty());
    EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_NONE);
    EXPECT_EQ(testkit::ReadFile(StatusConf()), status);
    EXPECT_FALSE(testkit::Exists(QueueOf("music")));
    EXPECT_TRUE(Messages().empty());
}

TEST_F(ReindexTest, OutOfSpaceSharesAreRevivedOnceInAscendingOrder) {
    testkit::WriteFile(StatusConf(), R"({"no_space": {"music": true, "photo": true, "other": true}})");
    ASSERT_TRUE(IndexMgr::Reindex(J(R"(["/photo/a", "/music/a", "/music/b"])")));
    const auto messages = Messages();
    ASSERT_EQ(messages.size(), 2u);
    EXPECT_EQ(messages[0]["data"]["share_name"].asString(), "music");
    EXPECT_EQ(messages[1]["data"]["share_name"].asString(), "photo");
    EXPECT_EQ(testkit::ParseJson(testkit::ReadFile(StatusConf())), J(R"({"no_space": {"other": true}})"));
    EXPECT_EQ(Queue("music").size(), 2u);
    EXPECT_EQ(Queue("photo").size(), 1u);
    testkit::WriteFile(StatusConf(), R"({"no_space": {"music": true}})");
    daemon_.reset();  // a failed revival still queues the events
    EXPECT_TRUE(IndexMgr::Reindex(J(R"(["/music/c"])")));
    EXPECT_TRUE(testkit::Logged("ShareRevice failed, share=music"));
    EXPECT_EQ(Queue("music").size(), 3u);
}

}  // namespace
