// Bringing an upgraded system into the running state.
#include "testkit.h"

namespace {

class MigrationTest : public testkit::IndexFixture {};

// Nothing configured stops the daemon; configured folders are registered once per share and
// reindexed.
TEST_F(MigrationTest, NothingConfiguredStopsTheDaemonAndConfiguredFoldersAreRegisteredAndReindexed) {
    qira_sim::SetServiceState("fileindexd", "running");
    ASSERT_TRUE(Updater_lum60_beta2());
    EXPECT_EQ(testkit::JournalOps(), std::vector<std::string>{"QLIBServiceStop fileindexd 1"});
    EXPECT_EQ(qira_sim::ServiceState("fileindexd"), "stopped");
    Settle();
    qira_sim::InjectFault("QLIBServiceStop", 0xC0);
    EXPECT_FALSE(Updater_lum60_beta2());
    EXPECT_EQ(testkit::LogMessages(), std::vector<std::string>{"QLIBServiceStart failed: err=[0x00C0 sim/QLIBServiceStop:1]"});
    qira_sim::ClearFaults();
    Settle();
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}, "/music/b": {}, "/photo/a": {}})");
    ASSERT_TRUE(Updater_lum60_beta2());
    EXPECT_EQ(testkit::JournalOps(), (std::vector<std::string>{
                                         "QLIBServiceStart fileindexd 1",
                                         "QIRASMBSetSpotlight 1",
                                         "MonitorQueue::Upsert " + QueueOf("music") + " fileindex 1",
                                         "MonitorQueue::Upsert " + QueueOf("photo") + " fileindex 1",
                                     }));
    EXPECT_EQ(Queue("music").size(), 2u);
    EXPECT_EQ(Queue("music")[1], J("{\"event\": 65536, \"path\": \"" + music_ + "/b\", \"data\": null}"));
    EXPECT_EQ(Queue("photo").size(), 1u);
    EXPECT_TRUE(qira_sim::SpotlightState());
}

TEST_F(MigrationTest, EachStepFailingEndsTheMigration) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}, "/photo/a": {}})");
    const std::tuple<const char*, const char*, size_t> cases[] = {
        {"QLIBServiceStart", "QLIBServiceStart failed: err=[0x00C1 sim/QLIBServiceStart:1]", 1},
        {"QIRASMBSetSpotlight", "QIRASMBSetSpotlight failed: err=[0x00C1 sim/QIRASMBSetSpotlight:1]", 2},
        {"MonitorQueue::Upsert", "UpsertQIRANotifydCfg failed, share=music", 3},
    };
    for (const auto& [op, message, journalled] : cases) {
        SCOPED_TRACE(op);
        qira_sim::ClearFaults();
        qira_sim::InjectFault(op, 0xC1);
        Settle();
        EXPECT_FALSE(Updater_lum60_beta2());
        EXPECT_TRUE(testkit::Logged(message));
        EXPECT_EQ(qira_sim::Journal().size(), journalled);
        EXPECT_FALSE(testkit::Exists(QueueOf("music")));
    }
    qira_sim::ClearFaults();
    MakeDir(QueueOf("photo"));
    Settle();
    EXPECT_FALSE(Updater_lum60_beta2());
    EXPECT_TRUE(testkit::Logged("Reindex failed"));
    testkit::WriteFile(FolderConf(), R"({"": {}})");
    EXPECT_FALSE(Updater_lum60_beta2());
    EXPECT_TRUE(testkit::Logged("GetShareNameByPath failed, path="));
    testkit::WriteFile(FolderConf(), "[]");
    EXPECT_FALSE(Updater_lum60_beta2());
}

}  // namespace
