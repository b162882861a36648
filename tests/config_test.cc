// Error state, JSON reading and writing, configuration loading and saving, and the advisory lock
// between processes.
#include "testkit.h"

#include <syslog.h>

#include "qira/qlib_core.h"

using testkit::Logged;

namespace {

class ConfigTest : public testkit::Sandbox {};

// A host's sink gets every line with its parts; beside the system log or instead of it.
TEST_F(ConfigTest, ALogSinkReceivesEveryLineBesideOrInsteadOfTheSystemLog) {
    static std::vector<std::string> received;
    const auto keep = [](const QIRA::FILEINDEX::LogLine& line, void* context) {
        received.push_back(*static_cast<std::string*>(context) + " " + std::to_string(line.priority) + " " + line.file +
                           " " + line.message + (line.line > 0 ? "" : " (no line)"));
    };
    std::string tag = "sink";
    for (const auto mode : {LogSinkMode::BesidesSyslog, LogSinkMode::InsteadOfSyslog}) {
        received.clear();
        testkit::ClearLog();
        SetLogSink(keep, &tag, mode);
        testkit::WriteFile(StatusConf(), "not json");
        Status().Load();
        SetLogSink(nullptr, nullptr, mode);
        Status().Load();
        EXPECT_EQ(received, std::vector<std::string>{"sink 3 config.cc Failed to load json from " + StatusConf()});
        EXPECT_EQ(testkit::LogMessages().size(), mode == LogSinkMode::BesidesSyslog ? 2u : 1u);
    }
}

TEST_F(ConfigTest, UnparsableFilesFailWithErrorSixAndTheirPath) {
    const std::string nested(100000, '[');
    for (const std::string& content : std::vector<std::string>{"", "{\"a\": ", "not json", "{} {}", "{/*c*/}", nested}) {
        SCOPED_TRACE(content.substr(0, 20));
        testkit::WriteFile(StatusConf(), content);
        testkit::ClearError();
        testkit::ClearLog();
        Status status;
        EXPECT_FALSE(status.Load()) << content.substr(0, 20);
        EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_LOAD_JSON);
        EXPECT_TRUE(Logged("Failed to load json from " + StatusConf()));
        ASSERT_EQ(testkit::LogLines().size(), 1u);
        EXPECT_EQ(testkit::LogLines()[0].source, "config.cc");
        EXPECT_EQ(testkit::LogLines()[0].priority, LOG_ERR);
    }
}

TEST_F(ConfigTest, SaveReplacesTheFileWithMode0644AndFailsWithErrorSevenWithoutItsDirectory) {
    Status status;
    status.Pause(0);
    ASSERT_TRUE(status.Save());
    EXPECT_EQ(testkit::ReadFile(StatusConf()), "{\"resume_time\":0}\n");
    EXPECT_EQ(testkit::ModeOf(StatusConf()), S_IFREG | 0644u);
    unlink(StatusConf().c_str());
    rmdir(Path("/usr/qira/etc/fileindex").c_str());
    EXPECT_FALSE(status.Save());
    EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_SAVE_JSON);
    EXPECT_TRUE(Logged("Failed to save json to " + StatusConf()));
}

// At the file's own path a link or a FIFO is no configuration: nothing is read through it and
// nothing blocks; the save puts a regular file there, removes the temporaries killed saves left
// and keeps names that only look like one.
TEST_F(ConfigTest, ALinkOrFifoAtTheConfigPathIsReadAsMissingAndSavingClearsStaleTemporaries) {
    const std::string canary = Path("/canary.conf"), stale = FolderConf() + ".Ab12Cd";
    testkit::WriteFile(canary, R"({"/music/a":{"path":"/music/a","name":"A"}})");
    const std::vector<std::function<int()>> kinds = {
        [&] { return symlink(canary.c_str(), FolderConf().c_str()); },
        [&] { return mkfifo(FolderConf().c_str(), 0644); }};
    for (const auto& make : kinds) {
        unlink(FolderConf().c_str());
        ASSERT_EQ(make(), 0);
        for (const std::string& name : {stale, FolderConf() + ".Ab12C", FolderConf() + ".Ab12Cde", FolderConf() + ".Ab-12C"})
            testkit::WriteFile(name, "left");
        Folders folders;
        ASSERT_TRUE(folders.Load());
        EXPECT_EQ(folders.Count(), 0u);
        ASSERT_TRUE(folders.Lock(true));
        EXPECT_TRUE(folders.Save());
        folders.Unlock();
        EXPECT_TRUE(S_ISREG(testkit::ModeOf(FolderConf())));
        EXPECT_EQ(testkit::ReadFile(FolderConf()), "{}\n");
        EXPECT_FALSE(testkit::Exists(stale));
        EXPECT_EQ(testkit::ReadFile(FolderConf() + ".Ab12C") + testkit::ReadFile(FolderConf() + ".Ab12Cde") +
                      testkit::ReadFile(FolderConf() + ".Ab-12C"),
                  "leftleftleft");
    }
    EXPECT_EQ(testkit::ReadFile(canary), R"({"/music/a":{"path":"/music/a","name":"A"}})");
}

