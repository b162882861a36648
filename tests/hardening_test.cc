// Links planted in share directories and hostile daemons never steer the library.
#include "testkit.h"

namespace {

using testkit::Canary;

class PlantedLinkTest : public testkit::IndexFixture {
protected:
    void SetUp() override {
        IndexFixture::SetUp();
        outside_ = Path("/outside");
        MakeDir(outside_);
    }
    std::string outside_;
};

// A queue that is a symbolic link or has a second name is refused and its share marked.
TEST_F(PlantedLinkTest, LinkedQueueIsRefusedAndTheShareMarked) {
    Canary canary(outside_ + "/target");
    const std::string userFile = music_ + "/user-file";
    testkit::WriteFile(userFile, "user data");
    MakeDir(music_ + "/@eaDir");
    for (const bool symbolic : {true, false}) {
        SCOPED_TRACE(symbolic ? "symbolic" : "hard");
        unlink(QueueOf("music").c_str());
        unlink(StatusConf().c_str());
        ASSERT_EQ(symbolic ? symlink((outside_ + "/target").c_str(), QueueOf("music").c_str())
                           : link(userFile.c_str(), QueueOf("music").c_str()),
                  0);
        EXPECT_FALSE(AddCustomEvent(kEventReindex, music_ + "/a", Json::Value()));
        EXPECT_TRUE(StatusMgr::ShareIsNeedReindex("music"));
    }
    canary.ExpectUntouched();
    EXPECT_EQ(testkit::ReadFile(userFile), "user data");
}

TEST_F(PlantedLinkTest, SymlinkedEaDirIsRefusedForQueueAndDatabase) {
    Canary canary(outside_ + "/QIRA@file_index_queue");
    ASSERT_EQ(symlink(outside_.c_str(), (music_ + "/@eaDir").c_str()), 0);
    EXPECT_FALSE(AddCustomEvent(kEventReindex, music_ + "/a", Json::Value()));
    char buffer[4096];
    EXPECT_GT(FILEIDXDBPathGet("music", buffer, sizeof buffer), 0);
    EXPECT_FALSE(testkit::Exists(outside_ + "/QIRA@.fileindexdb"));
    MakeDir(outside_ + "/QIRA@.fileindexdb");
    EXPECT_TRUE(IndexMgr::CleanShareIndexData("music"));
    EXPECT_TRUE(testkit::Exists(outside_ + "/QIRA@.fileindexdb"));
    canary.ExpectUntouched();
}

// A companion or a database directory that is a link is neither followed nor removed through.
TEST_F(PlantedLinkTest, SymlinkedCompanionAndDatabaseAreNeitherFollowedNorRemovedThrough) {
    Canary records(outside_ + "/records");
    MakeDir(outside_ + "/db");
    Canary index(outside_ + "/db/index");
    MakeDir(music_ + "/@eaDir");
    ASSERT_EQ(symlink((outside_ + "/records").c_str(), (QueueOf("music") + ".tmp").c_str()), 0);
    ASSERT_EQ(symlink((outside_ + "/db").c_str(), (music_ + "/@eaDir/QIRA@.fileindexdb").c_str()), 0);
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "finished");
    EXPECT_TRUE(AddCustomEvent(kEventReindex, music_ + "/a", Json::Value()));
    char buffer[4096];
    EXPECT_GT(FILEIDXDBPathGet("music", buffer, sizeof buffer), 0);
    EXPECT_TRUE(IndexMgr::CleanShareIndexData("music"));
    EXPECT_FALSE(testkit::Exists(QueueOf("music") + ".tmp"));
    records.ExpectUntouched();
    index.ExpectUntouched();
}

class DaemonFaultTest : public testkit::Sandbox {};

// Neither a daemon that never reads nor one that closes at once keeps the caller (RunBounded ends
// one that hangs), and the close raises no SIGPIPE.
TEST_F(DaemonFaultTest, AStuckOrClosingDaemonDoesNotHoldTheCaller) {
    const std::vector<std::tuple<const char*, std::function<void(int)>, size_t, int>> cases = {
        {"never reads", [](int) { pause(); }, 5000, 1},  // the socket buffer takes it
        {"closes at once", [](int client) { shutdown(client, SHUT_RDWR); }, 1 << 20, 0},  // larger than the buffer
    };
    for (const auto& [name, behaviour, size, result] : cases) {
        SCOPED_TRACE(name);
        int ready[2];
        ASSERT_EQ(pipe(ready), 0);
        unlink(DaemonSocketPath().c_str());
        const pid_t daemon = fork();
        if (daemon == 0) {
            const int fd = testkit::ListenUnix(DaemonSocketPath(), 4);
            if (fd < 0 || write(ready[1], "r", 1) != 1) _exit(1);
            behaviour(accept(fd, nullptr, nullptr));
            _exit(0);
        }
        close(ready[1]);
        char c;
        ASSERT_EQ(read(ready[0], &c, 1), 1);
        Json::Value data(Json::objectValue);
        data["folder_path"] = std::string(size, 'x');
        EXPECT_EQ(testkit::RunBounded(60, [&] { return SendCammandToDaemon("upsert_folder_setting", data); }), result);
        kill(daemon, SIGKILL);
        waitpid(daemon, nullptr, 0);
        close(ready[0]);
    }
}

}  // namespace
