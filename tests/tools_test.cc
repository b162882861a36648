// The command-line tool's contract and the reference daemon stand-in working with the library.
#include "testkit.h"

#include "banner.h"
#include "daemon_progress.h"
#include "pending_rate.h"
#include "time_text.h"
#include "share_indexer.h"

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
    // A change sets what it names and keeps the other switches.
    ASSERT_EQ(Ctl({"folder", "set", "/music/a", "--name", "Other"}).status, 0);
    result = Ctl({"--json", "folder", "get", "/music/a"});
    EXPECT_EQ(testkit::ParseJson(result.out)["result"],
              J(R"({"path": "/music/a", "name": "Other", "document": false, "audio": true, "video": false, "photo": false})"));
}

// A request comes from standard input; --root stands in for the environment, in both tools.
TEST_F(ToolTest, RequestsComeFromStandardInputAndTheRootFromTheOption) {
    const std::string root = Path("");
    unsetenv("QIRA_ROOT");
    const auto result = Ctl({"--root", root, "folder", "set", "--request", "-"}, "[{\"path\": \"/photo/a\",\n  \"photo\": true}]\n");
    const auto shares = testkit::Run({QIRA_SIM, "--root", root, "--json", "share", "list"});
    setenv("QIRA_ROOT", root.c_str(), 1);
    ASSERT_EQ(result.status, 0) << result.err;
    EXPECT_TRUE(Conf()["/photo/a"]["photo"].asBool());
    ASSERT_EQ(shares.status, 0) << shares.err;
    EXPECT_TRUE(testkit::ParseJson(shares.out)["ok"].asBool());
    EXPECT_EQ(testkit::ParseJson(shares.out)["result"]["music"]["path"].asString(), music_);
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
        {{"is", "roomy", "music"}, 0},
        {{"is", "share-indexed", "nosuch"}, 2},        {{"is", "path-indexed", "/nosuch/a"}, 2},
    };
    for (const auto& [args, status] : cases) {
        SCOPED_TRACE(testing::PrintToString(args));
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

// Every failure names its cause, never the code of success: the library's error code, or the step
// that failed. A change saved before a later step failed exits 4 and says so. The text on stderr
// is the JSON answer's message; the library's log lines carry their source only under -v.
TEST_F(ToolTest, EveryFailureNamesItsCauseInTextAndJsonAlike) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    using Guard = std::shared_ptr<void>;
    struct Case {
        std::vector<std::string> args;
        int status;
        std::string error;
        std::string message;
        std::function<Guard()> before;
    };
    const auto fault = [](const char* op, int err) {
        return [op, err] {
            qira_sim::InjectFault(op, err);
            return Guard(nullptr, [](void*) { qira_sim::ClearFaults(); });
        };
    };
    const auto lockHeld = [] { return std::make_shared<testkit::ChildHolding>([] { return Folders().Lock(true); }); };
    const auto daemonDown = [this] {
        daemon_.reset();
        return Guard();
    };
    const std::string noDaemon = "the indexing daemon does not answer at " + DaemonSocketPath() + " (No such file or directory)";
    const std::vector<Case> cases = {
        {{"folder", "get", "/music/none"}, 1, "FILEINDEX_ERR_NO_SUCH_FOLDER",
         "folder get failed: FILEINDEX_ERR_NO_SUCH_FOLDER (4): no indexed folder has that path", nullptr},
        {{"--lock-wait", "0", "folder", "delete", "/music/a"}, 1, "FILEINDEX_ERR_LOCK",
         "folder delete failed: FILEINDEX_ERR_LOCK (9): the configuration lock is held by another process; try again", lockHeld},
        {{"folder", "add", "music/b"}, 1, "BAD_PATH",
         "folder add failed: BAD_PATH: \"music/b\" is no share path: it begins with \"/\" and a share's name, e.g. /music/live", nullptr},
        {{"folder", "add", "/music/b/"}, 1, "BAD_PATH", "folder add failed: BAD_PATH: drop the trailing \"/\": /music/b", nullptr},
        {{"folder", "add", "/music/../b"}, 1, "BAD_PATH",
         "folder add failed: BAD_PATH: \"/music/../b\" has an empty, \".\" or \"..\" component; give the folder's own path", nullptr},
        {{"folder", "add", music_ + "/b"}, 1, "BAD_PATH",
         "folder add failed: BAD_PATH: " + music_ + "/b is a full path on the volume; give the share path /music/b", nullptr},
        {{"folder", "add", "/outside/x"}, 1, "SHARE_UNKNOWN", "folder add failed: SHARE_UNKNOWN: no share is named \"outside\"", nullptr},
        {{"reindex", "/photo/a"}, 1, "SHARE_NOT_INDEXED", "reindex failed: SHARE_NOT_INDEXED: share \"photo\" holds no indexed folder", nullptr},
        {{"is", "roomy", "nosuch"}, 2, "SHARE_UNKNOWN", "is roomy failed: SHARE_UNKNOWN: no share is named \"nosuch\"", nullptr},
        {{"share", "paths", "nosuch"}, 1, "SHARE_UNKNOWN", "share paths failed: SHARE_UNKNOWN: no share is named \"nosuch\"", nullptr},
        {{"explain", "/outside/x"}, 1, "SHARE_UNKNOWN", "explain failed: SHARE_UNKNOWN: no share is named \"outside\"", nullptr},
        {{"folder", "add", "/music/b"}, 4, "PLATFORM_CALL_FAILED",
         "folder add: saved; not applied: PLATFORM_CALL_FAILED: the platform call QLIBServiceStart failed with error 0x1234",
         fault("QLIBServiceStart", 0x1234)},
        {{"folder", "add", "/music/c"}, 4, "NOTIFIER_REFUSED",
         "folder add: saved; not applied: NOTIFIER_REFUSED: the notification daemon refused the change of what it watches",
         fault("MonitorQueue::Upsert", 0x0500)},
        {{"folder"}, 2, "USAGE", "A subcommand is required", nullptr},
        {{"service", "pause"}, 4, "DAEMON_UNREACHABLE", "service pause: saved; not applied: DAEMON_UNREACHABLE: " + noDaemon,
         daemonDown},
        {{"wait", "--timeout", "60"}, 2, "DAEMON_UNREACHABLE",
         "wait failed: DAEMON_UNREACHABLE: folders are indexed and the indexing daemon does not answer at " + DaemonSocketPath() +
             " (No such file or directory)",
         daemonDown},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.message);
        const Guard guard = c.before ? c.before() : Guard();
        std::vector<std::string> args = c.args;
        args.push_back("--json");
        const auto json = Ctl(args);
        const auto text = Ctl(c.args);
        EXPECT_EQ(json.status, c.status);
        EXPECT_EQ(text.status, c.status);
        const Json::Value answer = testkit::ParseJson(json.out);
        EXPECT_FALSE(answer["ok"].asBool());
        EXPECT_EQ(answer["error"]["name"].asString(), c.error);
        EXPECT_EQ(answer["message"].asString(), c.message);
        EXPECT_EQ(answer["saved"].empty(), c.status != 4);
        EXPECT_EQ(text.out, "");
        EXPECT_EQ(Lines(text.err).at(0), "fileindexctl: " + c.message);
        EXPECT_EQ(text.err.find(".cc:"), std::string::npos) << text.err;
        EXPECT_EQ(testkit::CountOf(text.err, "was saved with the change"), c.status == 4 ? 1u : 0u);
    }
    const auto verbose = Ctl({"-v", "service", "resume"});
    EXPECT_NE(verbose.err.find("fileindexctl: log: status_mgr.cc:"), std::string::npos) << verbose.err;
    EXPECT_EQ(Ctl({"-q", "service", "resume"}).err.find("log:"), std::string::npos);
}

