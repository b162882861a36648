// Monitor-queue registrations with qiranotifyd.
#include "testkit.h"

namespace {

class NotifydCfgTest : public testkit::IndexFixture {};

TEST_F(NotifydCfgTest, EachShareIsRegisteredWithItsFoldersAndDeletedAlone) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}, "/music/b": {}, "/photo/a": {}})");
    ASSERT_TRUE(IndexMgr::UpsertQIRANotifydCfg("music"));
    const auto registrations = qira_sim::Registrations();
    ASSERT_EQ(registrations.size(), 1u);
    EXPECT_EQ(registrations[0]["owner"].asString(), "fileindex");
    EXPECT_EQ(registrations[0]["type"].asInt(), 1);
    EXPECT_EQ(registrations[0]["description"],
              J("{\"queue\": \"" + QueueOf("music") + "\", \"config\": [" +
                "{\"path\": \"" + music_ + "/a\", \"mask\": 65486, \"ignore\": [\"@eaDir\"]}, " +
                "{\"path\": \"" + music_ + "/b\", \"mask\": 65486, \"ignore\": [\"@eaDir\"]}]}"));
    // Another share's is kept apart; an upsert replaces the share's own, even by an empty one.
    ASSERT_TRUE(IndexMgr::UpsertQIRANotifydCfg("photo"));
    testkit::WriteFile(FolderConf(), R"({})");
    ASSERT_TRUE(IndexMgr::UpsertQIRANotifydCfg("music"));
    ASSERT_EQ(qira_sim::Registrations().size(), 2u);
    EXPECT_EQ(qira_sim::Registrations()[1]["description"], J("{\"queue\": \"" + QueueOf("music") + "\", \"config\": []}"));
    ASSERT_TRUE(IndexMgr::DeleteQIRANotifydCfg("music"));
    ASSERT_EQ(qira_sim::Registrations().size(), 1u);
    EXPECT_EQ(qira_sim::Registrations()[0]["queue"].asString(), QueueOf("photo"));
}

TEST_F(NotifydCfgTest, AnUnresolvableFolderChangesNoRegistration) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    ASSERT_TRUE(IndexMgr::UpsertQIRANotifydCfg("music"));
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}, "/music/b": {}, "/music/c": {}})");
    qira_sim::InjectFault("QIRAShareGet", 0x0B00, "music");
    Settle();
    EXPECT_FALSE(IndexMgr::UpsertQIRANotifydCfg("music"));
    EXPECT_TRUE(testkit::Logged("FILEIDXQueuePathGet failed, share=music"));
    // The share vanishes once its queue path is known: the folders no longer resolve.
    qira_sim::InjectFault("QIRAShareGet", 0x0B00, "music", {"QIRAEAMKDir", ""});
    testkit::ClearLog();
    EXPECT_FALSE(IndexMgr::UpsertQIRANotifydCfg("music"));
    EXPECT_TRUE(testkit::Logged("GetFullPath failed, path=/music/a"));
    EXPECT_TRUE(qira_sim::Journal().empty());
    EXPECT_EQ(qira_sim::Registrations()[0]["description"]["config"].size(), 1u);
}

TEST_F(NotifydCfgTest, PlatformRefusalsAreLogged) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    qira_sim::InjectFault("MonitorQueue::MonitorQueue", 0x50);
    EXPECT_FALSE(IndexMgr::UpsertQIRANotifydCfg("music"));
    EXPECT_EQ(testkit::LogMessages()[0].rfind("Failed to create MonitorQueue, jsQueue={\"config\":[{", 0), 0u);
    qira_sim::ClearFaults();
    qira_sim::InjectFault("MonitorQueue::Upsert", 0x51);
    EXPECT_FALSE(IndexMgr::UpsertQIRANotifydCfg("music"));
    EXPECT_TRUE(testkit::Logged("MonitorQueue::Add failed"));
    qira_sim::InjectFault("MonitorQueue::Delete", 0x52);
    EXPECT_FALSE(IndexMgr::DeleteQIRANotifydCfg("music"));
    EXPECT_TRUE(testkit::Logged("MonitorQueue::Delete failed"));
    EXPECT_FALSE(IndexMgr::DeleteQIRANotifydCfg("nosuch"));
    EXPECT_TRUE(testkit::Logged("FILEIDXQueuePathGet failed, share=nosuch"));
}

}  // namespace
