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
    std::vector<std::string> Names(const Json::Value& out) {
        std::vector<std::string> names;
        for (const auto& folder : out["folder"]) names.push_back(folder["name"].asString());
        return names;
    }
    Json::Value List(unsigned long offset, unsigned long limit, const std::string& sortBy, const std::string& direction,
                     const Json::Value& additional = Json::Value(Json::arrayValue)) {
        Json::Value out;
        EXPECT_TRUE(IndexMgr::List(out, offset, limit, sortBy, direction, additional));
        return out;
    }
};

TEST_F(ListingTest, AscendingPagesByNameIgnoringCase) {
    const auto out = List(0, 3, "name", "ASC");
    EXPECT_EQ(out["total"].asUInt(), 10u);
    EXPECT_EQ(out["offset"].asUInt(), 0u);
    EXPECT_EQ(Names(out), (std::vector<std::string>{"Alpha", "bravo", "Charlie"}));
    EXPECT_EQ(out.getMemberNames(), (std::vector<std::string>{"folder", "offset", "total"}));
    EXPECT_EQ(out["folder"][0].getMemberNames(),
              (std::vector<std::string>{"additional", "audio", "document", "name", "path", "photo", "video"}));
}

TEST_F(ListingTest, DescendingPageIsTheFirstRecordsReversed) {
    EXPECT_EQ(Names(List(0, 3, "name", "DESC")), (std::vector<std::string>{"Charlie", "bravo", "Alpha"}));
    EXPECT_EQ(Names(List(8, 5, "name", "ASC")), (std::vector<std::string>{"india", "Juliet"}));
    EXPECT_EQ(Names(List(8, 5, "name", "DESC")), (std::vector<std::string>{"bravo", "Alpha"}));
    EXPECT_EQ(Names(List(0, 2, "name", "desc")), (std::vector<std::string>{"Alpha", "bravo"}));
}

TEST_F(ListingTest, LimitZeroAndOffsetsAtOrBeyondTheEndGiveEmptyPages) {
    for (const unsigned long offset : {0ul, 10ul, 11ul, 1000000ul}) {
        SCOPED_TRACE(std::to_string(offset));
        const auto asc = List(offset, offset == 0 ? 0 : 5, "name", "ASC");
        EXPECT_EQ(asc["folder"], J("[]")) << offset;
        EXPECT_EQ(asc["total"].asUInt(), 10u);
        EXPECT_EQ(asc["offset"].asUInt64(), offset);
        EXPECT_EQ(List(offset, offset == 0 ? 0 : 5, "name", "DESC")["folder"], J("[]"));
    }
}

TEST_F(ListingTest, FlagSortsPutFalseFirstAndUnknownKeysSortByPath) {
    const auto byPhoto = List(0, 10, "photo", "ASC");
    for (int i = 0; i < 6; ++i) EXPECT_FALSE(byPhoto["folder"][i]["photo"].asBool());
    for (int i = 6; i < 10; ++i) EXPECT_TRUE(byPhoto["folder"][i]["photo"].asBool());
    const auto byAudio = List(0, 10, "audio", "ASC");
    for (int i = 0; i < 5; ++i) EXPECT_FALSE(byAudio["folder"][i]["audio"].asBool());
    for (int i = 5; i < 10; ++i) EXPECT_TRUE(byAudio["folder"][i]["audio"].asBool());
    const auto byPath = List(0, 2, "Name", "");
    EXPECT_EQ(byPath["folder"][0]["path"].asString(), "/music/f0");
    EXPECT_EQ(byPath["folder"][1]["path"].asString(), "/music/f1");
}

TEST_F(ListingTest, AdditionalFactsWithUnknownKeysAsNull) {
    const auto out = List(0, 1, "", "ASC", J(R"(["status", "colour", "is_valid"])"));
    EXPECT_EQ(out["folder"][0]["additional"], J(R"({"status": "finished", "colour": null, "is_valid": true})"));
    EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_BAD_PARAM);
    EXPECT_TRUE(testkit::Logged("Unknown additional: colour"));
    EXPECT_TRUE(testkit::Logged("Failed to get additional: colour"));
}

TEST_F(ListingTest, MalformedAdditionalStillListsEveryFolder) {
    auto out = List(0, 2, "", "ASC", J(R"({"status": 1})"));
    ASSERT_EQ(out["folder"].size(), 2u);
    EXPECT_EQ(out["folder"][1]["additional"], J("{}"));
    EXPECT_TRUE(testkit::Logged("Bad param: {\"status\":1}"));
    EXPECT_TRUE(testkit::Logged("GetAdditional failed"));
    testkit::ClearLog();
    out = List(0, 1, "", "ASC", J(R"(["is_valid", 7, "status"])"));
    EXPECT_EQ(out["folder"][0]["additional"], J(R"({"is_valid": true})"));
    EXPECT_TRUE(testkit::Logged("Bad param: 7"));
}

TEST_F(ListingTest, StatusAndValidityReflectTheAppliance) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}, "/music/gone": {}})");
    MakeDir(music_ + "/@eaDir");
    testkit::WriteFile(QueueOf("music"), "{\"event\":65536,\"path\":\"" + music_ + "/a\",\"data\":null}\n");
    const auto out = List(0, 5, "", "ASC", J(R"(["status", "is_valid"])"));
    EXPECT_EQ(out["folder"][0]["additional"], J(R"({"status": "processing", "is_valid": true})"));
    EXPECT_EQ(out["folder"][1]["additional"], J(R"({"status": "paused", "is_valid": false})"));
}

TEST_F(ListingTest, LoadFailureIsReported) {
    testkit::WriteFile(FolderConf(), "[]");
    Json::Value out = "untouched";
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
    std::map<std::string, std::string> words;
    for (const auto& folder : out["folder"]) words[folder["path"].asString()] = folder["additional"]["status"].asString();
    EXPECT_EQ(words["/music/f1"], "processing");
    EXPECT_EQ(words["/music/f1/x"], "processing");
    EXPECT_EQ(words["/music/f3"], "processing");
    EXPECT_EQ(words["/music/f33"], "finished");
    EXPECT_EQ(words["/music/f5"], "processing");
    EXPECT_EQ(words["/music/f2"], "finished");
    EXPECT_EQ(words["/music/f7"], "processing");  // moved out of it
}

}  // namespace
