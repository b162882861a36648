// Killing a process at random moments while it saves never leaves a file that is not a saved
// version; leftover temporary files never confuse a later load.
#include "testkit.h"

#include <random>

namespace {

class CrashTest : public testkit::Sandbox {
protected:
    // The folder.conf text of version v, as Save writes it.
    static std::string FolderVersion(long v) {
        return "{\"/music/a\":{\"audio\":false,\"document\":false,\"name\":\"v" + std::to_string(v) +
               "\",\"path\":\"/music/a\",\"photo\":false,\"video\":false}}\n";
    }
    static std::string StatusVersion(long v) { return "{\"resume_time\":" + std::to_string(v) + "}\n"; }

    // Saves both files over and over, writing one byte to `announce` as each round of saves begins.
    [[noreturn]] static void SaveForever(int announce) {
        for (long v = 1;; ++v) {
            if (write(announce, "s", 1) != 1) _exit(1);
            Folders folders;
            Json::Value changed;
            Json::Value request(Json::objectValue);
            request["path"] = "/music/a";
            request["name"] = "v" + std::to_string(v);
            folders.Upsert(changed, request);
            folders.Save();
            Status status;
            status.Pause(v);
            status.Save();
        }
    }

    // Waits until the child announced the beginning of round `round`: every earlier round of saves
    // has completed, however slow the disk.
    static bool AwaitRound(int announcements, int round) {
        char byte;
        for (int seen = 0; seen < round; ++seen) {
            if (read(announcements, &byte, 1) != 1) return false;
        }
        return true;
    }

    static long VersionIn(const std::string& text, const std::string& prefix) {
        const size_t at = text.find(prefix);
        return at == std::string::npos ? -1 : std::atol(text.c_str() + at + prefix.size());
    }

    size_t LeftoverTemporaries() const {
        size_t count = 0;
        DIR* dir = opendir(Path("/usr/qira/etc/fileindex").c_str());
        while (dirent* entry = readdir(dir)) {
            const std::string name = entry->d_name;
            if (name != "." && name != ".." && name != "folder.conf" && name != "status.conf") ++count;
        }
        closedir(dir);
        return count;
    }
};

TEST_F(CrashTest, EveryFileReadAfterAKillIsASavedVersion) {
    AddShare("music");
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
        const std::string folderText = testkit::ReadFile(FolderConf());
        const std::string statusText = testkit::ReadFile(StatusConf());
        EXPECT_EQ(folderText, FolderVersion(VersionIn(folderText, "\"name\":\"v")));
        EXPECT_EQ(statusText, StatusVersion(VersionIn(statusText, "\"resume_time\":")));
    }
    // Temporaries of killed saves are ignored by every load above and removed by the next save:
    // at most the last killed save's two remain.
    EXPECT_LE(LeftoverTemporaries(), 2u);
    std::vector<Folder> list;
    ASSERT_TRUE(IndexMgr::List(list));
    EXPECT_EQ(list.size(), 1u);
}

}  // namespace
