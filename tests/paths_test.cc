// Share paths, full paths and the small helpers.
#include "testkit.h"

namespace {

class PathsTest : public testkit::Sandbox {};

TEST(ShareNameTest, FirstCharacterIsAlwaysDropped) {
    std::string name = "untouched";
    EXPECT_FALSE(GetShareNameByPath(name, ""));
    EXPECT_EQ(name, "untouched");
    const std::pair<const char*, const char*> cases[] = {
        {"/music/live", "music"}, {"/music", "music"}, {"music/live", "usic"}, {"/", ""}, {"//x", ""}};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.first);
        ASSERT_TRUE(GetShareNameByPath(name, c.first));
        EXPECT_EQ(name, c.second) << c.first;
    }
}

TEST(HelpersTest, ShareRenamePrefixAndJsonMembers) {
    for (const auto& [path, renamed] : {std::pair{"", ""}, {"/a/b/c", "/z/b/c"}, {"/music", "/z"}, {"/music/live", "/z/live"}}) {
        EXPECT_EQ(ReplaceShareName(path, "z"), renamed) << path;
    }
    for (const auto& [text, prefix, starts] : {std::tuple{"abc", "", true}, {"abc", "ab", true}, {"abc", "abc", true},
                                               {"ab", "abc", false}, {"Abc", "ab", false}}) {
        EXPECT_EQ(StringStartWith(text, prefix), starts) << text << " " << prefix;
    }
    const auto obj = testkit::J(R"({"one": 1, "t": true, "s": "x", "n": null})");
    bool flag = true;
    EXPECT_FALSE(RetrieveBoolFromJsonObj(flag, "one", obj));
    EXPECT_FALSE(RetrieveBoolFromJsonObj(flag, "missing", obj));
    EXPECT_FALSE(RetrieveBoolFromJsonObj(flag, "t", testkit::J("[true]")));
    EXPECT_TRUE(flag);  // untouched by a failed read
    flag = false;
    EXPECT_TRUE(RetrieveBoolFromJsonObj(flag, "t", obj));
    EXPECT_TRUE(flag);
    std::string text = "keep";
    EXPECT_FALSE(RetrieveStringFromJsonObj(text, "n", obj));
    EXPECT_FALSE(RetrieveStringFromJsonObj(text, "one", obj));
    EXPECT_EQ(text, "keep");
    EXPECT_TRUE(RetrieveStringFromJsonObj(text, "s", obj));
    EXPECT_EQ(text, "x");
}

TEST_F(PathsTest, FullPathTakesTheVolumeFromTheSharesOwnPath) {
    AddShare("music");
    std::string full;
    ASSERT_TRUE(GetFullPath(full, "/music"));
    EXPECT_EQ(full, ShareDir("music"));
    ASSERT_TRUE(GetFullPath(full, "/music/live//x/"));
    EXPECT_EQ(full, ShareDir("music") + "/live//x/");
    testkit::ClearLog();
    EXPECT_FALSE(GetFullPath(full, "/nosuch/x"));
    EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_PATH);
    EXPECT_TRUE(testkit::LogLines().empty());
    testkit::ClearError();
    EXPECT_FALSE(GetFullPath(full, ""));
    EXPECT_TRUE(testkit::Logged("GetShareNameByPath failed, path="));
    EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_NONE);
    // Only the volume comes from the share's directory; its last component is not the name.
    qira_sim::PutShare("films", Path("/volume2/store"));
    ASSERT_TRUE(GetFullPath(full, "/films/2024"));
    EXPECT_EQ(full, Path("/volume2/films/2024"));
}

// A full path belongs to the share with the longest directory, on a slash boundary.
TEST_F(PathsTest, ShareOfAFullPathIsTheLongestShareDirectoryOnASlashBoundary) {
    AddShare("a");
    qira_sim::PutShare("nested", ShareDir("a") + "/inner");
    qira_sim::PutShare("ab", ShareDir("ab"));
    const std::tuple<std::string, std::string, std::string> cases[] = {
        {ShareDir("a") + "/inner/x", "nested", "/x"}, {ShareDir("ab") + "/y", "ab", "/y"}, {ShareDir("a"), "a", "/"}};
    for (const auto& [fullPath, share, inside] : cases) {
        std::string name, path;
        ASSERT_TRUE(GetShareNamePathByFullPath(name, path, fullPath)) << fullPath;
        EXPECT_EQ(name + " " + path, share + " " + inside);
    }
    std::string name = "keep", inside;
    EXPECT_FALSE(GetShareNamePathByFullPath(name, inside, Path("/volume1/other/x")));
    EXPECT_EQ(name, "keep");
    EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_PATH);
    EXPECT_TRUE(testkit::Logged("QIRAShareNamePathGet failed, path=" + Path("/volume1/other/x")));
}

TEST_F(PathsTest, FileTestsDoNotFollowSymbolicLinks) {
    const std::string file = Path("/f");
    testkit::WriteFile(file, "x");
    ASSERT_EQ(symlink(file.c_str(), Path("/link").c_str()), 0);
    ASSERT_EQ(symlink(Path("/volume1").c_str(), Path("/dirlink").c_str()), 0);
    EXPECT_TRUE(IsFileExist(file));
    EXPECT_FALSE(IsFileExist(Path("/link")));
    EXPECT_FALSE(IsFileExist(Path("/volume1")));
    EXPECT_TRUE(IsDirExist(Path("/volume1")));
    EXPECT_FALSE(IsDirExist(Path("/dirlink")));
    EXPECT_FALSE(IsDirExist(Path("/nothing")));
}

}  // namespace
