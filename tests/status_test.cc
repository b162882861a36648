// status.conf, the status manager's writers and readers, and the no-space notice.
#include "testkit.h"

#include "daemon_channel.h"

namespace {

const std::vector<std::string> kNoticeArgs = {
    "-e", "false", "-c", "QIRA.ZOR.AdminCenter.Application", "@administrators", "fileindex:fileindex_title",
    "fileindex:notify_no_space",
    "<a data-qira-app=\"QIRA.ZOR.AdminCenter.Application\" data-qira-fn=\"QIRA.ZOR.AdminCenter.MediaIndex.Main\" "
    "data-qira-tab=\"fileIndex\">",
    "</a>"};

class StatusTest : public testkit::Sandbox {
protected:
    Json::Value File() { return testkit::ParseJson(testkit::ReadFile(StatusConf())); }
};

// The notice runs the notifier with its ten arguments, on the transition to flagged only; a failed
// notice is logged and the flag still set.
TEST_F(StatusTest, NoSpaceNoticeOnlyOnTheTransitionToFlagged) {
    EXPECT_TRUE(StatusMgr::ShareSetNoSpace("s", true));
    EXPECT_TRUE(StatusMgr::ShareSetNoSpace("s", true));
    EXPECT_EQ(qira_sim::NotifierCalls(), std::vector<std::vector<std::string>>{kNoticeArgs});
    const auto journal = qira_sim::Journal();
    ASSERT_EQ(journal.size(), 1u);
    EXPECT_EQ(journal[0]["op"].asString(), "QLIBCExecv");
    EXPECT_EQ(journal[0]["args"][0].asString(), Path("/usr/qira/bin/qiralumnotify"));
    EXPECT_EQ(journal[0]["args"].size(), 10u);
    EXPECT_EQ(File(), J(R"({"no_space": {"s": true}})"));
    EXPECT_TRUE(StatusMgr::ShareSetNoSpace("s", false));
    EXPECT_EQ(File(), J(R"({"no_space": {}})"));
    EXPECT_TRUE(testkit::LogLines().empty());
    qira_sim::SetNotifierExitStatus(2);
    EXPECT_TRUE(StatusMgr::ShareSetNoSpace("s", true));
    EXPECT_EQ(qira_sim::NotifierCalls().size(), 2u);
    EXPECT_EQ(testkit::LogMessages(), std::vector<std::string>{"NotifyNoSpace failed"});
    EXPECT_TRUE(StatusMgr::ShareIsNoSpace("s"));
    qira_sim::InjectFault("QLIBCExecv", 0x0F00);
    EXPECT_FALSE(NotifyNoSpace());
}

// A flag is set by the share's membership, whatever its value; a marker by its value as a boolean.
// A missing file reads as running and unflagged and is not made by reading.
TEST_F(StatusTest, FlagsAreMembershipsMarkersBooleansAndFlagSetsWrittenOnlyAsObjects) {
    struct Case {
        const char* content;
        bool noSpace, needReindex, updated;
    };
    const Case cases[] = {
        {"", false, false, false},
        {R"({"no_space": {"s": false}, "need_reindex": ["s"], "s": 1})", true, false, true},
        {R"({"no_space": "s", "s": 0})", false, false, false},
        {R"({"s": false})", false, false, false},
        {R"({"s": "yes"})", false, false, false},
        {R"({"s": {}})", false, false, false},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.content);
        if (*c.content != '\0') testkit::WriteFile(StatusConf(), c.content);
        EXPECT_EQ(StatusMgr::ShareIsNoSpace("s"), c.noSpace);
        EXPECT_EQ(StatusMgr::ShareIsNeedReindex("s"), c.needReindex);
        EXPECT_EQ(StatusMgr::IsUpdated("s"), c.updated);
        long long resume = 5;
        EXPECT_EQ(StatusMgr::GetPauseInfo(resume), true);
        EXPECT_EQ(resume, -1);
        EXPECT_EQ(testkit::Exists(StatusConf()), *c.content != '\0');
    }
    EXPECT_TRUE(StatusMgr::SetUpdated("s"));
    EXPECT_TRUE(StatusMgr::IsUpdated("s"));
    // Clearing on a fresh file leaves a null member; a flag set of the wrong type is not repaired.
    unlink(StatusConf().c_str());
    EXPECT_TRUE(StatusMgr::ShareSetNeedReindex("s", false));
    EXPECT_EQ(File(), J(R"({"need_reindex": null})"));
    EXPECT_TRUE(StatusMgr::ShareSetNeedReindex("s", true));
    EXPECT_TRUE(StatusMgr::ShareIsNeedReindex("s"));
    EXPECT_FALSE(StatusMgr::ShareIsNoSpace("s"));
    const std::string content = R"({"no_space": ["s"], "need_reindex": 3})";
    testkit::WriteFile(StatusConf(), content);
    EXPECT_FALSE(StatusMgr::ShareSetNoSpace("s", true));
    EXPECT_FALSE(StatusMgr::ShareSetNeedReindex("s", false));
    EXPECT_EQ(testkit::ReadFile(StatusConf()), content);
    EXPECT_TRUE(qira_sim::NotifierCalls().empty());
}