// A shared lock held by another process lets shared locks in and keeps an exclusive one out; each
// configuration has its own lock file; two descriptors of one process conflict too; an unlock
// without a lock does nothing and an unlocked file can be taken again.
TEST_F(ConfigTest, LocksConflictPerConfigurationAndAreFreeAfterUnlock) {
    {
        testkit::ChildHolding reader([] { return Folders().Lock(false); });
        ASSERT_TRUE(reader.Took());
        Folders shared, writer;
        EXPECT_TRUE(shared.Lock(false));
        shared.Unlock();
        EXPECT_FALSE(writer.Lock(true));
        writer.Unlock();
        EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_LOCK);
    }
    Folders never, first, second;
    never.Unlock();
    ASSERT_TRUE(first.Lock(true));
    const std::string script = "ls -l /proc/self/fd > " + Path("/fds");  // a program run meanwhile inherits no lock
    ASSERT_EQ(QLIBCExec("/bin/sh", "-c", script.c_str(), nullptr, nullptr), 0);
    EXPECT_NE(testkit::ReadFile(Path("/fds")).find("fds"), std::string::npos);
    EXPECT_EQ(testkit::ReadFile(Path("/fds")).find("fileidx_cfg_folder.lock"), std::string::npos) << testkit::ReadFile(Path("/fds"));
    Status status, other;
    EXPECT_TRUE(status.Lock(true));
    EXPECT_FALSE(second.Lock(true));
    EXPECT_FALSE(other.Lock(true));
    EXPECT_EQ(testkit::LogMessages(), std::vector<std::string>(3, "Failed to lock folder"));
    for (Config* held : std::vector<Config*>{&second, &other, &status, &first}) held->Unlock();
    Folders third;
    EXPECT_TRUE(third.Lock(true));
    third.Unlock();
    EXPECT_TRUE(testkit::Exists(Path("/tmp/fileidx_cfg_folder.lock")));
    EXPECT_TRUE(testkit::Exists(Path("/tmp/fileidx_cfg_status.lock")));
}

// A link, a directory or a FIFO is never the lock file: a FIFO opens for reading and writing at
// once and takes a lock, so only its kind refuses it.
TEST_F(ConfigTest, LockRefusesASymbolicLinkADirectoryOrAFifoAsTheLockFile) {
    const std::string canary = Path("/canary"), lock = Path("/tmp/fileidx_cfg_folder.lock");
    testkit::WriteFile(canary, "keep");
    for (const auto& plant : std::vector<std::function<int()>>{[&] { return symlink(canary.c_str(), lock.c_str()); },
                                                               [&] { return mkdir(lock.c_str(), 0755); },
                                                               [&] { return mkfifo(lock.c_str(), 0644); }}) {
        remove(lock.c_str());
        ASSERT_EQ(plant(), 0);
        testkit::ClearError();
        Folders folders;
        EXPECT_FALSE(folders.Lock(true));
        folders.Unlock();
        EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_LOCK);
    }
    EXPECT_EQ(testkit::ReadFile(canary), "keep");
}

TEST_F(ConfigTest, ReaderNeverSeesAPartialFileWhileAnotherProcessSaves) {
    const pid_t writer = fork();
    if (writer == 0) {
        for (int round = 0; round < 300; ++round) {
            Status status;
            status.Load();
            for (int i = 0; i < 50; ++i) status.SetUpdated("marker_" + std::to_string(round) + "_" + std::to_string(i));
            status.Save();
        }
        _exit(0);
    }
    int reads = 0;
    int status = 0;
    while (waitpid(writer, &status, WNOHANG) == 0) {
        Status reader;
        ASSERT_TRUE(reader.Load()) << "partial file seen";
        ++reads;
    }
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0);
    EXPECT_GT(reads, 0);
}

// Reading is strict and bounded in depth (kJsonNestingLimit levels and not one more): nothing but
// one JSON text, no comments, and a failed read leaves the value alone.
TEST(JsonTest, ReadingIsStrictAndBoundedInDepth) {
    const auto nested = [](int depth) { return std::string(depth, '[') + std::string(depth, ']'); };
    const std::vector<std::pair<std::string, bool>> cases = {
        {" {\"a\": [1, 2]} \n", true}, {"7", true}, {nested(kJsonNestingLimit), true}, {nested(kJsonNestingLimit + 1), false},
        {"{\"a\":1} x", false}, {"[1 /* c */]", false}, {"{\"a\": 1 // c\n}", false}, {"{\"a\":1,}", false},
        {"{'a':1}", false}, {"[1,,2]", false}, {"", false}, {"nan", false}};
    for (const auto& [text, taken] : cases) {
        SCOPED_TRACE(text.substr(0, 20));
        Json::Value value = "before";
        EXPECT_EQ(fromString(value, text), taken);
        if (!taken) {
            EXPECT_EQ(value.asString(), "before");
        }
    }
}

TEST_F(ConfigTest, JsonIsWrittenAsOneCompactLineAndReadBackFromItsFile) {
    const std::string path = Path("/data.json");
    testkit::WriteFile(path, "old");
    Json::Value value(Json::objectValue);
    value["b"] = "Müsik\nline";
    value["a"] = Json::Value(Json::arrayValue);
    EXPECT_EQ(toString(value), "{\"a\":[],\"b\":\"Müsik\\nline\"}");
    ASSERT_TRUE(toFile(value, path));
    Json::Value back;
    ASSERT_TRUE(fromFile(back, path));
    EXPECT_EQ(back, value);
    EXPECT_FALSE(toFile(value, Path("/missing/dir/x.json")));
    EXPECT_FALSE(fromFile(back, Path("/missing.json")));
    EXPECT_FALSE(fromFile(back, Path("/volume1")));
}

}  // namespace
