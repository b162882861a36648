// What a share's user can plant in the share or put in a request never makes the library hang,
// leak descriptors, or act outside the share.
#include "testkit.h"

#include <stdio.h>
#include <sys/resource.h>

#include "queue_file.h"

namespace {

class ShareUserTest : public testkit::IndexFixture {
protected:
    void SetUp() override {
        IndexFixture::SetUp();
        ASSERT_TRUE(IndexMgr::Upsert(J(R"([{"path": "/music/a"}, {"path": "/music/b"}])")));
        MakeDir(music_ + "/@eaDir/QIRA@.fileindexdb");
        Settle();
    }
};

TEST_F(ShareUserTest, NulBytesAreRefusedBeforeAnythingReachesThePlatform) {
    const std::string share("music\0x", 7);
    const std::string path = "/" + share + "/y";
    const std::string fullPath = music_ + std::string("\0x", 2);
    const std::string conf = testkit::ReadFile(FolderConf());
    const Json::Value registrations = qira_sim::Registrations();
    Json::Value out;
    std::string text;
    const std::vector<std::pair<const char*, std::function<bool()>>> calls = {
        {"Upsert", [&] { return IndexMgr::Upsert(J(R"([{"path": "/music\u0000x/y"}])")); }},
        {"Delete", [&] { return IndexMgr::Delete(J(R"(["/music\u0000x/y"])")); }},
        {"Reindex", [&] { return IndexMgr::Reindex(J(R"(["/music\u0000x/y"])")); }},
        {"Get", [&] { return IndexMgr::Get(out, path); }},
        {"Update", [&] { return IndexMgr::Update(path, J("{}")); }},
        {"IsShareIndexed", [&] { return IndexMgr::IsShareIndexed(share); }},
        {"IsPathIndexed", [&] { return IndexMgr::IsPathIndexed(path); }},
        {"IsPathContainIndexed", [&] { return IndexMgr::IsPathContainIndexed(path); }},
        {"IsFullPathIndexed", [&] { return IndexMgr::IsFullPathIndexed(fullPath); }},
        {"ShareRemove", [&] { return IndexMgr::ShareRemove(share); }},
        {"ShareRename", [&] { return IndexMgr::ShareRename("music", share); }},
        {"SharePause", [&] { return IndexMgr::SharePause(share); }},
        {"ShareResume", [&] { return IndexMgr::ShareResume(share); }},
        {"CleanShareIndexData", [&] { return IndexMgr::CleanShareIndexData(share); }},
        {"UpsertQIRANotifydCfg", [&] { return IndexMgr::UpsertQIRANotifydCfg(share); }},
        {"DeleteQIRANotifydCfg", [&] { return IndexMgr::DeleteQIRANotifydCfg(share); }},
        {"ShareRevive", [&] { return StatusMgr::ShareRevive(share); }},
        {"ShareSetNoSpace", [&] { return StatusMgr::ShareSetNoSpace(share, true); }},
        {"ShareSetNeedReindex", [&] { return StatusMgr::ShareSetNeedReindex(share, true); }},
        {"ShareIsNoSpace", [&] { return StatusMgr::ShareIsNoSpace(share); }},
        {"CanPathBeIndexed", [&] { return CanPathBeIndexed(path); }},
        {"CanFullPathBeIndexed", [&] { return CanFullPathBeIndexed(fullPath); }},
        {"IsShareSpaceEnough", [&] { return IsShareSpaceEnough(share); }},
        {"AddCustomEvent", [&] { return AddCustomEvent(kEventReindex, fullPath, Json::Value()); }},
        {"GetFullPath", [&] { return GetFullPath(text, path); }},
    };
    for (const auto& [name, call] : calls) {
        SCOPED_TRACE(name);
        Settle();
        EXPECT_FALSE(call());
        EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_BAD_PARAM);
        ASSERT_FALSE(testkit::LogMessages().empty());
        EXPECT_NE(testkit::LogMessages()[0].find("\\u0000"), std::string::npos) << testkit::LogMessages()[0];
        EXPECT_TRUE(qira_sim::Journal().empty());
    }
    EXPECT_FALSE(StatusMgr::ShareIsNeedReindex("music"));
    EXPECT_EQ(testkit::ReadFile(FolderConf()), conf);
    EXPECT_EQ(qira_sim::Registrations(), registrations);
    EXPECT_TRUE(testkit::Exists(QueueOf("music")));
    EXPECT_TRUE(testkit::Exists(music_ + "/@eaDir/QIRA@.fileindexdb"));
    EXPECT_TRUE(Messages().empty());
}

TEST_F(ShareUserTest, EaDirSwappedForALinkDuringCleanUpNeverReachesAnotherDirectory) {
    const std::string other = Path("/other");
    MakeDir(other + "/QIRA@.fileindexdb/sub");
    testkit::Canary queue(other + "/QIRA@file_index_queue");
    testkit::Canary index(other + "/QIRA@.fileindexdb/sub/index");
    const std::string eaDir = music_ + "/@eaDir";
    const std::string swap = music_ + "/swap";
    ASSERT_EQ(symlink(other.c_str(), swap.c_str()), 0);
    const pid_t swapper = fork();
    if (swapper == 0) {
        alarm(30);
        while (true) renameat2(AT_FDCWD, eaDir.c_str(), AT_FDCWD, swap.c_str(), RENAME_EXCHANGE);
    }
    for (int i = 0; i < 300; ++i) IndexMgr::CleanShareIndexData("music");
    kill(swapper, SIGKILL);
    waitpid(swapper, nullptr, 0);
    queue.ExpectUntouched();
    index.ExpectUntouched();
}

