// The sorted, paged listing with additional facts.
#include "testkit.h"

#include "queue_readings.h"

namespace {

class ListingTest : public testkit::IndexFixture {
protected:
    void SetUp() override {
        IndexFixture::SetUp();
        // Ten folders whose names sort differently from their paths.
        const char* names[] = {"delta", "Alpha", "echo", "Charlie", "bravo", "golf", "Foxtrot", "india", "hotel", "Juliet"};
        Json::Value conf(Json::objectValue);
        for (int i = 0; i < 10; ++i) {
            const std::string path = "/music/f" + std::to_string(i);
            MakeDir(music_ + "/f" + std::to_string(i));
            Json::Value folder(Json::objectValue);
            folder["name"] = names[i];
            folder["photo"] = (i % 3 == 0);
            folder["audio"] = (i % 2 == 1);
            conf[path] = folder;
        }
        testkit::WriteFile(FolderConf(), toString(conf));
    }
    Json::Value List(unsigned long offset, unsigned long limit, const std::string& sortBy, const std::string& direction,
                     const Json::Value& additional = Json::Value(Json::arrayValue)) {
        Json::Value out;
        EXPECT_TRUE(IndexMgr::List(out, offset, limit, sortBy, direction, additional));
        return out;
    }
};

// Names sort ignoring case; a descending page is the ascending one's records reversed; a limit of
// zero and offsets at or past the end give empty pages; flags sort false first; unknown keys and
// directions sort by path, ascending.
TEST_F(ListingTest, PagesInEveryOrder) {
    using Texts = std::vector<std::string>;
    struct Case {
        unsigned long offset, limit;
        std::string sortBy, direction;
        Texts names;
    };
    const Case cases[] = {
        {0, 3, "name", "ASC", {"Alpha", "bravo", "Charlie"}},   {0, 3, "name", "DESC", {"Charlie", "bravo", "Alpha"}},
        {8, 5, "name", "ASC", {"india", "Juliet"}},             {8, 5, "name", "DESC", {"bravo", "Alpha"}},
        {0, 2, "name", "desc", {"Alpha", "bravo"}},             {0, 2, "Name", "", {"delta", "Alpha"}},
        {0, 0, "name", "ASC", {}},                              {10, 5, "name", "DESC", {}},
        {11, 5, "name", "ASC", {}},                             {1000000, 5, "path", "ASC", {}},
        {5, 2, "photo", "ASC", {"hotel", "delta"}},             {4, 2, "audio", "ASC", {"hotel", "Alpha"}},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(std::to_string(c.offset) + " " + std::to_string(c.limit) + " " + c.sortBy + " " + c.direction);
        const Json::Value out = List(c.offset, c.limit, c.sortBy, c.direction);
        Texts names;
        for (const auto& folder : out["folder"]) names.push_back(folder["name"].asString());
        EXPECT_EQ(names, c.names);
        EXPECT_EQ(out["total"].asUInt(), 10u);
        EXPECT_EQ(out["offset"].asUInt64(), c.offset);
        EXPECT_EQ(out.getMemberNames(), (Texts{"folder", "offset", "total"}));
    }
    EXPECT_EQ(List(0, 1, "", "")["folder"][0].getMemberNames(),
              (Texts{"additional", "audio", "document", "name", "path", "photo", "video"}));
}

// Unknown facts are null; a malformed list of facts still lists every folder; validity follows the
// folder's directory; a file that cannot be loaded leaves the answer alone.
TEST_F(ListingTest, AdditionalFactsAndTheirFailures) {
    auto out = List(0, 1, "", "ASC", J(R"(["status", "colour", "is_valid"])"));
    EXPECT_EQ(out["folder"][0]["additional"], J(R"({"status": "finished", "colour": null, "is_valid": true})"));
    EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_BAD_PARAM);
    EXPECT_TRUE(testkit::Logged("Unknown additional: colour"));
    EXPECT_TRUE(testkit::Logged("Failed to get additional: colour"));
    out = List(0, 2, "", "ASC", J(R"({"status": 1})"));
    ASSERT_EQ(out["folder"].size(), 2u);
    EXPECT_EQ(out["folder"][1]["additional"], J("{}"));
    EXPECT_TRUE(testkit::Logged("Bad param: {\"status\":1}"));
    EXPECT_TRUE(testkit::Logged("GetAdditional failed"));
    out = List(0, 1, "", "ASC", J(R"(["is_valid", 7, "status"])"));
    EXPECT_EQ(out["folder"][0]["additional"], J(R"({"is_valid": true})"));
    EXPECT_TRUE(testkit::Logged("Bad param: 7"));
    testkit::WriteFile(FolderConf(), R"({"/music/gone": {}})");
    EXPECT_EQ(List(0, 5, "", "ASC", J(R"(["status", "is_valid"])"))["folder"][0]["additional"],
              J(R"({"status": "paused", "is_valid": false})"));
    testkit::WriteFile(FolderConf(), "[]");
    out = "untouched";
    EXPECT_FALSE(IndexMgr::List(out, 0, 5, "", "", J("[]")));
    EXPECT_EQ(out.asString(), "untouched");
}

TEST_F(ListingTest, OneReadingPerQueueGivesTheWordsOfAReadingPerFolderAndLogsOnce) {
    const auto record = [this](const std::string& inside) {
        return "{\"event\":131072,\"path\":\"" + music_ + inside + "\"}\n";
    };
    MakeDir(music_ + "/@eaDir");
    // Folders of several lengths, nested and sharing a prefix, on one page.
    Json::Value conf = testkit::ParseJson(testkit::ReadFile(FolderConf()));
    for (const char* inside : {"/f1/x", "/f33"}) {
        MakeDir(music_ + inside);
        conf[std::string("/music") + inside] = Json::Value(Json::objectValue);
    }
    testkit::WriteFile(FolderConf(), toString(conf));
    testkit::WriteFile(QueueOf("music"), "junk 1\n" + record("/f1/x") + "[2]\n" + record("/f3") + "{\"event\":-1}\n");
    testkit::WriteFile(QueueOf("music") + ".tmp", "tmp junk\n" + record("/f5/y") +
                                                      "{\"event\":256,\"path\":\"/elsewhere\",\"path_old\":\"" + music_ + "/f7/z\"}\n");
    const Json::Value out = List(0, 12, "path", "ASC", J(R"(["status", "is_valid"])"));
    EXPECT_EQ(testkit::LogMessages(), (std::vector<std::string>{"Malformed command: junk 1", "Malformed command: [2]",
                                                                "Malformed command: {\"event\":-1}", "Malformed command: tmp junk"}));
    testkit::ClearLog();
    for (const auto& folder : out["folder"]) {
        SCOPED_TRACE(folder["path"].asString());
        detail::ForgetQueueReadings();  // a reading per folder, from scratch
        EXPECT_EQ(folder["additional"]["status"].asString(), StatusMgr::GetFolderStatus(folder["path"].asString()));
    }
    std::string words;  // f7 holds a record moved out of it
    for (const auto& folder : out["folder"]) words += folder["path"].asString().substr(6) + " " + folder["additional"]["status"].asString()[0];
    EXPECT_EQ(words, "/f0 f/f1 p/f1/x p/f2 f/f3 p/f33 f/f4 f/f5 p/f6 f/f7 p/f8 f/f9 f");
}

}  // namespace
