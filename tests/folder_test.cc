// The folder record and folder.conf: layout, limit, change reports.
#include "testkit.h"

namespace {

class FolderTest : public testkit::Sandbox {
protected:
    void SetUp() override {
        Sandbox::SetUp();
        AddShare("music");
        AddShare("Music");
    }
    Json::Value UpsertOne(Folders& folders, const std::string& request) {
        Json::Value changed;
        EXPECT_TRUE(folders.Upsert(changed, J(request)));
        return changed;
    }
};

Json::Value Flags(bool document, bool audio, bool video, bool photo) {
    Json::Value flags(Json::objectValue);
    flags["document"] = document;
    flags["audio"] = audio;
    flags["video"] = video;
    flags["photo"] = photo;
    return flags;
}

TEST_F(FolderTest, LoadMergesOnlyMembersOfTheRightType) {
    Folder folder;
    ASSERT_TRUE(folder.Reload("/music/live", J(R"({"name": "Live", "photo": true, "audio": true})")));
    EXPECT_EQ(folder.full_path, ShareDir("music") + "/live");
    folder.Load("/music/live", J(R"({"name": 5, "photo": "false", "audio": false})"));
    EXPECT_EQ(folder.name, "Live");
    EXPECT_TRUE(folder.photo);
    EXPECT_FALSE(folder.audio);
    folder.Reload("/music/live", J("{}"));
    EXPECT_EQ(folder.asJson(), J(R"({"path": "/music/live", "name": "", "document": false, "audio": false,
                                     "video": false, "photo": false})"));
    EXPECT_FALSE(folder.SetPath("/gone/x"));
    EXPECT_EQ(folder.path, "/gone/x");
    EXPECT_EQ(folder.GetFullPath(), "");
    EXPECT_TRUE(testkit::Logged("Failed to get full path from /gone/x"));
    Json::Value notObject = J("[]");
    EXPECT_FALSE(folder.AddToJson(notObject));
    EXPECT_EQ(notObject, J("[]"));
}

TEST_F(FolderTest, SaveWritesSortedMembersWithTheSixKeysOnly) {
    Folders folders;
    UpsertOne(folders, R"({"path": "/music/b", "name": "B", "audio": true, "extra": 1})");
    UpsertOne(folders, R"({"path": "/Music/a", "name": "A"})");
    ASSERT_TRUE(folders.Save());
    EXPECT_EQ(testkit::ReadFile(FolderConf()),
              "{\"/Music/a\":{\"audio\":false,\"document\":false,\"name\":\"A\",\"path\":\"/Music/a\",\"photo\":false,"
              "\"video\":false},\"/music/b\":{\"audio\":true,\"document\":false,\"name\":\"B\",\"path\":\"/music/b\","
              "\"photo\":false,\"video\":false}}\n");
    Folders reloaded;
    ASSERT_TRUE(reloaded.Load());
    std::vector<Folder> list;
    reloaded.List(list);
    ASSERT_EQ(list.size(), 2u);
    EXPECT_EQ(list[0].asJson(), J(R"({"path":"/Music/a","name":"A","document":false,"audio":false,"video":false,"photo":false})"));
    reloaded.List(list, "music");
    ASSERT_EQ(list.size(), 1u);
    EXPECT_EQ(list[0].path, "/music/b");
}

TEST_F(FolderTest, LoadTakesTheMemberNameKeepsUnresolvableFoldersReplacesNothingAndRefusesANonObject) {
    testkit::WriteFile(FolderConf(), R"({"/music/x": {"path": "/other/y", "name": "X"}, "/gone/z": {"name": "Z"},
                                        "/music/n": 7})");
    Folders folders;
    ASSERT_TRUE(folders.Load());
    std::vector<Folder> list;
    folders.List(list);
    ASSERT_EQ(list.size(), 3u);
    EXPECT_EQ(list[0].path, "/gone/z");
    EXPECT_EQ(list[0].full_path, "");
    EXPECT_EQ(list[1].path, "/music/n");
    EXPECT_EQ(list[1].name, "");
    EXPECT_EQ(list[2].path, "/music/x");
    EXPECT_EQ(list[2].name, "X");
    // A second load adds to the map without replacing what it holds.
    UpsertOne(folders, R"({"path": "/music/x", "name": "memory"})");
    testkit::WriteFile(FolderConf(), R"({"/music/x": {"name": "disk"}, "/music/y": {"name": "Y"}})");
    ASSERT_TRUE(folders.Load());
    Json::Value out;
    ASSERT_TRUE(folders.Get(out, "/music/x"));
    EXPECT_EQ(out["name"].asString(), "memory");
    EXPECT_EQ(folders.Count(), 4u);
    // A file that is not an object fails with error eight.
    for (const char* text : {"[]", "7", "\"x\"", "null"}) {
        SCOPED_TRACE(text);
        testkit::WriteFile(FolderConf(), text);
        testkit::ClearLog();
        Folders folders;
        EXPECT_FALSE(folders.Load()) << text;
        EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_MALFORMED_FOLDERS);
        EXPECT_TRUE(testkit::Logged(std::string("Malformed folders: ") + text));
    }
}

TEST_F(FolderTest, ChangeReportsAgainstTheGoverningFolder) {
    Folders folders;
    EXPECT_EQ(UpsertOne(folders, R"({"path": "/music/a", "audio": true})"), Flags(true, true, true, true));
    EXPECT_EQ(UpsertOne(folders, R"({"path": "/music/a", "name": "renamed"})"), Flags(false, false, false, false));
    EXPECT_EQ(UpsertOne(folders, R"({"path": "/music/a/b", "audio": true, "photo": true})"),
              Flags(false, false, false, true));
    Json::Value stored;
    folders.Get(stored, "/music/a");
    EXPECT_EQ(stored["name"].asString(), "renamed");
    EXPECT_TRUE(stored["audio"].asBool());
}

// The report is nested under the path and holds what the governing folder indexed; a path in no
// share reports nothing.
TEST_F(FolderTest, DeleteNestsItsReportUnderThePath) {
    Folders folders;
    UpsertOne(folders, R"({"path": "/music/a", "audio": true})");
    UpsertOne(folders, R"({"path": "/music/a/b", "photo": true})");
    const std::vector<std::pair<std::string, Json::Value>> cases = {
        {"/music/a/b", Flags(false, true, false, true)},         {"/music/a/unknown", Flags(false, false, false, false)},
        {"/music/ungoverned", Flags(true, true, true, true)},    {"/nosuch/x", Json::Value()},
        {"/music/a", Flags(true, true, true, true)}};
    for (const auto& [path, flags] : cases) {
        SCOPED_TRACE(path);
        Json::Value changed = "untouched", expected = "untouched";
        if (!flags.isNull()) (expected = Json::Value(Json::objectValue))[path] = flags;
        ASSERT_TRUE(folders.Delete(changed, path));
        EXPECT_EQ(changed, expected);
    }
    testkit::WriteFile(FolderConf(), R"({"/nosuch/x": {}})");
    Folders loaded;
    ASSERT_TRUE(loaded.Load());
    Json::Value changed;
    ASSERT_TRUE(loaded.Delete(changed, "/nosuch/x"));  // a folder whose share is gone still goes
    EXPECT_EQ(loaded.Count(), 0u);
}

}  // namespace