TEST_F(StatusTest, MalformedResumeTimeIsAJsonException) {
    for (const char* content : {R"({"resume_time": "x"})", R"({"resume_time": {}})", R"({"resume_time": 1e300})",
                                "[1]"}) {
        SCOPED_TRACE(content);
        testkit::WriteFile(StatusConf(), content);
        testkit::ClearLog();
        long long resume = 42;
        EXPECT_FALSE(StatusMgr::GetPauseInfo(resume)) << content;
        EXPECT_EQ(resume, 42);
        EXPECT_EQ(testkit::LogMessages(), std::vector<std::string>{"json exception"});
    }
}

// A negative pause touches nothing; a pause past 2^31 seconds wraps in 32 bits as stored.
TEST_F(StatusTest, PauseAndResumeWriteTheFileAndTellTheDaemon) {
    testkit::FakeDaemon daemon(DaemonSocketPath());
    EXPECT_FALSE(StatusMgr::Pause(-1));
    EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_BAD_PARAM);
    EXPECT_FALSE(testkit::Exists(StatusConf()));
    EXPECT_FALSE(testkit::Exists(Path("/tmp/fileidx_cfg_status.lock")));
    ASSERT_TRUE(StatusMgr::Pause(0));
    EXPECT_EQ(File(), J(R"({"resume_time": 0})"));
    const long long before = time(nullptr);
    ASSERT_TRUE(StatusMgr::Pause(2));
    const long long stored = File()["resume_time"].asInt64();
    EXPECT_GE(stored, before + 7200);
    EXPECT_LE(stored, time(nullptr) + 7200);
    ASSERT_TRUE(StatusMgr::Resume());
    EXPECT_EQ(File(), J(R"({"resume_time": -1})"));
    const auto messages = daemon.Messages();
    ASSERT_EQ(messages.size(), 3u);
    EXPECT_EQ(messages[0], J(R"({"type": "pause", "data": {"resume_time": 0}})"));
    EXPECT_EQ(messages[1]["data"]["resume_time"].asInt64(), stored);
    EXPECT_EQ(messages[2], J(R"({"type": "resume", "data": {}})"));
    const int hours = 600000;  // 2,160,000,000 s: past 2^31 from any present time
    const long long now = time(nullptr);
    ASSERT_TRUE(StatusMgr::Pause(hours));
    const long long wrapped = File()["resume_time"].asInt64();
    EXPECT_LT(wrapped, 0);
    EXPECT_NEAR(static_cast<double>(wrapped), static_cast<double>(static_cast<int32_t>(static_cast<uint32_t>(now) + 3600u * hours)), 2.0);
}

TEST_F(StatusTest, ReviveClearsOnlyTheNoSpaceFlagAndAnUnreachableDaemonFailsAfterTheSave) {
    testkit::WriteFile(StatusConf(), R"({"no_space": {"s": true, "t": true}, "need_reindex": {"s": true}})");
    auto daemon = std::make_unique<testkit::FakeDaemon>(DaemonSocketPath());
    ASSERT_TRUE(StatusMgr::ShareRevive("s"));
    ASSERT_TRUE(StatusMgr::ShareRevive("never"));
    EXPECT_EQ(File(), J(R"({"no_space": {"t": true}, "need_reindex": {"s": true}})"));
    const auto messages = daemon->Messages();
    ASSERT_EQ(messages.size(), 2u);
    EXPECT_EQ(messages[0], J(R"({"type": "revive_share_worker", "data": {"share_name": "s"}})"));
    daemon.reset();  // unreachable: the file is changed and the call fails
    EXPECT_FALSE(StatusMgr::Pause(1));
    EXPECT_GT(File()["resume_time"].asInt64(), 0);
    EXPECT_TRUE(testkit::Logged("SendCammandToDaemon failed"));
}

}  // namespace
