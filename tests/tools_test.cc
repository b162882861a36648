// The command-line tool's contract and the reference daemon stand-in working with the library.
#include "testkit.h"

#include <poll.h>
#include <sys/inotify.h>

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
    // Global options are taken after the command as well.
    result = Ctl({"folder", "list", "--additional", "status,is_valid", "--sort", "name", "--desc", "--json"});
    ASSERT_EQ(result.status, 0);
    const auto listing = testkit::ParseJson(result.out)["result"];
    EXPECT_EQ(listing["total"].asInt(), 2);
    EXPECT_EQ(listing["folder"][0], J(R"({"path": "/music/b", "name": "Songs", "document": false, "audio": true,
                                         "video": false, "photo": false,
                                         "additional": {"status": "processing", "is_valid": true}})"));
    result = Ctl({"--json", "folder", "get", "/music/a"});
    EXPECT_EQ(testkit::ParseJson(result.out)["result"]["name"].asString(), "Songs");
}

TEST_F(ToolTest, RequestsComeFromStandardInput) {
    const auto result = Ctl({"folder", "set", "--request", "-"}, R"([{"path": "/photo/a", "photo": true}])");
    ASSERT_EQ(result.status, 0) << result.err;
    EXPECT_TRUE(Conf()["/photo/a"]["photo"].asBool());
}

// 0 yes, 1 no, 2 when the answer could not be worked out.
TEST_F(ToolTest, QuestionsAnswerByExitStatus) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    const std::vector<std::pair<std::vector<std::string>, int>> cases = {
        {{"is", "path-indexed", "/music/a/x"}, 0},     {{"is", "path-indexed", "/music/b"}, 1},
        {{"is", "share-indexed", "music"}, 0},         {{"is", "share-indexed", "photo"}, 1},
        {{"is", "contains-indexed", "/music"}, 0},     {{"is", "full-path-indexed", music_ + "/a"}, 0},
        {{"is", "indexable", "/music/a"}, 0},          {{"is", "indexable", "/music/none"}, 1},
        {{"is", "indexable", "/nosuch/a"}, 2},         {{"is", "skipped", music_ + "/.DS_Store"}, 0},
        {{"is", "roomy", "music"}, 0},                 {{"is", "roomy", "nosuch"}, 2},
    };
    for (const auto& [args, status] : cases) {
        SCOPED_TRACE(args[1] + " " + args[2]);
        EXPECT_EQ(Ctl(args).status, status);
    }
    testkit::WriteFile(FolderConf(), "{broken");
    const auto result = Ctl({"is", "path-indexed", "/music/a"});
    EXPECT_EQ(result.status, 2);
    EXPECT_EQ(result.err.rfind("fileindexctl: is path-indexed failed: FILEINDEX_ERR_LOAD_JSON (6)", 0), 0u) << result.err;
}

std::vector<std::string> Lines(const std::string& text) {
    std::vector<std::string> lines;
    std::istringstream in(text);
    for (std::string line; std::getline(in, line);) lines.push_back(line);
    return lines;
}

// The error code of the operation, the library's log lines and what was saved before the failure.
TEST_F(ToolTest, FailuresTellTheirCauseOnStderr) {
    Folders holder;
    ASSERT_TRUE(holder.Lock(true));
    auto result = Ctl({"--lock-wait", "0", "folder", "delete", "/music/a"});
    holder.Unlock();
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.out, "");
    auto lines = Lines(result.err);
    ASSERT_EQ(lines.size(), 2u) << result.err;
    EXPECT_EQ(lines[0], "fileindexctl: folder delete failed: FILEINDEX_ERR_LOCK (9): the configuration lock is held "
                        "by another process; try again");
    EXPECT_EQ(lines[1].rfind("fileindexctl: log: config.cc:", 0), 0u);
    EXPECT_NE(lines[1].find(" Failed to lock folder"), std::string::npos);

    qira_sim::InjectFault("QLIBServiceStart", 0x1234);
    result = Ctl({"folder", "add", "/music/a"});
    lines = Lines(result.err);
    ASSERT_EQ(lines.size(), 3u) << result.err;
    EXPECT_EQ(lines[0], "fileindexctl: folder add failed: FILEINDEX_ERR_NONE (0): the library set no error code; the "
                        "cause is in its log");
    EXPECT_NE(lines[1].find("QLIBServiceStart failed: err=[0x1234 sim/QLIBServiceStart:1]"), std::string::npos);
    EXPECT_EQ(lines[2], "fileindexctl: " + FolderConf() +
                            " was already saved with the change; the steps after it did not all succeed");
    EXPECT_EQ(Lines(Ctl({"-q", "folder", "add", "/music/a"}).err).size(), 2u);  // no log lines

    qira_sim::ClearFaults();
    daemon_.reset();
    result = Ctl({"service", "pause"});
    EXPECT_NE(result.err.find("SendCammandToDaemon failed"), std::string::npos) << result.err;
    EXPECT_NE(result.err.find(StatusConf() + " was already saved"), std::string::npos);
    result = Ctl({"share", "paths", "nosuch"});
    EXPECT_NE(result.err.find("QIRAShareGet failed, name=nosuch"), std::string::npos) << result.err;
}

