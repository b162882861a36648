// Folder delete end to end.
#include "testkit.h"

namespace {

class DeleteTest : public testkit::IndexFixture {
protected:
    void Seed(const std::string& conf) {
        testkit::WriteFile(FolderConf(), conf);
        qira_sim::SetServiceState("fileindexd", "running");
        MakeDir(music_ + "/@eaDir/QIRA@.fileindexdb/sub");
        testkit::WriteFile(QueueOf("music") + ".tmp", "");
        ASSERT_TRUE(IndexMgr::UpsertQIRANotifydCfg("music"));
        Settle();
    }
};

// An empty request stops the service only when nothing is indexed; deleting the appliance's last
// folder stops everything.
TEST_F(DeleteTest, LastFolderOfTheApplianceStopsEverything) {
    ASSERT_TRUE(IndexMgr::Delete(J("[]")));
    EXPECT_EQ(testkit::JournalOps(), std::vector<std::string>{"QLIBServiceStop fileindexd 1"});
    Seed(R"({"/music/a": {}})");
    ASSERT_TRUE(IndexMgr::Delete(J("[]")));
    EXPECT_TRUE(qira_sim::Journal().empty());
    Seed(R"({"/music/a": {}})");
    qira_sim::SetSpotlightState(true);
    ASSERT_TRUE(IndexMgr::Delete(J(R"(["/music/a"])")));
    EXPECT_EQ(Conf(), J("{}"));
    const std::vector<std::string> ops = {
        "QLIBServiceStop fileindexd 1",
        "QIRASMBSetSpotlight 0",
        "QLIBServiceRestart samba",
        "MonitorQueue::Delete " + QueueOf("music") + " fileindex 1",
    };
    EXPECT_EQ(testkit::JournalOps(), ops);
    EXPECT_TRUE(Messages().empty());
    EXPECT_FALSE(testkit::Exists(QueueOf("music")));
    EXPECT_FALSE(testkit::Exists(QueueOf("music") + ".tmp"));
    EXPECT_FALSE(testkit::Exists(music_ + "/@eaDir/QIRA@.fileindexdb"));
    EXPECT_TRUE(qira_sim::Registrations().empty());
    EXPECT_FALSE(qira_sim::SpotlightState());
}

TEST_F(DeleteTest, OneOfTwoFoldersRebuildsTheMonitorQueue) {
    Seed(R"({"/music/a": {"audio": true}, "/music/b": {}})");
    ASSERT_TRUE(IndexMgr::Delete(J(R"(["/music/a"])")));
    EXPECT_EQ(Conf().getMemberNames(), std::vector<std::string>{"/music/b"});
    EXPECT_EQ(testkit::JournalOps(), std::vector<std::string>{"MonitorQueue::Upsert " + QueueOf("music") + " fileindex 1"});
    EXPECT_EQ(qira_sim::Registrations()[0]["description"]["config"].size(), 1u);
    EXPECT_EQ(Messages(), std::vector<Json::Value>{J(R"({"type": "delete_folder_setting", "data": {"folder_path": "/music/a"}})")});
    const auto queue = Queue("music");
    ASSERT_EQ(queue.size(), 1u);
    EXPECT_EQ(queue[0]["event"].asUInt(), 131072u);
    EXPECT_EQ(queue[0]["path"].asString(), music_ + "/a");
    EXPECT_EQ(queue[0]["data"],
              J(R"({"/music/a": {"document": true, "audio": true, "video": true, "photo": true}})"));
    EXPECT_TRUE(testkit::Exists(music_ + "/@eaDir/QIRA@.fileindexdb/sub"));
}

TEST_F(DeleteTest, OnlyFolderOfOneShareWhileAnotherKeepsFolders) {
    Seed(R"({"/music/a": {}, "/photo/a": {}})");
    ASSERT_TRUE(IndexMgr::Delete(J(R"(["/music/a", "/music/a"])")));
    EXPECT_EQ(Messages().size(), 2u);
    const auto ops = testkit::JournalOps();
    EXPECT_EQ(ops, std::vector<std::string>{"MonitorQueue::Delete " + QueueOf("music") + " fileindex 1"});
    EXPECT_FALSE(testkit::Exists(QueueOf("music")));  // the event was queued, then the share's queue removed
    EXPECT_EQ(qira_sim::ServiceState("fileindexd"), "running");
    EXPECT_FALSE(testkit::Exists(music_ + "/@eaDir/QIRA@.fileindexdb"));
}

// A request that is not an array of paths, or holds an empty path, fails before the save.
TEST_F(DeleteTest, BadRequestsChangeNothing) {
    Seed(R"({"/music/a": {}})");
    const std::string before = testkit::ReadFile(FolderConf());
    const std::tuple<const char*, const char*, _tag_fileindex_err_> cases[] = {
        {R"({"a": 1})", R"(Bad param: {"a":1})", FILEINDEX_ERR_BAD_PARAM},
        {R"(["/music/a", {"path": "/music/a"}])", R"(Bad param: {"path":"/music/a"})", FILEINDEX_ERR_BAD_PARAM},
        {R"(["/music/a", 5])", "Bad param: 5", FILEINDEX_ERR_BAD_PARAM},
        {R"(["/music/a", ""])", "GetShareNameByPath failed, path=", FILEINDEX_ERR_NONE}};
    for (const auto& [request, logged, error] : cases) {
        SCOPED_TRACE(request);
        Settle();
        EXPECT_FALSE(IndexMgr::Delete(J(request)));
        EXPECT_EQ(testkit::LogMessages().at(0), logged);
        EXPECT_EQ(ErrorHandler::GetError(), error);
        EXPECT_EQ(testkit::ReadFile(FolderConf()), before);
        EXPECT_TRUE(qira_sim::Journal().empty());
    }
}

// A step after the save fails: the folder stays deleted and the failure is logged.
TEST_F(DeleteTest, FailuresAfterTheSaveAreReportedWithTheirMessages) {
    const char* both = R"({"/music/a": {}, "/music/b": {}})";
    const char* alone = R"({"/music/a": {}, "/photo/a": {}})";  // the share's last folder
    const std::vector<std::tuple<const char*, std::function<void()>, std::vector<std::string>>> cases = {
        {both, [this] { daemon_.reset(); }, {"SendCammandToDaemon failed"}},
        {both, [] { qira_sim::InjectFault("MonitorQueue::Upsert", 0x90); }, {"UpsertQIRANotifydCfg failed, share=music"}},
        {alone, [] { qira_sim::InjectFault("MonitorQueue::Delete", 0x91); }, {"DeleteQIRANtifydCfg failed, share=music"}},
        {both, [this] { unlink(QueueOf("music").c_str()); MakeDir(QueueOf("music")); }, {"AddCustomEvent failed", "Update failed"}},
        // The share vanishes once the event's queue is known, before the clean-up asks for it again.
        {alone, [] { qira_sim::InjectFault("QIRAShareGet", 0x0B00, "music", {"QIRAEAMKDir", ""}); },
         {"CleanShareIndexData failed, share=music"}},
    };
    for (const auto& [conf, plant, logged] : cases) {
        SCOPED_TRACE(logged[0]);
        qira_sim::ClearFaults();
        rmdir(QueueOf("music").c_str());
        if (!daemon_) daemon_ = std::make_unique<testkit::FakeDaemon>(QIRA::FILEINDEX::DaemonSocketPath());
        Seed(conf);
        plant();
        EXPECT_FALSE(IndexMgr::Delete(J(R"(["/music/a"])")));
        for (const auto& line : logged) EXPECT_TRUE(testkit::Logged(line)) << line;
        EXPECT_FALSE(Conf().isMember("/music/a"));
    }
    EXPECT_EQ(qira_sim::Registrations().size(), 1u);  // the failed clean-up kept the monitor queue
}

}  // namespace