// With --json every command family prints one object of the same shape; a success carries no
// log lines, even when the library logged some on the way (here a folder whose directory is gone).
TEST_F(ToolTest, JsonHasOneShapeAndSuccessCarriesNoLog) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}, "/music/gone": {}})");
    const std::vector<std::vector<std::string>> commands = {
        {"folder", "list", "--additional", "status"}, {"folder", "add", "/music/b"}, {"service", "status"},
        {"service", "pause", "--hours", "2"}, {"share", "need-reindex", "music", "off"}, {"is", "share-indexed", "music"},
        {"migrate"}, {"progress", "--interval", "0.05"}, {"explain", "/music/gone"}};
    const std::vector<std::string> members = {"error", "log", "message", "ok", "result", "saved"};
    for (auto args : commands) {
        SCOPED_TRACE(testing::PrintToString(args));
        args.push_back("--json");
        const auto result = Ctl(args);
        EXPECT_EQ(result.status, 0) << result.out;
        const Json::Value out = testkit::ParseJson(result.out);
        EXPECT_EQ(out.getMemberNames(), members);
        EXPECT_EQ(out["error"], J(R"({"name": "FILEINDEX_ERR_NONE", "number": 0})"));
        EXPECT_EQ(out["log"], J("[]"));
        EXPECT_EQ(out["saved"], J("[]"));
    }
    for (const auto& args : std::vector<std::vector<std::string>>{{"service", "status"}, {"progress", "--interval", "0.05"}}) {
        auto withJson = args;
        withJson.push_back("--json");
        const Json::Value pause = testkit::ParseJson(Ctl(withJson).out)["result"]["pause"];
        EXPECT_TRUE(pause["paused"].asBool());
        const time_t end = static_cast<time_t>(pause["resume_time"].asInt64());
        char utc[32];
        strftime(utc, sizeof utc, "%Y-%m-%dT%H:%M:%SZ", gmtime(&end));
        EXPECT_EQ(pause["resume_time_utc"].asString(), utc);
    }
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
        {{"service", "pause", "--hours", "-4294967295"}, "hours must be a whole number, 0 or more"},
        {{"service", "pause", "--hours", "4294967297"}, "a pause of 4294967297 hours would end after 2038-01-19 03:14:07 UTC"},
    };
    for (const auto& [args, message] : cases) {
        SCOPED_TRACE(testing::PrintToString(args));
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
    testkit::OpenWatch watch({Path("/tmp/fileidx_cfg_folder.lock")}, IN_CLOSE_WRITE);
    const pid_t tool = testkit::Start({FILEINDEXCTL, "--lock-wait", "60", "folder", "add", "/music/a"}, Path("/ctl.log"));
    // A failed attempt closes the lock file: the tool has met the held lock, so release it.
    ASSERT_TRUE(testkit::WaitFor([&] { return !watch.Opened().empty(); }));
    holder.Release();
    int status = -1;
    ASSERT_EQ(waitpid(tool, &status, 0), tool);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0) << testkit::ReadFile(Path("/ctl.log"));
    EXPECT_TRUE(Conf().isMember("/music/a"));
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
    const auto json = testkit::Run({FILEINDEXCTL, "folder", "list", "--sort", "size", "--json"});
    EXPECT_EQ(testkit::ParseJson(json.out)["error"]["name"].asString(), "USAGE");
    for (const char* tool : {FILEINDEXCTL, QIRA_SIM, FILEINDEXD_REF}) {
        const auto result = testkit::Run({tool, "--version"});
        EXPECT_EQ(result.status, 0);
        EXPECT_NE(result.out.find(" 1."), std::string::npos) << result.out;
    }
}

