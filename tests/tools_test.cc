// The command-line tool's contract and the reference daemon stand-in working with the library.
#include <fcntl.h>
#include <poll.h>
#include <sys/file.h>
#include <sys/inotify.h>
#include <sys/wait.h>
#include <unistd.h>

#include "fileindex/fileindex.h"
#include "child_holding.h"
#include "index_fixture.h"
#include "process.h"

using namespace QIRA::FILEINDEX;
using testkit::J;

namespace {

class ToolTest : public testkit::IndexFixture {
protected:
    testkit::RunResult Ctl(std::vector<std::string> args, const std::string& input = std::string()) {
        args.insert(args.begin(), FILEINDEXCTL);
        return testkit::Run(args, input);
    }
};

TEST_F(ToolTest, FoldersRoundTripThroughJsonOutput) {
    auto result = Ctl({"folder", "add", "/music/a", "/music/b", "--name", "Songs", "--audio", "--no-photo"});
    ASSERT_EQ(result.status, 0) << result.err;
    EXPECT_EQ(result.out, "ok\n");
    EXPECT_EQ(result.err, "");
    result = Ctl({"--json", "folder", "list", "--additional", "status,is_valid", "--sort", "name", "--desc"});
    ASSERT_EQ(result.status, 0);
    const auto listing = testkit::ParseJson(result.out);
    EXPECT_EQ(listing["total"].asInt(), 2);
    EXPECT_EQ(listing["folder"][0], J(R"({"path": "/music/b", "name": "Songs", "document": false, "audio": true,
                                         "video": false, "photo": false,
                                         "additional": {"status": "processing", "is_valid": true}})"));
    result = Ctl({"--json", "folder", "get", "/music/a"});
    EXPECT_EQ(testkit::ParseJson(result.out)["name"].asString(), "Songs");
}

TEST_F(ToolTest, RequestsComeFromStandardInput) {
    const auto result = Ctl({"folder", "set", "--request", "-"}, R"([{"path": "/photo/a", "photo": true}])");
    ASSERT_EQ(result.status, 0) << result.err;
    EXPECT_TRUE(Conf()["/photo/a"]["photo"].asBool());
}

TEST_F(ToolTest, QuestionsAnswerByExitStatus) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    EXPECT_EQ(Ctl({"is", "path-indexed", "/music/a/x"}).status, 0);
    EXPECT_EQ(Ctl({"is", "path-indexed", "/music/b"}).status, 1);
    EXPECT_EQ(Ctl({"is", "share-indexed", "music"}).status, 0);
    EXPECT_EQ(Ctl({"is", "contains-indexed", "/music"}).status, 0);
    EXPECT_EQ(Ctl({"is", "full-path-indexed", music_ + "/a"}).status, 0);
    EXPECT_EQ(Ctl({"is", "indexable", "/music/a"}).status, 0);
    EXPECT_EQ(Ctl({"is", "indexable", "/music/none"}).status, 1);
    EXPECT_EQ(Ctl({"is", "skipped", music_ + "/.DS_Store"}).status, 0);
    EXPECT_EQ(Ctl({"is", "roomy", "music"}).status, 0);
    EXPECT_EQ(Ctl({"--json", "is", "share-indexed", "photo"}).out, "false\n");
}

TEST_F(ToolTest, FailuresNameTheErrorCodeOnOneStderrLine) {
    Folders holder;
    ASSERT_TRUE(holder.Lock(true));
    auto result = Ctl({"--lock-wait", "0", "folder", "delete", "/music/a"});
    holder.Unlock();
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(result.err, "fileindexctl: folder delete failed: FILEINDEX_ERR_LOCK (9): the configuration lock is held "
                          "by another process; try again\n");
}

TEST_F(ToolTest, ArgumentsTheLibraryWouldReadOtherwiseAreRefused) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}, "/photo/a": {}})");
    const std::string conf = testkit::ReadFile(FolderConf());
    const std::vector<std::pair<std::vector<std::string>, std::string>> cases = {
        {{"share", "remove", ""}, "a share name cannot be empty (the library would take it for every share)"},
        {{"share", "rename", "music", ""}, "a share name cannot be empty"},
        {{"share", "need-reindex", "", "on"}, "a share name cannot be empty"},
        {{"service", "pause", "--hours", "600000"}, "a pause of 600000 hours would end after 2038-01-19 03:14:07 UTC"},
        {{"service", "pause", "--hours", "-3"}, "hours must be a whole number, 0 or more"},
    };
    for (const auto& [args, message] : cases) {
        SCOPED_TRACE(args[0] + " " + args[1]);
        const auto result = Ctl(args);
        EXPECT_EQ(result.status, 2);
        EXPECT_EQ(result.out, "");
        EXPECT_NE(result.err.find(message), std::string::npos) << result.err;
    }
    EXPECT_EQ(testkit::ReadFile(FolderConf()), conf);
    EXPECT_FALSE(testkit::Exists(StatusConf()));
}

TEST_F(ToolTest, HeldLockIsRetriedUntilItIsReleased) {
    testkit::ChildHolding holder([] { return Folders().Lock(true); });
    ASSERT_TRUE(holder.Took());
    const int watch = inotify_init1(IN_CLOEXEC);
    ASSERT_GE(inotify_add_watch(watch, Path("/tmp/fileidx_cfg_folder.lock").c_str(), IN_CLOSE_WRITE), 0);
    const pid_t tool = testkit::Start({FILEINDEXCTL, "--lock-wait", "60", "folder", "add", "/music/a"}, Path("/ctl.log"));
    // A failed attempt closes the lock file: the tool has met the held lock, so release it.
    pollfd ready{watch, POLLIN, 0};
    ASSERT_EQ(poll(&ready, 1, 20000), 1);
    holder.Release();
    int status = -1;
    ASSERT_EQ(waitpid(tool, &status, 0), tool);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0) << testkit::ReadFile(Path("/ctl.log"));
    EXPECT_TRUE(Conf().isMember("/music/a"));
    close(watch);
}

