// Several processes change folders, pause state, flags and queues at once while the daemon
// stand-in drains the queues: what returned true is on disk, every file stays whole, no queued
// record is lost or duplicated.
#include "testkit.h"

#include <random>

namespace {

constexpr int kWorkers = 4;
constexpr int kOpsPerWorker = 80;

struct Outcome {
    std::string op;
    std::string target;
    bool ok;
};

class ContentionTest : public testkit::Sandbox {
protected:
    void SetUp() override {
        Sandbox::SetUp();
        for (int w = 0; w < kWorkers; ++w) {
            const std::string dir = AddShare("s" + std::to_string(w));
            for (int p = 0; p < 4; ++p) MakeDir(dir + "/p" + std::to_string(p));
        }
        // Custom events go to a share whose folder nobody deletes (deleting a share's last
        // folder wipes its queue by design).
        MakeDir(AddShare("ev") + "/keep");
        testkit::WriteFile(FolderConf(), R"({"/ev/keep": {}})");
        daemon_ = testkit::Start({FILEINDEXD_REF, "--interval", "3"}, Path("/daemon.log"));
        // The socket file appears at bind, before the daemon listens: wait for its own word.
        ASSERT_TRUE(testkit::WaitFor([this] { return testkit::ReadFile(Path("/daemon.log")).find("listening on") != std::string::npos; }));
    }
    void TearDown() override {
        if (daemon_ > 0) testkit::Stop(daemon_);
        Sandbox::TearDown();
    }

    // Runs one worker's random operations on its own share; writes its outcomes to a file.
    [[noreturn]] void Work(int w) {
        LOG_LEVEL = 7;
        testkit::ClearLog();
        std::mt19937 random(1000 + w);
        const std::string share = "s" + std::to_string(w);
        std::string lines;
        int written = 0;
        for (int i = 0; i < kOpsPerWorker; ++i) {
            const std::string path = "/" + share + "/p" + std::to_string(random() % 4);
            Outcome outcome;
            switch (random() % 6) {
                case 0:
                case 1: {
                    Json::Value request(Json::arrayValue);
                    request.append(Json::Value(Json::objectValue));
                    request[0]["path"] = path;
                    request[0]["audio"] = true;
                    outcome = {"upsert", path, IndexMgr::Upsert(request)};
                    break;
                }
                case 2: {
                    Json::Value request(Json::arrayValue);
                    request.append(path);
                    outcome = {"delete", path, IndexMgr::Delete(request)};
                    break;
                }
                case 3: {
                    const bool on = random() % 2 == 0;
                    outcome = {on ? "flag_on" : "flag_off", share, StatusMgr::ShareSetNoSpace(share, on)};
                    break;
                }
                case 4:
                    outcome = {"pause", "-", random() % 2 ? StatusMgr::Pause(0) : StatusMgr::Resume()};
                    break;
                default: {
                    const std::string full = ShareDir("ev") + "/ev_" + std::to_string(w) + "_" + std::to_string(i);
                    outcome = {"event", full, AddCustomEvent(kEventFolderSettingChanged, full, Json::Value())};
                    if (outcome.ok) ++written;
                }
            }
            lines += outcome.op + " " + outcome.target + " " + (outcome.ok ? "1" : "0") + "\n";
        }
        testkit::WriteFile(Path("/worker" + std::to_string(w)), lines);
        _exit(0);
    }

    pid_t daemon_ = -1;
};

TEST_F(ContentionTest, ConcurrentCallersLoseNothing) {
    std::vector<pid_t> workers;
    for (int w = 0; w < kWorkers; ++w) {
        const pid_t pid = fork();
        if (pid == 0) Work(w);
        workers.push_back(pid);
    }
    for (const pid_t pid : workers) waitpid(pid, nullptr, 0);
    ASSERT_TRUE(StatusMgr::Resume());

    Folders folders;
    ASSERT_TRUE(folders.Load());
    Status status;
    ASSERT_TRUE(status.Load());
    size_t expectedEvents = 0;
    for (int w = 0; w < kWorkers; ++w) {
        std::map<std::string, Outcome> lastSuccess;
        std::map<std::string, bool> lastFailed;
        std::stringstream lines(testkit::ReadFile(Path("/worker" + std::to_string(w))));
        std::string op, target, ok;
        while (lines >> op) {
            lines >> target >> ok;
            if (op == "event") {
                if (ok == "1") ++expectedEvents;
                continue;
            }
            const std::string key = op == "upsert" || op == "delete" ? target : op.substr(0, 4) + target;
            lastFailed[key] = ok != "1";
            if (ok == "1") lastSuccess[key] = {op, target, true};
        }
        for (const auto& [key, outcome] : lastSuccess) {
            if (lastFailed[key]) continue;  // a later failed call may or may not have changed it
            Json::Value out;
            if (outcome.op == "upsert" || outcome.op == "delete") {
                EXPECT_EQ(folders.Get(out, outcome.target), outcome.op == "upsert") << outcome.target;
            }
            if (outcome.op == "flag_on") {
                EXPECT_TRUE(status.ShareIsNoSpace(outcome.target));
            }
            if (outcome.op == "flag_off") {
                EXPECT_FALSE(status.ShareIsNoSpace(outcome.target));
            }
        }
    }
    ASSERT_TRUE(testkit::WaitFor([this] {
        return !testkit::Exists(QueueOf("ev")) && !testkit::Exists(QueueOf("ev") + ".tmp");
    }));
    const std::string log = testkit::ReadFile(Path("/daemon.log"));
    EXPECT_EQ(testkit::RecordsApplied(log, "ev"), expectedEvents);
    EXPECT_EQ(log.find("malformed"), std::string::npos);
}

}  // namespace