TEST_F(ToolTest, BashCompletionOffersCommandsOptionsAndIndexedFolders) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}, "/music/b": {}, "/photo/a": {}})");
    const std::string tools = std::string(FILEINDEXCTL).substr(0, std::string(FILEINDEXCTL).rfind('/'));
    const auto complete = [&](const std::string& words, int index) {
        return testkit::Run({"/bin/bash", "-c", "PATH=" + tools + ":$PATH; source " + std::string(COMPLETION) +
                                                    "; COMP_WORDS=(" + words + "); COMP_CWORD=" + std::to_string(index) +
                                                    "; _fileindexctl; echo ${COMPREPLY[*]}"}).out;
    };
    const std::vector<std::tuple<std::string, int, std::string>> cases = {
        {"fileindexctl sh", 1, "share\n"},
        {"fileindexctl st", 1, "status\n"},
        {"fileindexctl search --o", 2, "--offset\n"},
        {"fileindexctl search --sort d", 3, "date\n"},
        {"fileindexctl share re", 2, "remove rename resume revive\n"},
        {"fileindexctl share revive m", 3, "music\n"},
        {"fileindexctl is ro", 2, "roomy\n"},
        {"fileindexctl folder list ''", 3, "\n"},  // no subcommand again
        {"fileindexctl folder list --d", 3, "--desc\n"},
        {"fileindexctl --root /x folder list --l", 5, "--limit --lock-wait\n"},
        {"fileindexctl folder delete /music/", 3, "/music/a /music/b\n"},
        {"fileindexctl explain /p", 2, "/photo/a\n"},
        {"fileindexctl progress --", 2, "--watch --interval --samples --root --json --quiet --verbose --lock-wait --help --version\n"},
    };
    for (const auto& [words, index, offered] : cases) {
        SCOPED_TRACE(words);
        EXPECT_EQ(complete(words, index), offered);
    }
}