TEST_F(ToolTest, UsageErrorsExitTwoWithTheUsage) {
    for (const auto& args : std::vector<std::vector<std::string>>{{}, {"folder"}, {"folder", "get"}, {"nonsense"},
                                                                   {"share", "no-space", "music", "maybe"}}) {
        const auto result = Ctl(args);
        EXPECT_EQ(result.status, 2);
        EXPECT_EQ(result.out, "");
        EXPECT_NE(result.err.find("Usage:"), std::string::npos);
    }
}

TEST_F(ToolTest, RootOptionStandsInForTheEnvironment) {
    const std::string root = Path("");
    unsetenv("QIRA_ROOT");
    const auto result = testkit::Run({FILEINDEXCTL, "--root", root, "share", "paths", "music"});
    setenv("QIRA_ROOT", root.c_str(), 1);
    ASSERT_EQ(result.status, 0) << result.err;
    EXPECT_NE(result.out.find(QueueOf("music")), std::string::npos);
}

TEST_F(ToolTest, ServiceStatusShowsPauseAndFlags) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    testkit::WriteFile(StatusConf(), R"({"resume_time": 0, "no_space": {"music": true}})");
    const auto result = Ctl({"--json", "service", "status"});
    ASSERT_EQ(result.status, 0) << result.err;
    EXPECT_EQ(testkit::ParseJson(result.out),
              J(R"({"status": "finished", "resume_time": 0, "pause": "paused until resumed",
                    "no_space": ["music"], "need_reindex": []})"));
}

class DaemonStandInTest : public testkit::IndexFixture {
protected:
    void StartDaemon() {
        daemon_.reset();
        log_ = Path("/daemon.log");
        pid_ = testkit::Start({FILEINDEXD_REF, "--interval", "5"}, log_);
        ASSERT_TRUE(testkit::WaitFor([this] { return testkit::Exists(Path("/var/run/fileindexd.sock")); }));
    }
    void TearDown() override {
        if (pid_ > 0) {
            EXPECT_EQ(testkit::Stop(pid_), 0);
        }
        IndexFixture::TearDown();
    }
    std::string log_;
    pid_t pid_ = -1;
};

TEST_F(DaemonStandInTest, FolderIsProcessingUntilTheDaemonDrainsIt) {
    testkit::WriteFile(music_ + "/a/song.mp3", "");
    ASSERT_TRUE(IndexMgr::Upsert(J(R"([{"path": "/music/a", "audio": true}])")));
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "processing");
    StartDaemon();
    ASSERT_TRUE(testkit::WaitFor([] { return StatusMgr::GetFolderStatus("/music/a") == "finished"; }));
    std::string word;
    ASSERT_TRUE(StatusMgr::GetStatus(word));
    EXPECT_EQ(word, "finished");
    EXPECT_NE(testkit::ReadFile(log_).find("event 131072 " + music_ + "/a: documents=0 audio=1"), std::string::npos);
}

TEST_F(DaemonStandInTest, PauseHoldsWorkBack) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    StartDaemon();
    ASSERT_TRUE(StatusMgr::Pause(0));
    ASSERT_TRUE(IndexMgr::Reindex(J(R"(["/music/a"])")));
    for (int i = 0; i < 20; ++i) {
        usleep(2000);
        EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "paused");
    }
    ASSERT_TRUE(StatusMgr::Resume());
    EXPECT_TRUE(testkit::WaitFor([] { return StatusMgr::GetFolderStatus("/music/a") == "finished"; }));
}

TEST_F(DaemonStandInTest, RecordsAppendedWhileTheDaemonDrainsAreNotLost) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    StartDaemon();
    constexpr int kEvents = 300;
    int report[2];
    ASSERT_EQ(pipe(report), 0);
    const pid_t writer = fork();
    if (writer == 0) {
        LOG_LEVEL = 7;
        testkit::ClearLog();
        int failed = 0;
        for (int i = 0; i < kEvents; ++i) {
            if (!AddCustomEvent(kEventFolderSettingChanged, music_ + "/a/f" + std::to_string(i), J("{}"))) ++failed;
        }
        int dropped = failed * 1000;
        for (const auto& line : testkit::LogLines()) {
            if (line.message.rfind("try lock too many times", 0) == 0) ++dropped;
        }
        _exit(write(report[1], &dropped, sizeof dropped) == sizeof dropped ? 0 : 1);
    }
    int dropped = -1;
    ASSERT_EQ(read(report[0], &dropped, sizeof dropped), static_cast<ssize_t>(sizeof dropped));
    waitpid(writer, nullptr, 0);
    ASSERT_TRUE(testkit::WaitFor([this] {
        return !testkit::Exists(QueueOf("music")) && !testkit::Exists(QueueOf("music") + ".tmp");
    }));
    const std::string log = testkit::ReadFile(log_);
    size_t processed = 0;
    for (size_t at = 0; (at = log.find("event 131072", at)) != std::string::npos; ++at) ++processed;
    EXPECT_LT(dropped, 1000) << "an event failed and marked the share";
    EXPECT_EQ(processed + static_cast<size_t>(dropped), static_cast<size_t>(kEvents));
}

}  // namespace