// With --json every command family prints one object of the same shape, success or failure.
TEST_F(ToolTest, JsonHasOneShapeForSuccessAndFailure) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    const std::vector<std::pair<std::vector<std::string>, bool>> cases = {
        {{"folder", "list"}, true},          {{"folder", "get", "/music/none"}, false},
        {{"folder", "add", "/music/b"}, true}, {{"reindex", "/photo/a"}, false},
        {{"service", "status"}, true},       {{"service", "pause", "--hours", "2"}, true},
        {{"share", "need-reindex", "music", "off"}, true}, {{"share", "paths", "nosuch"}, false},
        {{"is", "share-indexed", "music"}, true}, {{"migrate"}, true},
    };
    const std::vector<std::string> members = {"error", "log", "message", "ok", "result", "saved"};
    for (auto [args, ok] : cases) {
        SCOPED_TRACE(args[0] + (args.size() > 1 ? " " + args[1] : ""));
        args.push_back("--json");
        const auto result = Ctl(args);
        EXPECT_EQ(result.status == 0, ok);
        const Json::Value out = testkit::ParseJson(result.out);
        EXPECT_EQ(out.getMemberNames(), members);
        EXPECT_EQ(out["ok"].asBool(), ok);
        EXPECT_EQ(out["message"].asString().empty(), ok);
        EXPECT_EQ(out["error"]["number"].asInt() == 0, ok || args[0] == "share" || args[0] == "reindex");
    }
    const Json::Value pause = testkit::ParseJson(Ctl({"--json", "service", "status"}).out)["result"]["pause"];
    EXPECT_TRUE(pause["paused"].asBool());
    const time_t end = static_cast<time_t>(pause["resume_time"].asInt64());
    char utc[32];
    strftime(utc, sizeof utc, "%Y-%m-%dT%H:%M:%SZ", gmtime(&end));
    EXPECT_EQ(pause["resume_time_utc"].asString(), utc);
    EXPECT_EQ(testkit::ParseJson(Ctl({"--json", "is", "share-indexed", "photo"}).out)["result"],
              J(R"({"answer": false})"));
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

// All three tools: usage errors exit 2 with the usage on stderr, --version exits 0.
TEST_F(ToolTest, UsageErrorsExitTwoAndEveryToolTellsItsVersion) {
    const std::vector<std::vector<std::string>> usageErrors = {
        {FILEINDEXCTL}, {FILEINDEXCTL, "folder"}, {FILEINDEXCTL, "folder", "get"}, {FILEINDEXCTL, "nonsense"},
        {FILEINDEXCTL, "share", "no-space", "music", "maybe"}, {FILEINDEXCTL, "folder", "list", "--sort", "size"},
        {FILEINDEXCTL, "folder", "list", "--additional", "status,bogus"}, {FILEINDEXCTL, "--root", Path("/none"), "folder", "list"},
        {QIRA_SIM, "share", "add"}, {QIRA_SIM, "bogus"}, {FILEINDEXD_REF, "--interval", "0"}};
    for (const auto& args : usageErrors) {
        SCOPED_TRACE(args.back());
        const auto result = testkit::Run(args);
        EXPECT_EQ(result.status, 2);
        EXPECT_EQ(result.out, "");
        EXPECT_NE(result.err.find("Usage:"), std::string::npos);
    }
    EXPECT_NE(testkit::Run({FILEINDEXCTL, "--root", Path("/none"), "folder", "list"}).err.find("no such directory: " + Path("/none")),
              std::string::npos);
    for (const char* tool : {FILEINDEXCTL, QIRA_SIM, FILEINDEXD_REF}) {
        const auto result = testkit::Run({tool, "--version"});
        EXPECT_EQ(result.status, 0);
        EXPECT_NE(result.out.find(" 1."), std::string::npos) << result.out;
    }
}

TEST_F(ToolTest, RootOptionStandsInForTheEnvironment) {
    const std::string root = Path("");
    unsetenv("QIRA_ROOT");
    const auto result = testkit::Run({FILEINDEXCTL, "--root", root, "share", "paths", "music"});
    const auto shares = testkit::Run({QIRA_SIM, "--root", root, "--json", "share", "list"});
    setenv("QIRA_ROOT", root.c_str(), 1);
    ASSERT_EQ(result.status, 0) << result.err;
    EXPECT_NE(result.out.find(QueueOf("music")), std::string::npos);
    ASSERT_EQ(shares.status, 0) << shares.err;
    const auto envelope = testkit::ParseJson(shares.out);
    EXPECT_TRUE(envelope["ok"].asBool());
    EXPECT_EQ(envelope["result"]["music"]["path"].asString(), music_);
}