TEST_F(ToolTest, ServiceStatusShowsPauseAndFlags) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    testkit::WriteFile(StatusConf(), R"({"resume_time": 0, "no_space": {"music": true}})");
    const auto result = Ctl({"--json", "service", "status"});
    ASSERT_EQ(result.status, 0) << result.err;
    EXPECT_EQ(testkit::ParseJson(result.out)["result"],
              J(R"({"status": "finished", "pause": {"paused": true, "resume_time": 0, "resume_time_utc": null},
                    "banner": {"state": "paused", "text": "Paused until resumed", "files_indexed": 0, "pending": 0,
                               "resume_time": null, "rate": null, "seconds_left": null},
                    "daemon": {"socket": ")" + DaemonSocketPath() + R"(", "answers": true, "reason": null},
                    "watched": [{"share": "music", "queue": ")" + QueueOf("music") + R"(", "folders": [")" + music_ + R"(/a"]}],
                    "no_space": ["music"], "need_reindex": []})"));
    const auto text = Ctl({"service", "status"}).out;
    EXPECT_EQ(text.rfind("indexing          Paused until resumed\n", 0), 0u) << text;
    EXPECT_EQ(Ctl({"status"}).out, text);
    EXPECT_NE(text.find("pause             paused until resumed"), std::string::npos) << text;
    EXPECT_NE(text.find("daemon            answers at " + DaemonSocketPath()), std::string::npos);
    EXPECT_NE(text.find("watched in music  " + music_ + "/a"), std::string::npos);
    daemon_.reset();
    EXPECT_NE(Ctl({"service", "status"}).out.find("does not answer at " + DaemonSocketPath() + " (No such file or directory)"),
              std::string::npos);
}

// The banner names what matters most first: no folder, a silent daemon, a pause, work left (with
// a rate only once one was measured), what else keeps indexing from being done, then up to date.
TEST(BannerTest, OneSentenceInOrderOfWhatMattersMost) {
    const long long inAnHour = time(nullptr) + 3600;
    using tools::BannerFacts;
    const std::vector<std::tuple<BannerFacts, std::string, std::string>> cases = {
        {{"finished", -1, true, 0, 0, "", 0, 0}, "no_folders", "No folder is indexed yet"},
        {{"processing", 0, false, 1, 3, "", 9, 0}, "daemon_down",
         "The indexing daemon does not answer: 3 changes wait and a search may miss recent changes. Start the fileindexd service"},
        {{"paused", 0, true, 1, 1, "", 9, 0}, "paused", "Paused until resumed; 1 change waits"},
        {{"paused", inAnHour, true, 1, 0, "", 9, 0}, "paused", "Paused until " + tools::FormatUtc(inAnHour) + " (1 h left)"},
        {{"processing", 1, true, 1, 40, "", 9, 0}, "working", "40 changes left to index, time left unknown"},
        {{"processing", -1, true, 1, 40, "", 9, 2}, "working", "40 changes left to index, 2.0 per second, about 20 s left"},
        {{"finished", -1, true, 1, 0, "share music waits for a full reindex", 9, 0}, "working", "share music waits for a full reindex"},
        {{"finished", -1, true, 1, 0, "", 1, 0}, "up_to_date", "Up to date: 1 file indexed"},
        {{"finished", -1, true, 1, 0, "", Json::Value(), 0}, "up_to_date", "Up to date"},
    };
    for (const auto& [facts, state, text] : cases) {
        const Json::Value banner = tools::Banner(facts);
        EXPECT_EQ(banner["state"].asString() + ": " + banner["text"].asString(), state + ": " + text);
        EXPECT_EQ(banner["resume_time"].isNull(), state != "paused" || facts.resumeTime <= 0) << text;
        EXPECT_EQ(banner["seconds_left"], facts.rate > 0 ? Json::Value(20) : Json::Value()) << text;
    }
    // The files pending less those the daemon applied of the batch it took, never below none.
    EXPECT_EQ(tools::PendingOf(J(R"({"shares": [{"share": "music", "pending": 20, "files": 10}, {"share": "photo", "files": 5}]})"),
                               J(R"({"shares": {"music": {"applied": 8, "applied_files": 4}, "photo": {"applied_files": 9}}})")),
              6u);
    for (const auto& [seconds, words] : std::vector<std::pair<long long, std::string>>{
             {0, "0 s"}, {59, "59 s"}, {60, "1 min"}, {61, "2 min"}, {3600, "1 h"}, {3661, "1 h 2 min"}}) {
        EXPECT_EQ(tools::DurationText(seconds), words);
    }
}

