// Folder upsert end to end: folder.conf, platform calls, registrations, frames and events.
#include "testkit.h"

namespace {

class UpsertTest : public testkit::IndexFixture {
protected:
    Json::Value Event(const std::string& path, const std::string& data) {
        return J("{\"event\": 131072, \"path\": \"" + path + "\", \"data\": " + data + "}");
    }
};

const char kAllChanged[] = R"({"document": true, "audio": true, "video": true, "photo": true})";

TEST_F(UpsertTest, NewFoldersRunEveryStepInOrder) {
    ASSERT_TRUE(IndexMgr::Upsert(J(R"([{"path": "/photo/b", "photo": true}, {"path": "/music/a", "name": "A"}])")));
    EXPECT_EQ(Conf().getMemberNames(), (std::vector<std::string>{"/music/a", "/photo/b"}));
    EXPECT_EQ(Conf()["/music/a"]["name"].asString(), "A");
    const std::vector<std::string> ops = {
        "MonitorQueue::Upsert " + QueueOf("music") + " fileindex 1",
        "MonitorQueue::Upsert " + QueueOf("photo") + " fileindex 1",
        "QLIBServiceStart fileindexd 1",
        "QIRASMBSetSpotlight 1",
        "QLIBServiceRestart samba",
    };
    EXPECT_EQ(testkit::JournalOps(), ops);
    EXPECT_EQ(qira_sim::ServiceState("fileindexd"), "running");
    EXPECT_TRUE(qira_sim::SpotlightState());
    const auto messages = Messages();
    ASSERT_EQ(messages.size(), 2u);
    EXPECT_EQ(messages[0], J(R"({"type": "upsert_folder_setting", "data": {"folder_path": "/photo/b"}})"));
    EXPECT_EQ(messages[1], J(R"({"type": "upsert_folder_setting", "data": {"folder_path": "/music/a"}})"));
    EXPECT_EQ(Queue("music"), std::vector<Json::Value>{Event(music_ + "/a", kAllChanged)});
    EXPECT_EQ(Queue("photo"), std::vector<Json::Value>{Event(photo_ + "/b", kAllChanged)});
    EXPECT_TRUE(testkit::LogLines().empty());
}

TEST_F(UpsertTest, SpotlightFailuresNeverFailTheUpsertAndSpotlightOnIsLeftAlone) {
    qira_sim::InjectFault("QIRASMBSetSpotlight", 0x61);
    ASSERT_TRUE(IndexMgr::Set(J(R"([{"path": "/music/a"}])")));
    EXPECT_EQ(testkit::LogMessages(), std::vector<std::string>{"QIRASMBSetSpotlight failed: err=[0x0061 sim/QIRASMBSetSpotlight:1]"});
    EXPECT_EQ(testkit::JournalOps().back(), "QIRASMBSetSpotlight 1");
    Settle();
    qira_sim::ClearFaults();
    qira_sim::InjectFault("QLIBServiceRestart", 0x62);
    ASSERT_TRUE(IndexMgr::Upsert(J(R"([{"path": "/music/b"}])")));
    EXPECT_EQ(testkit::LogMessages(), std::vector<std::string>{"QLIBServiceRestart failed: err=[0x0062 sim/QLIBServiceRestart:1]"});
    Settle();  // Spotlight already on is left alone
    ASSERT_TRUE(IndexMgr::Add(J(R"([{"path": "/music/c"}])")));
    EXPECT_EQ(testkit::JournalOps(), (std::vector<std::string>{"MonitorQueue::Upsert " + QueueOf("music") + " fileindex 1",
                                                               "QLIBServiceStart fileindexd 1"}));
}

// A request that is not an array, or one with a bad element among good ones: nothing is kept.
TEST_F(UpsertTest, BadRequestsChangeNothing) {
    std::vector<std::pair<std::string, std::vector<std::string>>> cases;
    for (const char* request : {R"({"path": "/music/a"})", "\"/music/a\"", "null"}) {
        cases.push_back({request, {"Bad param: " + toString(J(request))}});
    }
    for (const char* bad : {R"({"path": 7})", R"({"name": "x"})", R"({"path": "/nosuch/x"})", R"([1])", R"("s")", R"({"path": {}})"}) {
        const std::string logged = toString(J(bad));
        cases.push_back({std::string(R"([{"path": "/music/a"}, )") + bad + R"(, {"path": "/music/b"}])",
                         {"Bad param: " + logged, "Upsert failed, folder=" + logged}});
    }
    for (const auto& [request, logged] : cases) {
        SCOPED_TRACE(request);
        Settle();
        EXPECT_FALSE(IndexMgr::Upsert(J(request)));
        EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_BAD_PARAM);
        EXPECT_EQ(testkit::LogMessages(), logged);
        EXPECT_FALSE(testkit::Exists(FolderConf()));
        EXPECT_TRUE(NothingSent());
    }
}

