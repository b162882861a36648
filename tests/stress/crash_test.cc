// Killing a process at random moments while it saves never leaves a file that is not a saved
// version; leftover temporary files never confuse a later load.
#include "testkit.h"

#include <filesystem>
#include <random>
#include <regex>

namespace {

// Saves both files over and over, writing one byte to `announce` as each round of saves begins.
[[noreturn]] void SaveForever(int announce) {
    for (long v = 1;; ++v) {
        if (write(announce, "s", 1) != 1) _exit(1);
        Folders folders;
        Json::Value changed;
        folders.Upsert(changed, J("{\"path\": \"/music/a\", \"name\": \"v" + std::to_string(v) + "\"}"));
        folders.Save();
        Status status;
        status.Pause(v);
        status.Save();
    }
}

// Waits until the child announced the beginning of round `round`: every earlier round of saves
// has completed, however slow the disk.
bool AwaitRound(int announcements, int round) {
    char byte;
    for (int seen = 0; seen < round; ++seen) {
        if (read(announcements, &byte, 1) != 1) return false;
    }
    return true;
}

class CrashTest : public testkit::Sandbox {};

TEST_F(CrashTest, EveryFileReadAfterAKillIsASavedVersion) {
    AddShare("music");
    // Each file as Save writes some version of it.
    const std::regex folderVersion(
        R"(\{"/music/a":\{"audio":false,"document":false,"name":"v[0-9]+","path":"/music/a","photo":false,"video":false\}\}\n)");
    const std::regex statusVersion(R"(\{"resume_time":[0-9]+\}\n)");
    std::mt19937 random(12345);
    constexpr int kKills = 200;
    for (int round = 0; round < kKills; ++round) {
        SCOPED_TRACE("round " + std::to_string(round));
        int announce[2];
        ASSERT_EQ(pipe(announce), 0);
        const pid_t saver = fork();
        if (saver == 0) {
            close(announce[0]);
            SaveForever(announce[1]);
        }
        close(announce[1]);
        // The kill lands inside the saves of a later round, at a random point of it; the rounds
        // before have completed, so some saved version always exists.
        ASSERT_TRUE(AwaitRound(announce[0], std::uniform_int_distribution<int>(2, 4)(random)));
        usleep(std::uniform_int_distribution<useconds_t>(0, 2000)(random));
        kill(saver, SIGKILL);
        waitpid(saver, nullptr, 0);
        close(announce[0]);

        Folders folders;
        ASSERT_TRUE(folders.Load());
        Status status;
        ASSERT_TRUE(status.Load());
        EXPECT_TRUE(std::regex_match(testkit::ReadFile(FolderConf()), folderVersion)) << testkit::ReadFile(FolderConf());
        EXPECT_TRUE(std::regex_match(testkit::ReadFile(StatusConf()), statusVersion)) << testkit::ReadFile(StatusConf());
    }
    // Temporaries of killed saves are ignored by every load above and removed by the next save:
    // at most the last killed save's two remain besides the two files.
    const auto dir = std::filesystem::directory_iterator(Path("/usr/qira/etc/fileindex"));
    EXPECT_LE(std::distance(begin(dir), end(dir)), 4);
    std::vector<Folder> list;
    ASSERT_TRUE(IndexMgr::List(list));
    EXPECT_EQ(list.size(), 1u);
}

}  // namespace
