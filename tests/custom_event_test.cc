// Appending custom events to a share's queue; duplicates of a pending reindex; the fallback.
#include "testkit.h"

#include <algorithm>

#include "pending_reindex.h"

namespace {

class CustomEventTest : public testkit::Sandbox {
protected:
    void SetUp() override {
        Sandbox::SetUp();
        dir_ = AddShare("s");
    }
    std::string dir_;
};

TEST_F(CustomEventTest, FirstEventCreatesTheQueueWithOneWholeLine) {
    ASSERT_TRUE(AddCustomEvent(kEventFolderSettingChanged, dir_ + "/a", J(R"({"audio": true})")));
    EXPECT_EQ(testkit::ReadFile(QueueOf("s")),
              "{\"data\":{\"audio\":true},\"event\":131072,\"path\":\"" + dir_ + "/a\"}\n");
    EXPECT_EQ(testkit::ModeOf(QueueOf("s")) & (S_IFMT | 0022), S_IFREG);
}

// A pending reindex of exactly the path, in the queue or its companion, suppresses any event;
// other records, other paths and unreadable lines do not.
TEST_F(CustomEventTest, APendingReindexOfExactlyThePathSuppressesAnyEvent) {
    MakeDir(dir_ + "/@eaDir");
    const auto reindexOf = [](const std::string& path) { return "{\"event\":65536,\"path\":\"" + path + "\",\"data\":null}\n"; };
    const std::string before = "garbage\n{\"event\":\"x\",\"path\":1}\n{\"event\":131072,\"path\":\"" + dir_ + "/b\"}\n" +
                               reindexOf(dir_ + "/a") + "{\"event\":65536,\"path\":\"" + dir_ + "\\/e\"}\n";  // an escaped slash
    testkit::WriteFile(QueueOf("s"), before);
    testkit::WriteFile(QueueOf("s") + ".tmp", reindexOf(dir_ + "/c"));
    for (const std::string& covered : {dir_ + "/a", dir_ + "/c", dir_ + "/e"}) {
        EXPECT_TRUE(AddCustomEvent(kEventFolderSettingChanged, covered, J("{}")));
        EXPECT_TRUE(AddCustomEvent(kEventReindex, covered, J("{}")));
    }
    EXPECT_EQ(testkit::ReadFile(QueueOf("s")), before);
    for (const std::string& other : {dir_ + "/a/b", dir_, dir_ + "/A", dir_ + "/b"}) {
        EXPECT_TRUE(AddCustomEvent(kEventFolderSettingChanged, other, J("{}")));
    }
    EXPECT_EQ(testkit::ReadJsonLines(QueueOf("s") + ".tmp").size(), 1u);
    const std::string content = testkit::ReadFile(QueueOf("s"));
    EXPECT_EQ(std::count(content.begin(), content.end(), '\n'), 9);
}

// A queue whose lock another process holds is waited for: released once the append has met it,
// the record lands and the call succeeds. Held for longer than the append waits, the event is
// given up, the share is marked for a full reindex, the caller learns of it, and the queue is
// left as it was.
TEST_F(CustomEventTest, AHeldQueueIsWaitedForAndGivenUpWhenHeldTooLong) {
    testkit::WriteFile(FolderConf(), R"({"/s/a": {}})");
    MakeDir(dir_ + "/@eaDir");
    testkit::WriteFile(QueueOf("s"), "");
    const auto holdQueue = [this] { return flock(open(QueueOf("s").c_str(), O_RDWR), LOCK_EX) == 0; };
    testkit::ChildHolding holder(holdQueue);
    ASSERT_TRUE(holder.Took());
    testkit::OpenWatch watch({QueueOf("s")}, IN_CLOSE_WRITE);
    const pid_t appender = fork();
    if (appender == 0) _exit(IndexMgr::Reindex(J(R"(["/s/a"])")) ? 1 : 0);
    // An attempt that met the lock closes the queue again: release it then.
    ASSERT_TRUE(testkit::WaitFor([&] { return !watch.Opened().empty(); }));
    holder.Release();
    int status = -1;
    ASSERT_EQ(waitpid(appender, &status, 0), appender);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 1);
    const std::string queued = "{\"data\":null,\"event\":65536,\"path\":\"" + dir_ + "/a\"}\n";
    EXPECT_EQ(testkit::ReadFile(QueueOf("s")), queued);
    EXPECT_FALSE(testkit::Exists(StatusConf()));