// A folder path is a canonical share path, taken up to the system's limits and refused one byte
// past them, by the upsert and the reindex alike: a component of NAME_MAX bytes, a full path of
// PATH_MAX - 1. A refused path is logged whole and changes nothing.
TEST_F(UpsertTest, PathsAreCanonicalAndTakenUpToTheSystemsLimitsAndNoFurther) {
    const auto pathOf = [](size_t length, size_t component) {
        std::string path = "/music";
        while (path.size() < length) path += "/" + std::string(std::min(component, length - path.size() - 1), 'c');
        return path;
    };
    const size_t volume = music_.size() - std::string("/music").size();  // the full path's prefix
    const std::vector<std::pair<std::string, bool>> cases = {
        {pathOf(6 + 1 + NAME_MAX, NAME_MAX), true},      {pathOf(6 + 2 + NAME_MAX, NAME_MAX + 1), false},
        {pathOf(PATH_MAX - 1 - volume, 200), true},      {pathOf(PATH_MAX - volume, 200), false},
        {"/music/../../etc", false}, {"/music/a/", false}, {"/music//a", false}, {"/music/./a", false},
        {"/", false},                {"", false},          {"music/a", false},   {std::string(5000, '/'), false},
    };
    for (const auto& [path, taken] : cases) {
        SCOPED_TRACE(std::to_string(path.size()) + " bytes: " + path.substr(0, 20));
        Settle();
        const std::string before = testkit::ReadFile(FolderConf());
        Json::Value folders(Json::arrayValue);
        const Json::Value& element = folders.append(Json::Value(Json::objectValue))["path"] = path;
        EXPECT_EQ(IndexMgr::Upsert(folders), taken);
        EXPECT_EQ(Conf().isMember(path), taken);
        Json::Value paths(Json::arrayValue);
        paths.append(path);
        EXPECT_EQ(IndexMgr::Reindex(paths), taken);
        if (taken) continue;
        EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_BAD_PARAM);
        const std::string logged = toString(folders[0]);
        EXPECT_EQ(testkit::LogMessages(), (std::vector<std::string>{"Bad param: " + logged, "Upsert failed, folder=" + logged,
                                                                    "Malformed jsArrPath: " + toString(element)}));
        EXPECT_EQ(testkit::ReadFile(FolderConf()), before);
        EXPECT_TRUE(NothingSent());
    }
}

TEST_F(UpsertTest, EmptyArrayStartsTheServiceAndNothingElse) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {"name": "A"}})");
    ASSERT_TRUE(IndexMgr::Upsert(J("[]")));
    EXPECT_EQ(Conf()["/music/a"]["name"].asString(), "A");
    EXPECT_EQ(testkit::JournalOps(),
              (std::vector<std::string>{"QLIBServiceStart fileindexd 1", "QIRASMBSetSpotlight 1", "QLIBServiceRestart samba"}));
    EXPECT_TRUE(Messages().empty());
    EXPECT_FALSE(testkit::Exists(QueueOf("music")));
}

// Commands go in request order, one per element; events in ascending path order, one per path,
// with the report of its last element.
TEST_F(UpsertTest, CommandsInRequestOrderAndOneEventPerPathInPathOrder) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {"name": "A", "document": false, "audio": false,
                                                      "video": false, "photo": false}})");
    ASSERT_TRUE(IndexMgr::Upsert(J(R"([{"path": "/music/c"}, {"path": "/music/a", "audio": true}, {"path": "/music/a", "name": "x"},
                                       {"path": "/music/a/b", "video": true}])")));
    const auto messages = Messages();
    ASSERT_EQ(messages.size(), 4u);
    EXPECT_EQ(messages[0]["data"]["folder_path"].asString(), "/music/c");
    EXPECT_EQ(messages[3]["data"]["folder_path"].asString(), "/music/a/b");
    EXPECT_EQ(Queue("music"),
              (std::vector<Json::Value>{Event(music_ + "/a", R"({"document": false, "audio": false, "video": false, "photo": false})"),
                                        Event(music_ + "/a/b", R"({"document": false, "audio": true, "video": true, "photo": false})"),
                                        Event(music_ + "/c", kAllChanged)}));
}