// Files left per share and folder are what the report counts less what the daemon published as
// applied; a folder is up to date since its own date, or else its share's.
TEST(BannerTest, WhatTheDaemonPublishedIsTakenFromTheFilesPending) {
    const Json::Value published = J(R"({"shares": {"music": {"applied": 7, "applied_files": 4, "up_to_date": 100,
        "folders": {"/music/a": {"applied_files": 3, "up_to_date": 50}, "/music/b": {"applied_files": 9}}}}})");
    const std::vector<std::tuple<std::string, Json::Value, std::string>> cases = {
        {R"({"share": "music", "files": 10, "folders": [{"path": "/music/a", "files": 5}, {"path": "/music/b", "files": 2},
            {"path": "/music/c", "files": 1}]})", published,
         R"({"applied": 7, "files_left": 6, "up_to_date": 100, "folders": [{"files_left": 2, "up_to_date": 50},
            {"files_left": 0, "up_to_date": 100}, {"files_left": 1, "up_to_date": 100}]})"},
        {R"({"share": "photo", "files": 3, "folders": [{"path": "/photo/a", "files": 3}]})", published,
         R"({"applied": 0, "files_left": 3, "up_to_date": null, "folders": [{"files_left": 3, "up_to_date": null}]})"},
        {R"({"share": "music", "files": 2, "folders": []})", Json::Value(), R"({"applied": 0, "files_left": 2, "up_to_date": null, "folders": []})"},
    };
    for (const auto& [report, daemon, expected] : cases) {
        Json::Value share = J(report);
        tools::AddDaemonProgress(share, daemon);
        for (auto& folder : share["folders"]) {
            folder.removeMember("path");
            folder.removeMember("files");
        }
        share.removeMember("share");
        share.removeMember("files");
        EXPECT_EQ(share, J(expected)) << report;
    }
}

// The drain rate is measured over a minute of samples, from a second on, and new work restarts it.
TEST(BannerTest, TheDrainRateFollowsTheSamples) {
    tools::PendingRate rate;
    const auto start = tools::PendingRate::Clock::now();
    const auto at = [&](double seconds) { return start + std::chrono::milliseconds(static_cast<long long>(seconds * 1000)); };
    const std::vector<std::tuple<double, unsigned long long, double>> samples = {
        {0, 100, 0}, {0.5, 90, 0}, {2, 80, 10}, {3, 120, 0}, {4, 110, 10}, {5, 115, 0}, {7, 95, 10}, {67, 35, 1}, {127, 5, 0.5}};
    for (const auto& [seconds, pending, expected] : samples) EXPECT_DOUBLE_EQ(rate.Update(pending, at(seconds)), expected) << seconds;
}

// A folder that cannot be indexed says why, in the listing, in its status and when it is added.
TEST_F(ToolTest, ListingAndExplainTellWhyAFolderIsNotIndexable) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}, "/music/b": {}, "/music/c": {}, "/photo/a": {}, "/music/gone": {}})");
    const auto listed = Lines(Ctl({"folder", "list", "--additional", "status"}).out);
    EXPECT_EQ(listed.at(3), "/music/c           no        no     no     no     finished");
    EXPECT_EQ(listed.at(4), "/music/gone        no        no     no     no     not indexable: canonical_path");
    EXPECT_EQ(Ctl({"folder", "status", "/music/gone"}).out, "not indexable: canonical_path\n");
    EXPECT_EQ(testkit::ParseJson(Ctl({"--json", "folder", "status", "/music/a"}).out)["result"],
              J(R"({"path": "/music/a", "status": "finished", "indexable": true})"));
    const auto added = Ctl({"folder", "add", "/music/ghost"});
    EXPECT_EQ(added.status, 0);
    EXPECT_EQ(added.err, "fileindexctl: warning: /music/ghost cannot be indexed now: the directory does not exist "
                         "(canonical_path); it stays listed as not valid until that changes\n");
    // explain names the first problem in words, and a folder without a name is called so.
    testkit::WriteFile(FolderConf(), R"({"/music/gone": {}})");
    const auto explain = Ctl({"explain", "/music/gone"}).out;
    EXPECT_EQ(explain.rfind("/music/gone: not indexed: nothing is at that path (refused by canonical_path)\n", 0), 0u)
        << explain;
    EXPECT_NE(explain.find("governing folder: /music/gone (unnamed; document no, audio no, video no, photo no)"),
              std::string::npos);
}