// Every writer fails with error nine while another process holds the lock of the file it writes,
// changes nothing and keeps no descriptor; readers take no lock.
TEST_F(ShareUserTest, WritersFailWithErrorNineWhileALockIsHeldAndLeakNothing) {
    testkit::WriteFile(StatusConf(), R"({"resume_time": -1})");
    const std::string folders = testkit::ReadFile(FolderConf());
    Json::Value out;
    const std::vector<std::tuple<const char*, bool, std::function<bool()>>> writers = {
        {"Upsert", false, [] { return IndexMgr::Upsert(J(R"([{"path": "/music/c"}])")); }},
        {"Delete", false, [] { return IndexMgr::Delete(J(R"(["/music/a"])")); }},
        {"Get", false, [&] { return IndexMgr::Get(out, "/music/a"); }},
        {"ShareRemove", false, [] { return IndexMgr::ShareRemove("music"); }},
        {"ShareRename", false, [] { return IndexMgr::ShareRename("music", "photo"); }},
        {"Pause", true, [] { return StatusMgr::Pause(0); }},
        {"Resume", true, [] { return StatusMgr::Resume(); }},
        {"ShareSetNoSpace", true, [] { return StatusMgr::ShareSetNoSpace("music", true); }},
        {"ShareSetNeedReindex", true, [] { return StatusMgr::ShareSetNeedReindex("music", true); }},
        {"SetUpdated", true, [] { return StatusMgr::SetUpdated("m"); }},
        {"ShareRevive", true, [] { return StatusMgr::ShareRevive("music"); }},
    };
    for (const auto& [name, ofStatus, call] : writers) {
        SCOPED_TRACE(name);
        testkit::ChildHolding holder([ofStatus = ofStatus] { return ofStatus ? Status().Lock(true) : Folders().Lock(true); });
        ASSERT_TRUE(holder.Took());
        testkit::ClearError();
        const auto descriptors = testkit::OpenDescriptors();
        EXPECT_FALSE(call());
        EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_LOCK);
        EXPECT_EQ(testkit::OpenDescriptors(), descriptors);
        long long resume = 0;
        EXPECT_TRUE(StatusMgr::GetPauseInfo(resume) && resume == -1);
        EXPECT_TRUE(IndexMgr::IsPathIndexed("/music/a"));
    }
    EXPECT_EQ(testkit::ReadFile(FolderConf()), folders);
    EXPECT_EQ(testkit::ReadFile(StatusConf()), R"({"resume_time": -1})");
    EXPECT_TRUE(NothingSent());
}

TEST_F(ShareUserTest, DaemonThatListensButNeverAcceptsFailsTheCallInsteadOfHanging) {
    daemon_.reset();
    const int listener = testkit::ListenUnix(DaemonSocketPath(), 0);
    ASSERT_GE(listener, 0);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::strncpy(address.sun_path, DaemonSocketPath().c_str(), sizeof address.sun_path - 1);
    const int pending = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);  // fills the backlog
    ASSERT_EQ(connect(pending, reinterpret_cast<sockaddr*>(&address), sizeof address), 0);
    EXPECT_EQ(testkit::RunBounded(30, [] { return SendCammandToDaemon("resume", J("{}")); }), 0);
    EXPECT_EQ(testkit::RunBounded(30, [] { return StatusMgr::Pause(0); }), 0);
    close(pending);
    close(listener);
}

TEST_F(ShareUserTest, AShortWriteIsCutBackAndAFifoQueueBlocksNobody) {
    // A long queue first, so that the size limit below stays above every other file written.
    testkit::WriteFile(QueueOf("music"), std::string(1 << 20, '\n'));
    const std::string before = testkit::ReadFile(QueueOf("music"));
    const int wrote = testkit::RunBounded(30, [&] {
        signal(SIGXFSZ, SIG_IGN);
        const rlimit limit{before.size() + 10, RLIM_INFINITY};
        return setrlimit(RLIMIT_FSIZE, &limit) == 0 && AddCustomEvent(kEventReindex, music_ + "/c", Json::Value());
    });
    EXPECT_EQ(wrote, 0);  // the event did not land: the share is marked instead
    // Compared whole, not printed: a failure message of a million lines would be a diff of them.
    const auto queue = [this] { return testkit::ReadFile(QueueOf("music")); };
    EXPECT_TRUE(queue() == before) << queue().size() << " bytes, not " << before.size();
    EXPECT_TRUE(StatusMgr::ShareIsNeedReindex("music"));
    ASSERT_TRUE(AddCustomEvent(kEventReindex, music_ + "/c", Json::Value()));
    EXPECT_TRUE(queue() == before + "{\"data\":null,\"event\":65536,\"path\":\"" + music_ + "/c\"}\n") << queue().substr(before.size());
    // A queue that is a FIFO blocks neither writers nor readers.
    ASSERT_EQ(unlink(QueueOf("music").c_str()), 0);
    ASSERT_EQ(mkfifo(QueueOf("music").c_str(), 0644), 0);
    EXPECT_EQ(testkit::RunBounded(30, [] { return IndexMgr::Upsert(J(R"([{"path": "/music/c"}])")); }), 0);
    EXPECT_TRUE(StatusMgr::ShareIsNeedReindex("music"));  // the event could not be queued
    EXPECT_EQ(testkit::RunBounded(30, [] { return IndexMgr::Reindex(J(R"(["/music/a"])")); }), 0);
    const auto scan = [this] {
        return detail::ScanQueue(QueueOf("music"), [](const detail::QueueRecord&) {}, [](const detail::MalformedLine&) {}) ==
               detail::QueueOpen::Opened;
    };
    EXPECT_EQ(testkit::RunBounded(30, scan), 0);
}

}  // namespace
