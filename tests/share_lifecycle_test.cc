// Share removal, rename, pause, resume and the wiping of a share's index data.
#include "testkit.h"

namespace {

class ShareLifecycleTest : public testkit::IndexFixture {};

// Removing a share drops its folders only; removing the last folders stops the service and
// Spotlight, whose failures are only logged.
TEST_F(ShareLifecycleTest, RemoveDropsTheSharesFoldersAndTheLastStopTheServiceAndSpotlight) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}, "/music/b": {}, "/photo/a": {}})");
    testkit::WriteFile(StatusConf(), R"({"no_space": {"music": true}})");
    ASSERT_TRUE(IndexMgr::ShareRemove("music"));
    EXPECT_EQ(Conf().getMemberNames(), std::vector<std::string>{"/photo/a"});
    EXPECT_TRUE(NothingSent());
    EXPECT_EQ(testkit::ReadFile(StatusConf()), R"({"no_space": {"music": true}})");
    Settle();
    qira_sim::SetSpotlightState(true);
    ASSERT_TRUE(IndexMgr::ShareRemove("photo"));
    EXPECT_EQ(testkit::JournalOps(), (std::vector<std::string>{"QLIBServiceStop fileindexd 1", "QIRASMBSetSpotlight 0",
                                                               "QLIBServiceRestart samba"}));
    Settle();
    ASSERT_TRUE(IndexMgr::ShareRemove("music"));  // nothing indexed anywhere, Spotlight off
    EXPECT_EQ(testkit::JournalOps(), std::vector<std::string>{"QLIBServiceStop fileindexd 1"});
    EXPECT_EQ(Conf(), J("{}"));
    // Platform failures are only logged.
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    qira_sim::SetSpotlightState(true);
    qira_sim::InjectFault("QLIBServiceStop", 0xA0);
    qira_sim::InjectFault("QIRASMBSetSpotlight", 0xA1);
    Settle();
    EXPECT_TRUE(IndexMgr::ShareRemove("music"));
    EXPECT_EQ(testkit::LogMessages(), (std::vector<std::string>{"QLIBServiceStop failed: err=[0x00A0 sim/QLIBServiceStop:1]",
                                                                "QIRASMBSetSpotlight failed: err=[0x00A1 sim/QIRASMBSetSpotlight:1]"}));
    EXPECT_EQ(testkit::JournalOps().size(), 2u);  // no samba restart
}

TEST_F(ShareLifecycleTest, RenameKeepsSettingsAndTouchesNothingElse) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {"name": "A", "audio": true, "document": false, "video": false,
                                         "photo": true}, "/photo/a": {}})");
    AddShare("tunes");
    ASSERT_TRUE(IndexMgr::ShareRename("music", "tunes"));
    EXPECT_EQ(Conf().getMemberNames(), (std::vector<std::string>{"/photo/a", "/tunes/a"}));
    EXPECT_EQ(Conf()["/tunes/a"], J(R"({"path": "/tunes/a", "name": "A", "audio": true, "document": false,
                                       "video": false, "photo": true})"));
    EXPECT_TRUE(NothingSent());
    EXPECT_FALSE(testkit::Exists(StatusConf()));
    const std::string before = testkit::ReadFile(FolderConf());
    ASSERT_TRUE(IndexMgr::ShareRename("none", "other"));
    EXPECT_FALSE(IndexMgr::ShareRename("tunes", "ghost"));  // no such share to rename to
    EXPECT_EQ(testkit::ReadFile(FolderConf()), before);
}

TEST_F(ShareLifecycleTest, PauseStopsTheConsumerFirstAndResumeStartsItLast) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    ASSERT_TRUE(IndexMgr::UpsertQIRANotifydCfg("music"));
    Settle();
    ASSERT_TRUE(IndexMgr::SharePause("music"));
    EXPECT_EQ(Messages(), std::vector<Json::Value>{J(R"({"type": "delete_share_worker", "data": {"share_name": "music"}})")});
    EXPECT_TRUE(qira_sim::Registrations().empty());
    ASSERT_TRUE(IndexMgr::UpsertQIRANotifydCfg("music"));
    daemon_.reset();
    Settle();
    EXPECT_FALSE(IndexMgr::SharePause("music"));
    EXPECT_EQ(qira_sim::Registrations().size(), 1u);
    EXPECT_TRUE(testkit::LogLines().empty());
    daemon_ = std::make_unique<testkit::FakeDaemon>(DaemonSocketPath());
    qira_sim::InjectFault("MonitorQueue::Delete", 0xB0);
    EXPECT_FALSE(IndexMgr::SharePause("music"));
    EXPECT_EQ(Messages().size(), 1u);
    EXPECT_TRUE(testkit::Logged("DeleteQIRANotifydCfg failed, share=music"));
    // Resume: the producer first, then the consumer; the no-space flag stays.
    qira_sim::ClearFaults();
    Settle();
    testkit::WriteFile(StatusConf(), R"({"no_space": {"music": true}})");
    ASSERT_TRUE(IndexMgr::ShareResume("music"));
    EXPECT_EQ(qira_sim::Registrations().size(), 1u);
    EXPECT_EQ(Messages(), std::vector<Json::Value>{J(R"({"type": "revive_share_worker", "data": {"share_name": "music"}})")});
    EXPECT_EQ(testkit::ReadFile(StatusConf()), R"({"no_space": {"music": true}})");
    qira_sim::InjectFault("MonitorQueue::Upsert", 0xB1);
    EXPECT_FALSE(IndexMgr::ShareResume("music"));
    EXPECT_TRUE(testkit::Logged("UpsertQIRANotifydCfg failed, share=music"));
    EXPECT_TRUE(Messages().empty());
    qira_sim::ClearFaults();
    daemon_.reset();
    EXPECT_FALSE(IndexMgr::ShareResume("music"));
}

TEST_F(ShareLifecycleTest, CleanRemovesQueueFilesAndTheDatabaseTree) {
    for (const char* dir : {"deep/tree", "deep/wide", "other/tree/below"}) MakeDir(music_ + "/@eaDir/QIRA@.fileindexdb/" + dir);
    testkit::WriteFile(QueueOf("music"), "x\n");
    const size_t descriptors = testkit::OpenDescriptors();
    ASSERT_TRUE(IndexMgr::CleanShareIndexData("music"));
    EXPECT_EQ(testkit::OpenDescriptors(), descriptors);  // none kept per directory removed
    EXPECT_FALSE(testkit::Exists(QueueOf("music")));
    EXPECT_FALSE(testkit::Exists(music_ + "/@eaDir/QIRA@.fileindexdb"));
    EXPECT_TRUE(testkit::Exists(music_ + "/@eaDir"));
    EXPECT_TRUE(IndexMgr::CleanShareIndexData("photo"));  // nothing there: still true
    EXPECT_FALSE(IndexMgr::CleanShareIndexData("nosuch"));
    EXPECT_TRUE(testkit::Logged("FILEIDXQueuePathGet failed, share=nosuch"));
}

}  // namespace