TEST_F(ToolTest, BashCompletionOffersTheSubcommands) {
    const auto complete = [](const std::string& words, int index) {
        return testkit::Run({"/bin/bash", "-c", "source " + std::string(COMPLETION) + "; COMP_WORDS=(" + words +
                                                    "); COMP_CWORD=" + std::to_string(index) +
                                                    "; _fileindexctl; echo ${COMPREPLY[*]}"}).out;
    };
    EXPECT_EQ(complete("fileindexctl sh", 1), "share\n");
    EXPECT_EQ(complete("fileindexctl share re", 2), "remove rename resume revive\n");
    EXPECT_EQ(complete("fileindexctl is ro", 2), "roomy\n");
}

TEST_F(ToolTest, ServiceStatusShowsPauseAndFlags) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    testkit::WriteFile(StatusConf(), R"({"resume_time": 0, "no_space": {"music": true}})");
    const auto result = Ctl({"--json", "service", "status"});
    ASSERT_EQ(result.status, 0) << result.err;
    EXPECT_EQ(testkit::ParseJson(result.out)["result"],
              J(R"({"status": "finished", "pause": {"paused": true, "resume_time": 0, "resume_time_utc": null},
                    "no_space": ["music"], "need_reindex": []})"));
    EXPECT_NE(Ctl({"service", "status"}).out.find("paused until resumed"), std::string::npos);
}

class DaemonStandInTest : public testkit::IndexFixture {
protected:
    void StartDaemon() {
        daemon_.reset();
        log_ = Path("/daemon.log");
        pid_ = testkit::Start({FILEINDEXD_REF, "--interval", "5"}, log_);
        // The socket file appears at bind, before the daemon listens: wait for its own word.
        ASSERT_TRUE(testkit::WaitFor([this] { return testkit::ReadFile(log_).find("listening on") != std::string::npos; }));
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

// progress --watch shows the backlog shrink as the daemon drains it; wait returns once it is done.
TEST_F(DaemonStandInTest, ProgressFollowsTheDrainAndWaitSeesTheEnd) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    StartDaemon();
    ASSERT_TRUE(StatusMgr::Pause(0));
    ASSERT_TRUE(IndexMgr::Reindex(J(R"(["/music/a", "/music/a/b"])")));
    const std::string samples = Path("/samples.log");
    const pid_t watch = testkit::Start({FILEINDEXCTL, "progress", "--watch", "--interval", "0.05"}, samples);
    const auto backlogs = [&] {
        std::vector<unsigned> seen;
        std::istringstream in(testkit::ReadFile(samples));
        for (std::string line; std::getline(in, line);) {
            seen.push_back(testkit::ParseJson(line)["shares"][0]["pending"].asUInt());
        }
        return seen;
    };
    ASSERT_TRUE(testkit::WaitFor([&] { return !backlogs().empty(); }));
    EXPECT_EQ(backlogs().front(), 2u);
    ASSERT_TRUE(StatusMgr::Resume());
    ASSERT_TRUE(testkit::WaitFor([&] { return backlogs().back() == 0; }));
    testkit::Stop(watch);
    EXPECT_EQ(testkit::Run({FILEINDEXCTL, "wait", "--timeout", "10"}).status, 0);
}

TEST_F(DaemonStandInTest, PauseHoldsWorkBack) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    StartDaemon();
    ASSERT_TRUE(StatusMgr::Pause(0));
    ASSERT_TRUE(IndexMgr::Reindex(J(R"(["/music/a"])")));
    // The daemon takes commands before each drain pass: once it has taken a second pause, sent
    // after the record was queued, it has had its pass over the queue and held the record back.
    ASSERT_TRUE(StatusMgr::Pause(0));
    const auto pauses = [this] { return testkit::CountOf(testkit::ReadFile(log_), "\"type\":\"pause\""); };
    ASSERT_TRUE(testkit::WaitFor([&] { return pauses() == 2; }));
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "paused");
    EXPECT_TRUE(testkit::Exists(QueueOf("music")));
    ASSERT_TRUE(StatusMgr::Resume());
    EXPECT_TRUE(testkit::WaitFor([] { return StatusMgr::GetFolderStatus("/music/a") == "finished"; }));
}

TEST_F(DaemonStandInTest, RecordsAppendedWhileTheDaemonDrainsAreNotLost) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    StartDaemon();
    constexpr int kEvents = 300;
    const pid_t writer = fork();
    if (writer == 0) {
        int failed = 0;
        for (int i = 0; i < kEvents; ++i) {
            if (!AddCustomEvent(kEventFolderSettingChanged, music_ + "/a/f" + std::to_string(i), J("{}"))) ++failed;
        }
        _exit(failed);
    }
    int status = -1;
    ASSERT_EQ(waitpid(writer, &status, 0), writer);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0) << "an event failed and marked the share";
    ASSERT_TRUE(testkit::WaitFor([this] {
        return !testkit::Exists(QueueOf("music")) && !testkit::Exists(QueueOf("music") + ".tmp");
    }));
    EXPECT_EQ(testkit::CountOf(testkit::ReadFile(log_), "event 131072"), static_cast<size_t>(kEvents));
}

}  // namespace