// Explain answers for one file whether it is in the index and, if not, the first thing that keeps
// it out, in the order a user would look; the service state is the real one.
TEST_F(ToolTest, ExplainTellsWhetherAFileIsInTheIndexAndWhatKeepsItOut) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {"audio": true}, "/photo/a": {"photo": true}})");
    for (const char* file : {"/a/song.mp3", "/a/notes.txt", "/a/x.bak", "/b/y.mp3"}) testkit::WriteFile(music_ + file, "x");
    testkit::WriteFile(photo_ + "/a/p.jpg", "x");
    std::vector<Folder> folders;
    ASSERT_TRUE(IndexMgr::List(folders));
    volatile sig_atomic_t stop = 0;
    fileindexd_ref::ExtractorClient extractor({FILEINDEX_EXTRACTOR, {}, std::chrono::seconds(30)});
    ASSERT_TRUE(fileindexd_ref::ShareIndexer("music", &stop, extractor).Reindex(folders));
    testkit::WriteFile(music_ + "/a/new.mp3", "x");  // after the walk
    const std::vector<std::tuple<std::string, std::function<void()>, std::string>> cases = {
        {"/music/a/song.mp3", [] {}, "in the index"},
        {"/music/a", [] {}, "in the index"},
        {"/music/a/notes.txt", [] {}, "not indexed: folder /music/a does not index document files"},
        {"/music/a/x.bak", [] {}, "not indexed: its name is of no type the index keeps"},
        {"/music/b/y.mp3", [] {}, "not indexed: no indexed folder holds it"},
        {"/music/#recycle/z.mp3", [] {}, "not indexed: the path lies in the share's recycle bin"},
        {"/music/a/new.mp3", [] {}, "not in the index yet: the indexing daemon has not reached it"},
        {"/music/a/gone.mp3", [] {}, "not indexed: nothing is at that path"},
        {"/photo/a/p.jpg", [] {}, "not in the index yet: the indexing daemon has not reached it"},  // no index yet
        {"/music/a/new.mp3", [this] { testkit::AppendFile(QueueOf("music"), "{\"event\":2,\"path\":\"" + music_ + "/a/new.mp3\"}\n"); },
         "not in the index yet: 1 change waiting"},
        {"/music/a/new.mp3", [this] { testkit::WriteFile(StatusConf(), R"({"resume_time": 1})"); },  // a pause long over
         "not in the index yet: 1 change waiting"},
        {"/music/a/new.mp3", [] { ASSERT_TRUE(StatusMgr::Pause(0)); }, "not in the index yet: indexing is paused with 1 change waiting"},
        {"/music/a/new.mp3", [this] { ASSERT_TRUE(StatusMgr::Resume()); daemon_.reset(); },
         "not in the index yet: the indexing daemon does not answer"},
    };
    for (const auto& [path, before, verdict] : cases) {
        SCOPED_TRACE(path + ": " + verdict);
        before();
        const Json::Value e = testkit::ParseJson(Ctl({"--json", "explain", path}).out)["result"];
        EXPECT_EQ(e["verdict"].asString(), verdict);
        EXPECT_EQ(e["service"]["daemon_answers"].asBool(), daemon_ != nullptr);
    }
    ASSERT_EQ(symlink((music_ + "/a/song.mp3").c_str(), (music_ + "/a/link.mp3").c_str()), 0);
    EXPECT_EQ(testkit::ParseJson(Ctl({"--json", "explain", "/music/a/link.mp3"}).out)["result"]["file"]["kind"], "other");
    const Json::Value folder = testkit::ParseJson(Ctl({"--json", "explain", "/music/a"}).out)["result"];
    EXPECT_EQ(folder["file"], J(R"({"kind": "directory", "type": null, "type_switched_on": null, "in_index": true,
                                     "indexed_files": 1, "index_problem": null, "fields": null, "extraction_problem": null})"));
    EXPECT_EQ(folder["service"], J(R"({"status": "processing", "paused": false, "daemon_answers": false})"));
    const std::string text = Ctl({"explain", "/music/a/notes.txt"}).out;
    EXPECT_EQ(text.rfind("/music/a/notes.txt: not indexed: folder /music/a does not index document files\n", 0), 0u) << text;
    EXPECT_NE(text.find("the file: type document (switched off); in the index: no\n"), std::string::npos) << text;
    EXPECT_NE(text.find("12 more rules passed or were not needed (--rules shows them)"), std::string::npos) << text;
    EXPECT_EQ(testkit::CountOf(Ctl({"explain", "--rules", "/music/a/notes.txt"}).out, "\npass "), 12u);
    // The listing counts each folder's files in the index, none where a share has no index yet.
    const Json::Value listing = testkit::ParseJson(Ctl({"--json", "folder", "list", "--additional", "indexed_files"}).out)["result"];
    EXPECT_EQ(listing["folder"][0]["additional"], J(R"({"indexed_files": 1})"));
    EXPECT_EQ(listing["folder"][1]["additional"], J(R"({"indexed_files": 0})"));
    EXPECT_NE(Ctl({"folder", "list", "--additional", "indexed_files"}).out.find("  FILES\n"), std::string::npos);
}

