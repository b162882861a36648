// Status words of the service and of one folder.
#include "testkit.h"

namespace {

class StatusReportTest : public testkit::IndexFixture {
protected:
    void SetUp() override {
        IndexFixture::SetUp();
        testkit::WriteFile(FolderConf(), R"({"/music/a": {}, "/photo/a": {}})");
        MakeDir(music_ + "/@eaDir");
        MakeDir(photo_ + "/@eaDir");
    }
    std::string Service() {
        std::string word = "unset";
        EXPECT_TRUE(StatusMgr::GetStatus(word));
        return word;
    }
    void PauseUntil(long long resumeTime) {
        testkit::WriteFile(StatusConf(), "{\"resume_time\": " + std::to_string(resumeTime) + "}");
    }
    std::string Record(const std::string& path, int event = 131072) {
        return "{\"event\":" + std::to_string(event) + ",\"path\":\"" + path + "\",\"data\":{}}\n";
    }
};

TEST_F(StatusReportTest, NoFoldersIsFinished) {
    testkit::WriteFile(FolderConf(), "{}");
    EXPECT_EQ(Service(), "finished");
}

TEST_F(StatusReportTest, PauseShowsOnlyWhileWorkIsHeldBack) {
    PauseUntil(0);
    EXPECT_EQ(Service(), "finished");
    testkit::WriteFile(QueueOf("photo"), "");
    EXPECT_EQ(Service(), "paused");
    PauseUntil(time(nullptr) - 10);
    EXPECT_EQ(Service(), "processing");
    PauseUntil(time(nullptr) + 3600);
    EXPECT_EQ(Service(), "paused");
    PauseUntil(-1);
    EXPECT_EQ(Service(), "processing");
}

TEST_F(StatusReportTest, TmpCompanionIsPendingForTheServiceButForAFolderOnlyWithARecord) {
    testkit::WriteFile(QueueOf("music") + ".tmp", Record(music_ + "/b"));
    EXPECT_EQ(Service(), "processing");
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "finished");
    testkit::WriteFile(QueueOf("music") + ".tmp", Record(music_ + "/a/x"));
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "processing");
}

TEST_F(StatusReportTest, UnreadablePauseStateFailsTheServiceWord) {
    testkit::WriteFile(QueueOf("music"), "");
    testkit::WriteFile(StatusConf(), R"({"resume_time": "soon"})");
    std::string word = "unchanged";
    EXPECT_FALSE(StatusMgr::GetStatus(word));
    EXPECT_EQ(word, "unchanged");
    testkit::WriteFile(QueueOf("music"), Record(music_ + "/a"));
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "processing");  // pause value -1
}

TEST_F(StatusReportTest, FolderWordsFollowTheQueueThePauseAndTheNoSpaceFlag) {
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "finished");
    testkit::WriteFile(QueueOf("music"), Record(music_ + "/a/song.mp3"));
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "processing");
    PauseUntil(0);
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "paused");
    testkit::WriteFile(StatusConf(), R"({"resume_time": 0, "no_space": {"music": true}})");
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "err_no_space");
    EXPECT_EQ(StatusMgr::GetFolderStatus("/photo/a"), "finished");
}

TEST_F(StatusReportTest, FolderThatCannotBeIndexedIsPaused) {
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/missing"), "paused");
    EXPECT_EQ(StatusMgr::GetFolderStatus("/nosuch/a"), "paused");
}

TEST_F(StatusReportTest, RecordsMatchOnASlashBoundaryAndOldPathsOnlyForEvent256) {
    MakeDir(music_ + "/ab");
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}, "/music/ab": {}})");
    testkit::WriteFile(QueueOf("music"), Record(music_ + "/ab/x"));
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/ab"), "processing");
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "finished");
    testkit::WriteFile(QueueOf("music"), "{\"event\":256,\"path\":\"/elsewhere\",\"path_old\":\"" + music_ + "/a/old\"}\n");
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "processing");
    testkit::WriteFile(QueueOf("music"), "{\"event\":5,\"path\":\"/elsewhere\",\"path_old\":\"" + music_ + "/a/old\"}\n");
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "finished");
    testkit::WriteFile(QueueOf("music"), "{\"event\":256,\"path\":\"/elsewhere\",\"path_old\":7}\n");
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "finished");
    // null and booleans convert to an unsigned event: records, not malformed lines.
    for (const char* event : {"null", "true", "false", "1.5"}) {
        SCOPED_TRACE(event);
        testkit::ClearLog();
        testkit::WriteFile(QueueOf("music"), std::string("{\"event\":") + event + ",\"path\":\"" + music_ + "/a/x\"}\n");
        EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "processing");
        EXPECT_TRUE(testkit::LogLines().empty());
    }
}

TEST_F(StatusReportTest, MalformedLinesAreLoggedAndSkipped) {
    const std::vector<std::string> bad = {"garbage", "[1]", "{\"path\":\"x\"}", "{\"event\":-1,\"path\":\"x\"}",
                                          "{\"event\":1,\"path\":2}", ""};
    std::string content;
    for (const auto& line : bad) content += line + "\n";
    content += Record(music_ + "/a");
    testkit::WriteFile(QueueOf("music"), content);
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "processing");
    std::vector<std::string> expected;
    for (const auto& line : bad) expected.push_back("Malformed command: " + line);
    EXPECT_EQ(testkit::LogMessages(), expected);
    EXPECT_EQ(testkit::LogLines()[0].source, "queue_status.cc");
}

TEST_F(StatusReportTest, UnknownShareOrQueuePathFailsTheServiceWord) {
    testkit::WriteFile(FolderConf(), R"({"": {}})");
    std::string word;
    EXPECT_FALSE(StatusMgr::GetStatus(word));
    EXPECT_TRUE(testkit::Logged("Failed to get share name from path: "));
    // The share vanishes after the indexability rules, before its queue path is asked for.
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    qira_sim::InjectFault("QIRAShareGet", 0x0B00, "music", {"QIRAFSDirIsMntPoint", ShareDir("music") + "/a"});
    EXPECT_FALSE(StatusMgr::GetStatus(word));
    EXPECT_TRUE(testkit::Logged("FILEIDXQueuePathGet failed, share=music"));
}

}  // namespace