// A step after the save fails: folder.conf keeps the change and the steps after it are not taken.
TEST_F(UpsertTest, LaterStepsFailWithFolderConfAlreadyWritten) {
    struct Case {
        std::string name, logged;
        std::function<void()> setUp;
        size_t frames;
        bool marked;
        _tag_fileindex_err_ error;
    };
    const std::vector<Case> cases = {
        {"notifier refuses", "UpsertQIRANtifydCfg failed, share=music", [] { qira_sim::InjectFault("MonitorQueue::Upsert", 0x70); },
         0, false, FILEINDEX_ERR_NONE},
        {"service start fails", "QLIBServiceStart failed: err=[0x0070 sim/QLIBServiceStart:1]",
         [] { qira_sim::InjectFault("QLIBServiceStart", 0x70); }, 0, false, FILEINDEX_ERR_NONE},
        {"daemon unreachable", "SendCammandToDaemon failed", [this] { daemon_.reset(); }, 0, false, FILEINDEX_ERR_NONE},
        // The share vanishes once the daemon has been started, before the events are queued.
        {"share vanishes", "GetFullPath failed, path=/music/a",
         [] { qira_sim::InjectFault("QIRAShareGet", 0x0B00, "music", {"QLIBServiceStart", "fileindexd"}); }, 1, false,
         FILEINDEX_ERR_PATH},
        {"queue unwritable", "AddCustomEvent failed", [this] { MakeDir(QueueOf("music")); }, 1, true, FILEINDEX_ERR_NONE},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        unlink(FolderConf().c_str());
        rmdir(QueueOf("music").c_str());
        qira_sim::ClearFaults();
        if (!daemon_) daemon_ = std::make_unique<testkit::FakeDaemon>(DaemonSocketPath());
        c.setUp();
        Settle();
        EXPECT_FALSE(IndexMgr::Upsert(J(R"([{"path": "/music/a"}])")));
        EXPECT_TRUE(testkit::Logged(c.logged));
        EXPECT_TRUE(Conf().isMember("/music/a"));
        EXPECT_EQ(daemon_ ? Messages().size() : c.frames, c.frames);
        EXPECT_FALSE(S_ISREG(testkit::ModeOf(QueueOf("music"))));
        EXPECT_EQ(ErrorHandler::GetError(), c.error);
        EXPECT_EQ(StatusMgr::ShareIsNeedReindex("music"), c.marked);
    }
}

TEST_F(UpsertTest, FailedSaveStopsBeforeAnyOtherStep) {
    MakeDir(FolderConf());  // a save cannot rename over a directory
    EXPECT_FALSE(IndexMgr::Upsert(J(R"([{"path": "/music/a"}])")));
    EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_SAVE_JSON);
    EXPECT_TRUE(testkit::Logged("Failed to save json to " + FolderConf()));
    EXPECT_TRUE(NothingSent());
}

// At a thousand folders a request that adds one is refused whole; one that only updates is taken.
TEST_F(UpsertTest, LimitOfAThousandFoldersRejectsTheWholeRequest) {
    Json::Value conf(Json::objectValue);
    for (int i = 0; i < 1000; ++i) conf["/music/f" + std::to_string(i)] = Json::Value(Json::objectValue);
    testkit::WriteFile(FolderConf(), toString(conf));
    EXPECT_FALSE(IndexMgr::Upsert(J(R"([{"path": "/music/f1", "name": "x"}, {"path": "/music/new"}])")));
    EXPECT_EQ(ErrorHandler::GetError(), FILEINDEX_ERR_EXCEED_MAX_FOLDER);
    EXPECT_TRUE(testkit::Logged("Exceed max folder size"));
    EXPECT_EQ(Conf().size(), 1000u);
    EXPECT_EQ(Conf()["/music/f1"]["name"], Json::Value());
    EXPECT_TRUE(IndexMgr::Upsert(J(R"([{"path": "/music/f1", "name": "x"}])")));
    EXPECT_EQ(Conf()["/music/f1"]["name"].asString(), "x");
}

}  // namespace
