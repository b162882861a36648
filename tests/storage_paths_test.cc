// Locations of a share's index database and event queue.
#include "testkit.h"

#include "qira/qlib_core.h"

namespace {

class StoragePathsTest : public testkit::Sandbox {};

TEST_F(StoragePathsTest, PathsLieInTheSharesEaDirAndTheDatabaseIsCreated) {
    const std::string dir = AddShare("music");
    char buffer[4096];
    const std::string db = dir + "/@eaDir/QIRA@.fileindexdb";
    EXPECT_EQ(FILEIDXDBPathGet("music", buffer, sizeof buffer), static_cast<int>(db.size()));
    EXPECT_EQ(std::string(buffer), db);
    EXPECT_TRUE(S_ISDIR(testkit::ModeOf(db)));
    const std::string queue = dir + "/@eaDir/QIRA@file_index_queue";
    EXPECT_EQ(FILEIDXQueuePathGet("music", buffer, sizeof buffer), static_cast<int>(queue.size()));
    EXPECT_EQ(std::string(buffer), queue);
    EXPECT_FALSE(testkit::Exists(queue));
    EXPECT_EQ(FILEIDXDBPathGet("music", buffer, sizeof buffer), static_cast<int>(db.size()));  // exists: no log
    EXPECT_TRUE(testkit::LogLines().empty());
    // A buffer one byte short of the path truncates it, and no directory is made of what is left.
    std::vector<char> exact(db.size());
    EXPECT_EQ(FILEIDXDBPathGet("music", exact.data(), static_cast<int>(exact.size())), static_cast<int>(db.size()) - 1);
    EXPECT_FALSE(testkit::Exists(db.substr(0, db.size() - 1)));
}

TEST_F(StoragePathsTest, BadArgumentsFailBeforeAnyLookup) {
    AddShare("music");
    char buffer[64];
    using Getter = int (*)(const char*, char*, int);
    const std::tuple<Getter, const char*, char*, int, const char*> cases[] = {
        {FILEIDXQueuePathGet, nullptr, buffer, 64, "Invaild Argument (__null != szName)=[0]\n"},
        {FILEIDXQueuePathGet, "music", nullptr, 64, "Invaild Argument (__null != szOutQueuePath)=[0]\n"},
        {FILEIDXQueuePathGet, "music", buffer, 0, "Invaild Argument (cbOutLen > 0)=[0]\n"},
        {FILEIDXQueuePathGet, "music", buffer, -5, "Invaild Argument (cbOutLen > 0)=[-5]\n"},
        {FILEIDXDBPathGet, "music", nullptr, 10, "Invaild Argument (__null != szOutDBPath)=[0]\n"},
    };
    for (const auto& [get, name, out, size, message] : cases) {
        SCOPED_TRACE(message);
        testkit::ClearLog();
        QLIBCErrSetEx(0, "", 0);
        EXPECT_EQ(get(name, out, size), -1);
        EXPECT_EQ(testkit::LogMessages(), std::vector<std::string>{message});
        EXPECT_EQ(QLIBCErrGet(), 0x0D00);
        EXPECT_STREQ(QLIBCErrorGetFile(), "storage_paths.cc");
    }
    EXPECT_FALSE(testkit::Exists(ShareDir("music") + "/@eaDir"));
    qira_sim::InjectFault("QIRAShareGet", 0x0B01);
    testkit::ClearLog();
    EXPECT_EQ(FILEIDXQueuePathGet("nosuch", buffer, sizeof buffer), -1);
    EXPECT_EQ(testkit::LogMessages(), std::vector<std::string>{"QIRAShareGet failed, name=nosuch, code=2817"});
}

// @eaDir failures are only logged: the path is still returned, and truncated to a short buffer.
TEST_F(StoragePathsTest, EaDirFailuresAreOnlyLoggedAndShortBuffersTruncate) {
    const std::string dir = AddShare("music");
    qira_sim::InjectFault("QIRAEAMKDir", 0x0A00);
    char whole[4096];
    EXPECT_GT(FILEIDXDBPathGet("music", whole, sizeof whole), 0);
    EXPECT_TRUE(testkit::Logged("QIRAEAMKDir failed, path=" + dir + "/@eaDir, code=2560"));
    EXPECT_TRUE(testkit::Logged("mkdir failed, path=" + dir + "/@eaDir/QIRA@.fileindexdb, reason=No such file or directory"));
    char buffer[10];
    EXPECT_EQ(FILEIDXQueuePathGet("music", buffer, sizeof buffer), 9);
    EXPECT_EQ(std::string(buffer), dir.substr(0, 9));
    EXPECT_EQ(FILEIDXDBPathGet("music", buffer, sizeof buffer), 9);
}

}  // namespace
