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

TEST_F(PlantedLinkTest, SymlinkedQueueIsRefusedAndTheShareMarked) {
    Canary canary(outside_ + "/target");
    MakeDir(music_ + "/@eaDir");
    ASSERT_EQ(symlink((outside_ + "/target").c_str(), QueueOf("music").c_str()), 0);
    EXPECT_FALSE(AddCustomEvent(kEventReindex, music_ + "/a", Json::Value()));
    EXPECT_TRUE(StatusMgr::ShareIsNeedReindex("music"));
    canary.ExpectUntouched();
}

TEST_F(PlantedLinkTest, HardLinkedQueueIsRefused) {
    const std::string target = music_ + "/user-file";
    testkit::WriteFile(target, "user data");
    MakeDir(music_ + "/@eaDir");
    ASSERT_EQ(link(target.c_str(), QueueOf("music").c_str()), 0);
    EXPECT_FALSE(AddCustomEvent(kEventReindex, music_ + "/a", Json::Value()));
    EXPECT_EQ(testkit::ReadFile(target), "user data");
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

TEST_F(PlantedLinkTest, SymlinkedCompanionIsNeitherFollowedNorRemovedThrough) {
    Canary canary(outside_ + "/records");
    MakeDir(music_ + "/@eaDir");
    ASSERT_EQ(symlink((outside_ + "/records").c_str(), (QueueOf("music") + ".tmp").c_str()), 0);
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "finished");
    EXPECT_TRUE(AddCustomEvent(kEventReindex, music_ + "/a", Json::Value()));
    EXPECT_TRUE(IndexMgr::CleanShareIndexData("music"));
    EXPECT_FALSE(testkit::Exists(QueueOf("music") + ".tmp"));
    canary.ExpectUntouched();
}

TEST_F(PlantedLinkTest, SymlinkedDatabaseDirectoryIsLeftAlone) {
    MakeDir(music_ + "/@eaDir");
    MakeDir(outside_ + "/db");
    Canary canary(outside_ + "/db/index");
    ASSERT_EQ(symlink((outside_ + "/db").c_str(), (music_ + "/@eaDir/QIRA@.fileindexdb").c_str()), 0);
    char buffer[4096];
    EXPECT_GT(FILEIDXDBPathGet("music", buffer, sizeof buffer), 0);
    EXPECT_TRUE(IndexMgr::CleanShareIndexData("music"));
    canary.ExpectUntouched();
}

class DaemonFaultTest : public testkit::Sandbox {
protected:
    // A server in a child process that accepts one connection and then behaves as told.
    template <typename Behaviour>
    pid_t Serve(Behaviour behaviour) {
        const std::string path = DaemonSocketPath();
        int ready[2];
        if (pipe(ready) != 0) return -1;
        const pid_t pid = fork();
        if (pid == 0) {
            const int fd = testkit::ListenUnix(path, 4);
            if (write(ready[1], "r", 1) != 1) _exit(1);
            const int client = accept(fd, nullptr, nullptr);
            behaviour(client);
            _exit(0);
        }
        char c;
        if (read(ready[0], &c, 1) != 1) return -1;
        return pid;
    }
};

// Neither a daemon that never reads nor one that closes at once keeps the caller: RunBounded ends
// a caller that hangs.
TEST_F(DaemonFaultTest, DaemonThatNeverReadsDoesNotHoldTheCaller) {
    const pid_t pid = Serve([](int) { pause(); });
    Json::Value big(Json::objectValue);  // the socket buffer takes it
    big["folder_path"] = std::string(5000, 'x');
    EXPECT_EQ(testkit::RunBounded(60, [&] { return SendCammandToDaemon("upsert_folder_setting", big); }), 1);
    kill(pid, SIGKILL);
    waitpid(pid, nullptr, 0);
}

TEST_F(DaemonFaultTest, DaemonThatClosesAtOnceFailsWithoutSigpipe) {
    const pid_t pid = Serve([](int client) {
        shutdown(client, SHUT_RDWR);
        close(client);
    });
    // Larger than the socket buffer, so the close is met whenever it happens.
    Json::Value huge(Json::objectValue);
    huge["folder_path"] = std::string(1 << 20, 'x');
    EXPECT_EQ(testkit::RunBounded(60, [&] { return SendCammandToDaemon("upsert_folder_setting", huge); }), 0);
    waitpid(pid, nullptr, 0);
}

}  // namespace