// What the daemon published is read only from a regular file of at most 1 MiB reached without a
// link, and only as objects, so that a damaged file shows nothing wrong.
TEST_F(ToolTest, ThePublishedProgressIsReadOnlyWhereAndAsItIsWritten) {
    const std::string file = tools::DaemonProgressPath();
    const std::string published =
        R"({"shares": {"music": {"applied": 3, "folders": {"/music/a": 5, "/music/b": {"applied_files": 1}}}, "photo": 7}})";
    const Json::Value read = J(R"({"shares": {"music": {"applied": 3, "folders": {"/music/b": {"applied_files": 1}}}}})");
    const std::string padded = published + std::string((1 << 20) - published.size(), ' ');
    const std::vector<std::tuple<std::string, std::function<void()>, Json::Value>> cases = {
        {"as written", [&] { testkit::WriteFile(file, published); }, read},
        {"1 MiB", [&] { testkit::WriteFile(file, padded); }, read},
        {"1 MiB and a byte", [&] { testkit::WriteFile(file, padded + " "); }, Json::Value()},
        {"a link", [&] { testkit::WriteFile(file + ".real", published); ASSERT_EQ(symlink((file + ".real").c_str(), file.c_str()), 0); }, Json::Value()},
        {"a FIFO", [&] { ASSERT_EQ(mkfifo(file.c_str(), 0600), 0); }, Json::Value()},
        {"no shares object", [&] { testkit::WriteFile(file, R"({"shares": []})"); }, Json::Value()},
    };
    for (const auto& [what, make, expected] : cases) {
        unlink(file.c_str());
        make();
        EXPECT_EQ(tools::ReadDaemonProgress(), expected) << what;
    }
}

// wait ends when indexing is finished, or at its time-out with 3 while work is pending; progress
// --watch writes JSON lines off a terminal and bars on one.
TEST_F(ToolTest, WaitAndWatchFollowThePendingWork) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}, "/photo/a": {}})");
    MakeDir(music_ + "/@eaDir");
    testkit::WriteFile(QueueOf("music"), "{\"event\":1,\"path\":\"" + music_ + "/a/x\"}\n");
    // Since when a share is up to date is shown only when nothing is left of it.
    ASSERT_TRUE(tools::WriteDaemonProgress(J(R"({"shares": {"music": {"up_to_date": 1700000000},
                                                            "photo": {"up_to_date": 1700000000}}})")));
    const std::string table = Ctl({"progress", "--interval", "0.05"}).out;
    const std::string since = tools::FormatLocalTime(1700000000);
    ASSERT_EQ(Lines(table).size(), 5u) << table;
    for (const std::string& row : Lines(table)) {
        const std::string end = row.find("music") != std::string::npos ? "-" : row.find("photo") != std::string::npos ? since : "";
        EXPECT_EQ(row.substr(row.size() - end.size()), end) << table;
    }
    const auto lines = Ctl({"progress", "--watch", "--samples", "2", "--interval", "0.05"});
    ASSERT_EQ(lines.status, 0) << lines.err;
    ASSERT_EQ(Lines(lines.out).size(), 2u);
    for (const std::string& line : Lines(lines.out)) EXPECT_EQ(testkit::ParseJson(line)["shares"][0]["files_left"].asUInt(), 1u);
    const auto screen = testkit::Run({"/usr/bin/script", "-qec",
                                      std::string(FILEINDEXCTL) + " progress --watch --samples 2 --interval 0.05", "/dev/null"});
    ASSERT_EQ(screen.status, 0) << screen.err;
    EXPECT_NE(screen.out.find("\033[H\033[J"), std::string::npos);
    EXPECT_NE(screen.out.find("music [------------------------------] 1 file left"), std::string::npos) << screen.out;
    ASSERT_TRUE(StatusMgr::Pause(0));
    EXPECT_EQ(Ctl({"wait", "--timeout", "0.2"}).status, 3);  // paused with work pending
    unlink(QueueOf("music").c_str());                        // drained
    const auto result = Ctl({"wait", "--timeout", "5", "--json"});
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(testkit::ParseJson(result.out)["result"]["status"].asString(), "finished");
}

