// Which shares, paths and names may be indexed, and room for the index.
#include "testkit.h"

#include "qira/qira_share.h"

namespace {

class IndexabilityTest : public testkit::Sandbox {
protected:
    void SetUp() override {
        Sandbox::SetUp();
        dir_ = AddShare("s");
        MakeDir(dir_ + "/dir/sub");
    }
    std::string dir_;
};

TEST_F(IndexabilityTest, SystemPreservedNamesSkippedFilesAndShareRules) {
    for (const char* name : {".TemporaryItems", "QIRA@.fileindexdb", "QIRA@file_index_queue", ".QIRAPPSDB",
                             ".DS_Store", "@eaDir"}) {
        EXPECT_TRUE(IsSystemPreservedFileName(name)) << name;
    }
    EXPECT_FALSE(IsSystemPreservedFileName(".ds_store"));
    // Not the share's recycle bin under /a; an unknown file system type does not skip.
    for (const auto& [path, skipped] : {std::pair{std::string("name"), true}, {dir_ + "/.DS_Store", true}, {dir_ + "/#recycle/f", true},
                                        {dir_ + "/#snapshot/f", true}, {dir_ + "/a/#recycle/f", false},
                                        {dir_ + "/dir/file.txt", false}, {std::string("/not/in/a/share.txt"), false}}) {
        EXPECT_EQ(IsSkipIndex(path), skipped) << path;
    }
    qira_sim::InjectFault("QIRAGetFSType", 0x10);
    EXPECT_FALSE(IsSkipIndex(dir_ + "/dir/f"));
    qira_sim::ClearFaults();
    for (const int type : {12, 20, 31}) {
        qira_sim::PutShare("s", dir_, J("{\"fs_type\": " + std::to_string(type) + "}"));
        EXPECT_TRUE(IsSkipIndex(dir_ + "/dir/f")) << type;
    }
    // The share rules themselves are held by the explanation's table; here, that a share is needed.
    EXPECT_FALSE(CanShareBeIndexed(nullptr));
    for (const auto& [props, indexable] : {std::pair{R"({"read_only": true})", false}, {"{}", true}}) {
        qira_sim::PutShare("s", dir_, J(props));
        QIRASHARE* share = nullptr;
        ASSERT_EQ(QIRAShareGet("s", &share), 0);
        EXPECT_EQ(CanShareBeIndexed(share), indexable);
        QIRAShareFree(share);
    }
    // Share paths resolve first.
    EXPECT_TRUE(CanPathBeIndexed("/s/dir"));
    EXPECT_FALSE(CanPathBeIndexed("/nosuch/dir"));
    EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_PATH);
    EXPECT_TRUE(testkit::Logged("GetFullPath failed, path=/nosuch/dir"));
}

TEST_F(IndexabilityTest, FullPathRulesInOrderWithTheirLogLines) {
    EXPECT_TRUE(CanFullPathBeIndexed(dir_ + "/dir"));
    EXPECT_TRUE(testkit::LogLines().empty());
    EXPECT_FALSE(CanFullPathBeIndexed(dir_ + "/#recycle"));
    EXPECT_FALSE(CanFullPathBeIndexed(dir_ + "/#snapshot/x"));
    EXPECT_FALSE(CanFullPathBeIndexed("/not/in/a/share"));  // unknown type refuses here
    qira_sim::InjectFault("QIRAShareNamePathGet", 0x30);
    EXPECT_FALSE(CanFullPathBeIndexed(dir_ + "/dir"));
    EXPECT_TRUE(testkit::Logged("GetShareNamePathByFullPath failed, path=" + dir_ + "/dir"));
    qira_sim::ClearFaults();
    qira_sim::InjectFault("QIRAShareGet", 0x31);
    testkit::ClearLog();
    EXPECT_FALSE(CanFullPathBeIndexed(dir_ + "/dir"));
    EXPECT_EQ(testkit::LogMessages(), std::vector<std::string>{"QIRAShareGet failed, share=s"});
    qira_sim::ClearFaults();
    for (const char* bad : {"/dir/", "/dir//sub", "/dir/../dir", "/missing"}) {
        SCOPED_TRACE(bad);
        testkit::ClearLog();
        EXPECT_FALSE(CanFullPathBeIndexed(dir_ + bad)) << bad;
        EXPECT_EQ(testkit::LogMessages(), std::vector<std::string>{"check realpath failed, path=" + dir_ + bad});
    }
    ASSERT_EQ(symlink((dir_ + "/dir").c_str(), (dir_ + "/link").c_str()), 0);
    EXPECT_FALSE(CanFullPathBeIndexed(dir_ + "/link"));
    // Mount points only in shares using encryption.
    qira_sim::PutShare("s", dir_, J("{\"mount_points\": [\"" + dir_ + "/dir\"]}"));
    EXPECT_FALSE(CanFullPathBeIndexed(dir_ + "/dir"));
    EXPECT_TRUE(testkit::Logged("Mount point[" + dir_ + "/dir] is not allowed to be indexed"));
    qira_sim::PutShare("s", dir_, J("{\"encryption\": true, \"mount_points\": [\"" + dir_ + "/dir\"]}"));
    EXPECT_TRUE(CanFullPathBeIndexed(dir_ + "/dir"));
}

