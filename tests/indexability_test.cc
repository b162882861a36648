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
    EXPECT_TRUE(IsSkipIndex("name"));
    EXPECT_TRUE(IsSkipIndex(dir_ + "/.DS_Store"));
    EXPECT_TRUE(IsSkipIndex(dir_ + "/#recycle/f"));
    EXPECT_TRUE(IsSkipIndex(dir_ + "/#snapshot/f"));
    EXPECT_FALSE(IsSkipIndex(dir_ + "/a/#recycle/f"));  // not the share's recycle bin
    EXPECT_FALSE(IsSkipIndex(dir_ + "/dir/file.txt"));
    EXPECT_FALSE(IsSkipIndex("/not/in/a/share.txt"));  // unknown type: do not skip
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

}  // namespace
