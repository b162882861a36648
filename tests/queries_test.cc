// What is indexed: lists, membership questions and the plain functions.
#include <dlfcn.h>

#include "testkit.h"

namespace {

class QueriesTest : public testkit::Sandbox {
protected:
    void SetUp() override {
        Sandbox::SetUp();
        AddShare("music");
        AddShare("Music");
    }
    void Index(const std::string& conf) { testkit::WriteFile(FolderConf(), conf); }
};

// Inside a folder means on a slash boundary; share names and paths are case-sensitive.
TEST_F(QueriesTest, PathsInsideAndContainingAFolder) {
    Index(R"({"/music/live": {"name": "Live"}, "/Music/a": {}})");
    struct Case {
        const char* path;
        bool inside, contains;
    } cases[] = {{"/music/live", true, true},     {"/music/live/2015", true, false}, {"/music/live/", true, false},
                 {"/music/liveset", false, false}, {"/music", false, true},         {"/Music/live", false, false},
                 {"/mus", false, false},           {"/Music/a/b", true, false},     {"/music/a/b", false, false}};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.path);
        EXPECT_EQ(IndexMgr::IsPathIndexed(c.path), c.inside);
        EXPECT_EQ(FILEIDXIsPathIndexed(c.path), c.inside ? 1 : 0);
        EXPECT_EQ(IndexMgr::IsPathContainIndexed(c.path), c.contains);
    }
    for (const auto& [share, indexed] : {std::pair{"Music", true}, {"music", true}, {"MUSIC", false}, {"x", false}}) {
        EXPECT_EQ(IndexMgr::IsShareIndexed(share), indexed) << share;
        EXPECT_EQ(FILEIDXIsShareIndexed(share), indexed ? 1 : 0) << share;
    }
    EXPECT_EQ(FILEIDXIsShareIndexed(nullptr), 0);
    EXPECT_EQ(FILEIDXIsPathIndexed(nullptr), 0);
    EXPECT_EQ(FILEIDXIsFullPathIndexed(nullptr), 0);
    // The plain functions have unmangled names.
    for (const char* name : {"FILEIDXIsShareIndexed", "FILEIDXIsPathIndexed", "FILEIDXIsFullPathIndexed",
                             "FILEIDXDBPathGet", "FILEIDXQueuePathGet"}) {
        EXPECT_NE(dlsym(RTLD_DEFAULT, name), nullptr) << name;
    }
}

// No file means nothing indexed; a malformed one answers no everywhere and says why. A full path
// is inside a folder on a slash boundary, and a folder whose share is gone holds every path.
TEST_F(QueriesTest, AMissingOrMalformedFileFullPathsAndTheUnresolvableFolder) {
    std::vector<Folder> list(3);
    EXPECT_TRUE(IndexMgr::List(list));
    EXPECT_TRUE(list.empty());
    EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_NONE);
    EXPECT_FALSE(IndexMgr::IsPathIndexed("/music"));
    Index("[\"/music/a\"]");
    EXPECT_FALSE(IndexMgr::List(list));
    EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_MALFORMED_FOLDERS);
    EXPECT_EQ(FILEIDXIsShareIndexed("music"), 0);
    EXPECT_EQ(FILEIDXIsPathIndexed("/music/a"), 0);
    EXPECT_EQ(FILEIDXIsFullPathIndexed((ShareDir("music") + "/a").c_str()), 0);
    Index("{\"/music/a\": ");
    EXPECT_EQ(FILEIDXIsPathIndexed("/music/a"), 0);
    EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_LOAD_JSON);
    Index(R"({"/music/live": {}})");
    const std::string dir = ShareDir("music");
    EXPECT_TRUE(IndexMgr::IsFullPathIndexed(dir + "/live/a"));
    EXPECT_FALSE(IndexMgr::IsFullPathIndexed(dir + "/livex"));
    EXPECT_EQ(FILEIDXIsFullPathIndexed((dir + "/live").c_str()), 1);
    EXPECT_EQ(FILEIDXIsFullPathIndexed("/elsewhere"), 0);
    Index(R"({"/gone/x": {}})");
    EXPECT_TRUE(IndexMgr::IsFullPathIndexed("/elsewhere/entirely"));
    EXPECT_TRUE(testkit::Logged("Failed to get full path from /gone/x"));
    Index(R"({"": {}, "/music/a": {}})");  // an empty share name is logged and skipped
    EXPECT_TRUE(IndexMgr::IsShareIndexed("music"));
    EXPECT_FALSE(IndexMgr::IsShareIndexed("x"));
    EXPECT_TRUE(testkit::Logged("Failed to get share name from path: "));
}

TEST_F(QueriesTest, GetTakesTheExclusiveLock) {
    Index(R"({"/music/a": {"name": "A"}})");
    Json::Value out;
    ASSERT_TRUE(IndexMgr::Get(out, "/music/a"));
    EXPECT_EQ(out["name"].asString(), "A");
    EXPECT_FALSE(IndexMgr::Get(out, "/Music/a"));
    EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_NO_SUCH_FOLDER);
    EXPECT_TRUE(testkit::Logged("No such folder: /Music/a"));
    Folders holder;
    ASSERT_TRUE(holder.Lock(false));
    EXPECT_FALSE(IndexMgr::Get(out, "/music/a"));
    EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_LOCK);
    holder.Unlock();
}

}  // namespace