TEST_F(IndexabilityTest, SpaceIsShortOnlyForTheTwoNoSpaceErrors) {
    EXPECT_TRUE(IsShareSpaceEnough("s"));
    qira_sim::InjectFault("QIRAQuotaIsEnough", 0x2900);
    EXPECT_FALSE(IsShareSpaceEnough("s"));
    qira_sim::InjectFault("QIRAQuotaIsEnough", 0x2400);
    EXPECT_FALSE(IsShareSpaceEnough("s"));
    qira_sim::InjectFault("QIRAQuotaIsEnough", 0x1111);
    EXPECT_TRUE(IsShareSpaceEnough("s"));
    qira_sim::ClearFaults();
    qira_sim::PutShare("s", dir_, J(R"({"quota_free": 10485759})"));
    EXPECT_FALSE(IsShareSpaceEnough("s"));
    qira_sim::PutShare("s", dir_, J(R"({"quota_free": 10485760})"));
    EXPECT_TRUE(IsShareSpaceEnough("s"));
    EXPECT_FALSE(IsShareSpaceEnough("nosuch"));
    EXPECT_TRUE(testkit::Logged("QIRAShareGet failed, share=nosuch"));
}

// A record's path is taken only in canonical form beneath its share, each bound held exactly; the
// entry rules refuse at the first component that fails, whatever lies after it.
TEST_F(IndexabilityTest, EntryRulesTakeCanonicalPathsBeneathTheShareAndRefuseTheFirstBadComponent) {
    const std::string longName(NAME_MAX, 'n');
    std::string atPathMax = dir_;
    while (atPathMax.size() + 202 < PATH_MAX) atPathMax += "/" + std::string(100, 'n');
    atPathMax += "/" + std::string(PATH_MAX - 2 - atPathMax.size(), 'p');  // PATH_MAX - 1 bytes, the last name 100 to 200
    struct Case {
        std::string path;
        bool canonical;
        const char* refusal;  // nullptr: indexable
    };
    const std::vector<Case> cases = {
        {dir_, true, nullptr},
        {dir_ + "/dir/" + longName, true, nullptr},
        {dir_ + "/dir/" + longName + "n", false, "not_beneath"},
        {atPathMax, true, nullptr},
        {atPathMax + "p", false, "not_beneath"},
        {dir_ + "/", false, "not_beneath"},
        {dir_ + "//dir", false, "not_beneath"},
        {dir_ + "/./dir", false, "not_beneath"},
        {dir_ + "/dir/..", false, "not_beneath"},
        {dir_ + "/../s2/x", false, "not_beneath"},
        {dir_ + "x/dir", false, "not_beneath"},
        {dir_ + std::string("/d\0r", 4), false, "not_beneath"},
        {"relative/dir", false, "not_beneath"},
        {dir_ + "/dir/@eaDir/x.txt", true, "system_name"},
        {dir_ + "/@tmp/dir/x.txt", true, "system_name"},
        {dir_ + "/dir/.DS_Store", true, "system_name"},
        {dir_ + "/#recycle/dir/x.txt", true, "skipped_dir"},
        {dir_ + "/#snapshot/x.txt", true, "skipped_dir"},
        {dir_ + "/dir/#recycle/x.txt", true, nullptr},  // not the share's recycle bin
        {dir_ + "/#recycle/@tmp/x.txt", true, "skipped_dir"},  // the first refusing component names the rule
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.path.size() > 200 ? std::to_string(c.path.size()) + " bytes" : c.path);
        EXPECT_EQ(IsCanonicalBeneath(dir_, c.path), c.canonical);
        const char* refusal = EntryRefusal(dir_, c.path, false);
        EXPECT_EQ(std::string(refusal ? refusal : "-"), std::string(c.refusal ? c.refusal : "-"));
    }
    const std::string deep = dir_ + testkit::Deep(MaxEntryDepth());
    EXPECT_EQ(EntryRefusal(dir_, deep, true), nullptr);
    EXPECT_STREQ(EntryRefusal(dir_, deep + "/d", false), "too_deep");
    EXPECT_STREQ(ChildRefusal(dir_ + "/x", "x", MaxEntryDepth() + 1, false), "too_deep");
    EXPECT_EQ(ChildRefusal(dir_ + "/x", "x", MaxEntryDepth(), false), nullptr);
    EXPECT_EQ(ChildRefusal(dir_ + "/#recycle", "#recycle", 1, false), nullptr);  // a file of that name
}

}  // namespace
