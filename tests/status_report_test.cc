// Status words of the service and of one folder.
#include "testkit.h"

namespace {

class StatusReportTest : public testkit::IndexFixture {
protected:
    void SetUp() override {
        IndexFixture::SetUp();
        testkit::WriteFile(FolderConf(), R"({"/music/a": {}, "/music/ab": {}, "/photo/a": {}})");
        MakeDir(music_ + "/ab");
        MakeDir(music_ + "/@eaDir");
        MakeDir(photo_ + "/@eaDir");
    }
    std::string Service() {
        std::string word = "unset";
        EXPECT_TRUE(StatusMgr::GetStatus(word));
        return word;
    }
    std::string Record(const std::string& path, int event = 131072) {
        return "{\"event\":" + std::to_string(event) + ",\"path\":\"" + path + "\",\"data\":{}}\n";
    }
};

// One row: status.conf, one queue file and its content, then the word of the service (no folder)
// or of a folder.
TEST_F(StatusReportTest, WordsFollowTheQueuesThePauseAndTheNoSpaceFlag) {
    const std::string later = std::to_string(time(nullptr) + 3600), earlier = std::to_string(time(nullptr) - 10);
    const std::string music = QueueOf("music"), tmp = QueueOf("music") + ".tmp", photo = QueueOf("photo");
    const std::string old = "\"path\":\"/elsewhere\",\"path_old\":\"" + music_ + "/a/old\"}\n";
    const auto event = [&](const char* value) { return "{\"event\":" + std::string(value) + ",\"path\":\"" + music_ + "/a/x\"}\n"; };
    struct Case {
        std::string status, queue, content, folder, word;
    } cases[] = {
        {R"({"resume_time": 0})", "", "", "", "finished"},
        {R"({"resume_time": 0})", photo, "", "", "paused"},
        {"{\"resume_time\": " + earlier + "}", photo, "", "", "processing"},
        {"{\"resume_time\": " + later + "}", photo, "", "", "paused"},
        {R"({"resume_time": -1})", photo, "", "", "processing"},
        {"", tmp, Record(music_ + "/b"), "", "processing"},  // any companion is pending for the service
        {"", tmp, Record(music_ + "/b"), "/music/a", "finished"},
        {"", tmp, Record(music_ + "/a/x"), "/music/a", "processing"},
        {"", "", "", "/music/a", "finished"},
        {"", music, Record(music_ + "/a/song.mp3"), "/music/a", "processing"},
        {R"({"resume_time": 0})", music, Record(music_ + "/a/song.mp3"), "/music/a", "paused"},
        {R"({"resume_time": 0, "no_space": {"music": true}})", music, Record(music_ + "/a/x"), "/music/a", "err_no_space"},
        {R"({"resume_time": 0, "no_space": {"music": true}})", music, Record(music_ + "/a/x"), "/photo/a", "finished"},
        {R"({"no_space": {"music": true}})", "", "", "/music/a", "err_no_space"},  // decided before the queues
        {"", "", "", "/music/missing", "paused"},
        {"", "", "", "/nosuch/a", "paused"},
        {"", music, Record(music_ + "/ab/x"), "/music/ab", "processing"},
        {"", music, Record(music_ + "/ab/x"), "/music/a", "finished"},  // on a slash boundary
        {"", music, "{\"event\":256," + old, "/music/a", "processing"},  // old paths only for event 256
        {"", music, "{\"event\":5," + old, "/music/a", "finished"},
        {"", music, "{\"event\":256,\"path\":\"/elsewhere\",\"path_old\":7}\n", "/music/a", "finished"},
        // null, booleans and fractions convert to an unsigned event: records, not malformed lines.
        {"", music, event("null"), "/music/a", "processing"},
        {"", music, event("true"), "/music/a", "processing"},
        {"", music, event("false"), "/music/a", "processing"},
        {"", music, event("1.5"), "/music/a", "processing"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.status + " | " + c.queue + ": " + c.content + " | " + c.folder);
        for (const auto& file : {StatusConf(), music, tmp, photo}) unlink(file.c_str());
        if (!c.status.empty()) testkit::WriteFile(StatusConf(), c.status);
        if (!c.queue.empty()) testkit::WriteFile(c.queue, c.content);
        testkit::ClearLog();
        EXPECT_EQ(c.folder.empty() ? Service() : StatusMgr::GetFolderStatus(c.folder), c.word);
        if (c.queue == music) {
            EXPECT_TRUE(testkit::LogLines().empty());
        }
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
    testkit::ClearLog();  // once per process: asking again logs nothing, a new malformed line is logged
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "processing");
    EXPECT_TRUE(testkit::LogMessages().empty());
    testkit::AppendFile(QueueOf("music"), "late garbage\n");
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "processing");
    EXPECT_EQ(testkit::LogMessages(), std::vector<std::string>{"Malformed command: late garbage"});
}

TEST_F(StatusReportTest, UnknownShareQueuePathOrPauseStateFailsTheServiceWord) {
    // An unreadable pause state fails the service word; a folder reads it as -1.
    testkit::WriteFile(QueueOf("music"), "");
    testkit::WriteFile(StatusConf(), R"({"resume_time": "soon"})");
    std::string word = "unchanged";
    EXPECT_FALSE(StatusMgr::GetStatus(word));
    EXPECT_EQ(word, "unchanged");
    testkit::WriteFile(QueueOf("music"), Record(music_ + "/a"));
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "processing");  // pause value -1
    unlink(StatusConf().c_str());
    testkit::WriteFile(FolderConf(), "{}");
    EXPECT_EQ(Service(), "finished");  // no folders
    testkit::WriteFile(FolderConf(), R"({"": {}})");
    EXPECT_FALSE(StatusMgr::GetStatus(word));
    EXPECT_TRUE(testkit::Logged("Failed to get share name from path: "));
    // The share vanishes after the indexability rules, before its queue path is asked for.
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    qira_sim::InjectFault("QIRAShareGet", 0x0B00, "music", {"QIRAFSDirIsMntPoint", ShareDir("music") + "/a"});
    EXPECT_FALSE(StatusMgr::GetStatus(word));
    EXPECT_TRUE(testkit::Logged("FILEIDXQueuePathGet failed, share=music"));
}

}  // namespace
