// Several processes change folders, pause state, flags and queues at once while the daemon
// stand-in drains the queues: what returned true is on disk, every file stays whole, no queued
// record is lost or duplicated.
#include "testkit.h"

#include <random>

namespace {

constexpr int kWorkers = 4;
constexpr int kOpsPerWorker = 80;

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

    // Runs one worker's random operations on its own share; writes "op target ok" lines to a file.
    [[noreturn]] void Work(int w) {
        LOG_LEVEL = 7;
        std::mt19937 random(1000 + w);
        const std::string share = "s" + std::to_string(w);
        std::string lines;
        for (int i = 0; i < kOpsPerWorker; ++i) {
            const std::string path = "/" + share + "/p" + std::to_string(random() % 4);
            const std::string event = ShareDir("ev") + "/ev_" + std::to_string(w) + "_" + std::to_string(i);
            const bool on = random() % 2 == 0;
            switch (random() % 6) {
                case 0:
                case 1:
                    lines += "upsert " + path + (IndexMgr::Upsert(J("[{\"path\": \"" + path + "\", \"audio\": true}]")) ? " 1\n" : " 0\n");
                    break;
                case 2:
                    lines += "delete " + path + (IndexMgr::Delete(J("[\"" + path + "\"]")) ? " 1\n" : " 0\n");
                    break;
                case 3:
                    lines += (on ? "flag_on " : "flag_off ") + share + (StatusMgr::ShareSetNoSpace(share, on) ? " 1\n" : " 0\n");
                    break;
                case 4:
                    lines += std::string("pause - ") + ((on ? StatusMgr::Pause(0) : StatusMgr::Resume()) ? "1\n" : "0\n");
                    break;
                default:
                    lines += "event " + event + (AddCustomEvent(kEventFolderSettingChanged, event, Json::Value()) ? " 1\n" : " 0\n");
            }
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
        // The last call on each folder or flag; only a success says what the file holds.
        std::map<std::string, std::pair<std::string, bool>> last;
        std::stringstream lines(testkit::ReadFile(Path("/worker" + std::to_string(w))));
        for (std::string op, target, ok; lines >> op >> target >> ok;) {
            if (op == "event") expectedEvents += ok == "1";
            const std::string key = op == "upsert" || op == "delete" ? target : op.substr(0, 4) + target;
            if (op != "event") last[key] = {op, ok == "1"};
        }
        for (const auto& [key, outcome] : last) {
            const auto& [op, ok] = outcome;
            if (!ok) continue;  // a failed call may or may not have changed it
            Json::Value out;
            if (op == "upsert" || op == "delete") {
                EXPECT_EQ(folders.Get(out, key), op == "upsert") << key;
            } else if (op != "pause") {
                EXPECT_EQ(status.ShareIsNoSpace(key.substr(4)), op == "flag_on") << key;
            }
        }
    }
    // The daemon removes a finished companion before it logs the slice that emptied it.
    ASSERT_TRUE(testkit::WaitFor([&] {
        return !testkit::Exists(QueueOf("ev")) && !testkit::Exists(QueueOf("ev") + ".tmp") &&
               testkit::RecordsApplied(testkit::ReadFile(Path("/daemon.log")), "ev") >= expectedEvents;
    }));
    const std::string log = testkit::ReadFile(Path("/daemon.log"));
    EXPECT_EQ(testkit::RecordsApplied(log, "ev"), expectedEvents);
    EXPECT_EQ(log.find("malformed"), std::string::npos);
}

}  // namespace