// Paced, the daemon stand-in applies at most so many records of a share per pass.
TEST_F(ToolTest, APacedDaemonAppliesAtMostItsPacePerPass) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    daemon_.reset();
    MakeDir(music_ + "/@eaDir");
    std::string queue;
    for (int i = 0; i < 50; ++i) queue += "{\"event\":2,\"path\":\"" + music_ + "/a/gone" + std::to_string(i) + "\"}\n";
    testkit::WriteFile(QueueOf("music"), queue);
    const std::string log = Path("/daemon.log");
    const pid_t daemon = testkit::Start({FILEINDEXD_REF, "--interval", "5", "--pace", "7"}, log);
    const std::shared_ptr<void> stop(nullptr, [daemon](void*) { EXPECT_EQ(testkit::Stop(daemon), 0); });
    ASSERT_TRUE(testkit::WaitFor([&] { return testkit::RecordsApplied(testkit::ReadFile(log), "music") == 50; }));
    EXPECT_EQ(testkit::AppliedSlices(testkit::ReadFile(log), "music"), (std::vector<size_t>{7, 7, 7, 7, 7, 7, 7, 1}));
}

// A share marked need-reindex is walked on the daemon stand-in's next pass, and the mark cleared.
TEST_F(ToolTest, TheDaemonStandInWalksAMarkedShareAndClearsTheMark) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {"document": true}})");
    testkit::WriteFile(music_ + "/a/notes.txt", "walked");
    ASSERT_TRUE(StatusMgr::ShareSetNeedReindex("music", true));
    daemon_.reset();
    const std::string log = Path("/daemon.log");
    const pid_t daemon = testkit::Start({FILEINDEXD_REF, "--interval", "5"}, log);
    const std::shared_ptr<void> stop(nullptr, [daemon](void*) { EXPECT_EQ(testkit::Stop(daemon), 0); });
    ASSERT_TRUE(testkit::WaitFor([&] { return testkit::ReadFile(log).find("reindexed (it was marked") != std::string::npos; }));
    EXPECT_FALSE(StatusMgr::ShareIsNeedReindex("music"));
    EXPECT_EQ(testkit::ParseJson(Ctl({"--json", "explain", "/music/a/notes.txt"}).out)["result"]["verdict"], "in the index");
}

// A pause holds the work back; progress --watch shows the backlog shrink once the daemon drains
// it, and wait returns when it is done.
TEST_F(ToolTest, TheDaemonStandInHoldsWorkBackWhilePausedAndProgressFollowsTheDrain) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}})");
    daemon_.reset();
    const std::string log = Path("/daemon.log");
    const pid_t daemon = testkit::Start({FILEINDEXD_REF, "--interval", "5"}, log);
    const std::shared_ptr<void> stop(nullptr, [daemon](void*) { EXPECT_EQ(testkit::Stop(daemon), 0); });
    // The socket file appears at bind, before the daemon listens: wait for its own word.
    ASSERT_TRUE(testkit::WaitFor([&] { return testkit::ReadFile(log).find("listening on") != std::string::npos; }));
    ASSERT_TRUE(StatusMgr::Pause(0));
    ASSERT_TRUE(IndexMgr::Reindex(J(R"(["/music/a", "/music/a/b"])")));
    // The daemon takes commands before each drain pass: once it has taken a second pause, sent
    // after the records were queued, it has had its pass over the queue and held them back.
    ASSERT_TRUE(StatusMgr::Pause(0));
    ASSERT_TRUE(testkit::WaitFor([&] { return testkit::CountOf(testkit::ReadFile(log), "\"type\":\"pause\"") == 2; }));
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "paused") << testkit::ReadFile(log);
    const std::string samples = Path("/samples.log");
    const pid_t watch = testkit::Start({FILEINDEXCTL, "progress", "--watch", "--interval", "0.05"}, samples);
    const auto backlogs = [&] {
        std::vector<unsigned> seen;
        for (const auto& sample : testkit::ReadJsonLines(samples)) seen.push_back(sample["shares"][0]["files_left"].asUInt());
        return seen;
    };
    ASSERT_TRUE(testkit::WaitFor([&] { return !backlogs().empty(); }));
    EXPECT_EQ(backlogs().front(), 2u);
    ASSERT_TRUE(StatusMgr::Resume());
    ASSERT_TRUE(testkit::WaitFor([&] { return backlogs().back() == 0; }));
    testkit::Stop(watch);
    EXPECT_EQ(StatusMgr::GetFolderStatus("/music/a"), "finished");
}

}  // namespace