    testkit::ChildHolding tooLong(holdQueue);
    ASSERT_TRUE(tooLong.Took());
    LOG_LEVEL = 7;
    EXPECT_FALSE(AddCustomEvent(kEventFolderSettingChanged, dir_ + "/b", J("{}")));
    LOG_LEVEL = 3;
    EXPECT_EQ(testkit::LogMessages(), std::vector<std::string>{"try lock too many times, path=" + QueueOf("s") +
                                                               ", reason=Resource temporarily unavailable"});
    EXPECT_EQ(testkit::ParseJson(testkit::ReadFile(StatusConf())), J(R"({"need_reindex": {"s": true}})"));
    testkit::ClearLog();
    EXPECT_FALSE(IndexMgr::Reindex(J(R"(["/s/c"])")));
    EXPECT_EQ(testkit::LogMessages(), std::vector<std::string>{"AddCustomEvent failed, path=/s/c"});
    EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_NONE);
    tooLong.Release();
    EXPECT_EQ(testkit::ReadFile(QueueOf("s")), queued);
}

// An event that cannot be queued marks its share (the empty name when it has none) and fails; a
// marking that fails is logged too.
TEST_F(CustomEventTest, AnEventThatCannotBeQueuedMarksItsShare) {
    struct Case {
        std::string name, path, logged, status;
        std::function<void()> setUp;
        _tag_fileindex_err_ error = FILEINDEX_ERR_NONE;
    };
    const std::vector<Case> cases = {
        {"unknown share", Path("/volume2/x"), "QIRAShareNamePathGet failed, path=" + Path("/volume2/x"),
         "{\"need_reindex\":{\"\":true}}\n", [] {}},
        {"no queue path", dir_ + "/x", "FILEIDXQueuePathGet failed, share=s", "{\"need_reindex\":{\"s\":true}}\n",
         [] { qira_sim::InjectFault("QIRAShareGet", 0x0B00, "s"); }},
        {"marking fails", dir_ + "/x", "ShareSetNeedReindex failed, share=s", "",
         [this] {
             MakeDir(QueueOf("s"));
             unlink(Path("/tmp/fileidx_cfg_status.lock").c_str());
             mkdir(Path("/tmp/fileidx_cfg_status.lock").c_str(), 0755);
         },
         FILEINDEX_ERR_LOCK},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        unlink(StatusConf().c_str());
        testkit::ClearLog();
        c.setUp();
        EXPECT_FALSE(AddCustomEvent(kEventReindex, c.path, Json::Value()));
        EXPECT_TRUE(testkit::Logged(c.logged));
        EXPECT_EQ(testkit::ReadFile(StatusConf()), c.status);
        EXPECT_EQ(ErrorHandler::GetError(), c.error);
        qira_sim::ClearFaults();
    }
}

// One operation keeps what it read of a queue and reads on only as far as the file grew; a file
// rewritten in place or replaced is read again.
TEST_F(CustomEventTest, PendingReindexFollowsTheQueueAsItChanges) {
    const std::string queue = QueueOf("s");
    const std::string a = dir_ + "/a";
    const auto reindexOf = [](const std::string& path) { return "{\"event\":65536,\"path\":\"" + path + "\"}\n"; };
    MakeDir(dir_ + "/@eaDir");
    testkit::WriteFile(queue, reindexOf(dir_ + "/other"));
    detail::PendingReindex pending({a});
    EXPECT_FALSE(pending.IsQueued(a, queue));
    testkit::AppendFile(queue, reindexOf(a));
    EXPECT_TRUE(pending.IsQueued(a, queue));  // appended by another writer
    std::string same = reindexOf(dir_ + "/other") + reindexOf(dir_ + "/b");
    same.resize(testkit::ReadFile(queue).size(), ' ');
    const int inPlace = open(queue.c_str(), O_WRONLY);
    ASSERT_EQ(pwrite(inPlace, same.data(), same.size(), 0), static_cast<ssize_t>(same.size()));
    close(inPlace);
    EXPECT_FALSE(pending.IsQueued(a, queue));  // rewritten in place at the same size
    unlink(queue.c_str());
    testkit::WriteFile(queue, "\n" + reindexOf(a));
    EXPECT_TRUE(pending.IsQueued(a, queue));  // a new file
    testkit::WriteFile(queue + ".x", reindexOf(dir_ + "/c"));
    rename((queue + ".x").c_str(), queue.c_str());
    EXPECT_TRUE(pending.IsQueued(dir_ + "/c", queue));  // a path not announced is read for too
}

}  // namespace
