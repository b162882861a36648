// Why a path is or is not indexed, and how far indexing has got.
#include "applied_files.h"
#include "testkit.h"

namespace {

class ExplainTest : public testkit::IndexFixture {
protected:
    // A queue line of the music share: `inside` and, for event 256, `old` beneath the share.
    std::string Record(const std::string& inside, int event = 1, const std::string& old = "") const {
        return "{\"event\":" + std::to_string(event) + ",\"path\":\"" + music_ + inside + "\"" +
               (old.empty() ? "" : ",\"path_old\":\"" + music_ + old + "\"") + "}\n";
    }
    Json::Value Explain(const std::string& path) {
        Json::Value out;
        EXPECT_TRUE(ExplainPath(path, out));
        return out;
    }
};

// One table drives both: the explanation's verdict is CanPathBeIndexed's, and it names the rule and
// the problem in words.
TEST_F(ExplainTest, NamesTheRefusingRuleAndAgreesWithCanPathBeIndexed) {
    struct Case {
        std::string path;
        std::function<void()> setUp;
        Json::Value refusedBy;
        std::string problem;  // the start of the words; empty when indexable
    };
    const auto share = [this](const std::string& name, const char* props) {
        return [this, name, props] { MakeDir(AddShare(name, J(props)) + "/d"); };
    };
    const std::vector<Case> cases = {
        {"/music/a", [] {}, Json::Value(), ""},
        {"/music/#recycle/x", [this] { MakeDir(music_ + "/#recycle/x"); }, "recycle_bin", "the path lies in the share's recycle bin"},
        {"/music/#snapshot/x", [this] { MakeDir(music_ + "/#snapshot/x"); }, "snapshot", "the path lies in a snapshot"},
        {"/unknownfs/d", share("unknownfs", R"({"fs_type": -1})"), "file_system", "its file system is unknown (type -1)"},
        {"/remote/d", share("remote", R"({"fs_type": 21})"), "file_system", "its file system is remote (type 21)"},
        {"/image/d", share("image", R"({"fs_type": 31})"), "file_system", "its file system is image (type 31)"},
        {"/twelve/d", share("twelve", R"({"fs_type": 12})"), "file_system", "its file system is never indexed (type 12)"},
        {"/nosuch/d", [] {}, "share_path", "no share is named \"nosuch\""},
        {"/surveillance/d", share("surveillance", "{}"), "skipped_share_name", "share \"surveillance\" is never indexed"},
        {"/NetBackup/d", share("NetBackup", "{}"), "skipped_share_name", "share \"NetBackup\" is never indexed"},
        {"/netbackup/d", share("netbackup", "{}"), Json::Value(), ""},
        {"/twenty/d", share("twenty", R"({"fs_type": 20})"), "file_system", "its file system is remote (type 20)"},
        {"/music/b", [] { qira_sim::InjectFault("QIRAGetFSType", 0x10); }, "file_system", "its file system is unknown (type -1)"},
        {"/music/c", [] { qira_sim::InjectFault("QLIBShareIsReadOnlyGet", 0x20); }, "read_only_share",
         "the read-only flag of share \"music\" cannot be read"},
        {"/locked/d", share("locked", R"({"encrypted": true})"), "encrypted_share", "share \"locked\" is encrypted"},
        {"/frozen/d", share("frozen", R"({"read_only": true})"), "read_only_share", "share \"frozen\" is read-only"},
        {"/sealed/d", share("sealed", R"({"encrypted": true, "read_only": true})"), "encrypted_share", "share \"sealed\" is encrypted"},
        {"/music/#recycle/.x", [this] { MakeDir(music_ + "/#recycle/.x"); }, "recycle_bin", "the path lies in the share's recycle bin"},
        {"/music/mnt", [this] {
             MakeDir(music_ + "/mnt");
             qira_sim::PutShare("music", music_, J("{\"mount_points\": [\"" + music_ + "/mnt\"]}"));
         }, "mount_point", "the path is a mount point in a share without encryption"},
        {"/music/link", [this] { ASSERT_EQ(symlink((music_ + "/a").c_str(), (music_ + "/link").c_str()), 0); },
         "canonical_path", "it is not its own real path, " + music_ + "/a: a symbolic link"},
        {"/music/a/@tmp/x", [this] { MakeDir(music_ + "/a/@tmp/x"); }, "entry", "a component is a system name"},
        {"/music/a/.DS_Store", [this] { MakeDir(music_ + "/a/.DS_Store"); }, "entry", "a component is a system name"},
        {"/music" + testkit::Deep(64), [this] { MakeDir(music_ + testkit::Deep(64)); }, Json::Value(), ""},
        {"/music" + testkit::Deep(65), [this] { MakeDir(music_ + testkit::Deep(65)); }, "entry", "too deep: more than 64 levels"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.path);
        qira_sim::ClearFaults();
        c.setUp();
        const Json::Value out = Explain(c.path);
        EXPECT_EQ(out["refused_by"], c.refusedBy);
        EXPECT_EQ(out["problem"].isNull() ? "" : out["problem"].asString().substr(0, c.problem.size()), c.problem);
        EXPECT_EQ(out["indexable"].asBool(), c.refusedBy.isNull());
        EXPECT_EQ(CanPathBeIndexed(c.path), c.refusedBy.isNull() || c.refusedBy == "entry");
        std::string order, verdicts;  // every rule in its order, the daemon's entry rules last
        for (const auto& rule : out["rules"]) {
            order += rule["rule"].asString() + " ";
            verdicts += rule["verdict"].asString().substr(0, 1);
        }
        EXPECT_EQ(order, "share_path recycle_bin snapshot file_system share_of_path share_record skipped_share_name "
                         "encrypted_share read_only_share mount_point canonical_path entry ");
        if (c.refusedBy == "share_path") {
            EXPECT_EQ(verdicts, "r" + std::string(11, 'n'));
        }
    }
}

TEST_F(ExplainTest, TellsTheGoverningFolderByTheLastMatchAndWhatIsPending) {
    // A folder whose share is gone governs nothing; a folder governs on a slash boundary.
    testkit::WriteFile(FolderConf(), R"({"/music": {"name": "all", "audio": true}, "/music/a": {"name": "a", "photo": true},
                                         "/gone/x": {}})");
    MakeDir(music_ + "/@eaDir");
    testkit::WriteFile(QueueOf("music"), "{\"event\":1,\"path\":\"" + music_ + "/a/b/x\"}\nnot json\n{\"event\":1,\"path\":\"" +
                                             music_ + "/ab\"}\n");
    testkit::WriteFile(QueueOf("music") + ".tmp", "{\"event\":1,\"path\":\"" + music_ + "/a/b\"}\n");
    const Json::Value inner = Explain("/music/a/b");
    EXPECT_EQ(inner["governing_folder"], J(R"({"path": "/music/a", "name": "a", "document": false, "audio": false,
                                              "video": false, "photo": true})"));
    EXPECT_TRUE(inner["inside_indexed_folder"].asBool());
    EXPECT_FALSE(inner["contains_indexed_folder"].asBool());
    EXPECT_EQ(inner["pending"], J(R"({"queue": 1, "companion": 1, "unread": [], "wrong_kind": {}})"));
    EXPECT_EQ(inner["status"].asString(), "processing");
    EXPECT_EQ(Explain("/music/c")["governing_folder"]["name"].asString(), "all");
    EXPECT_EQ(Explain("/music/ab")["governing_folder"]["name"].asString(), "all");
    EXPECT_TRUE(Explain("/music")["contains_indexed_folder"].asBool());
    EXPECT_TRUE(Explain("/photo/a")["governing_folder"].isNull());
}

// A new file is queued as created, then written: one file, two records.
TEST_F(ExplainTest, ProgressCountsLinesPerShareAndRecordsAndFilesPerFolder) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}, "/music/a/b": {}, "/music/c": {}, "/photo/a": {}})");
    MakeDir(music_ + "/@eaDir");
    testkit::WriteFile(QueueOf("music"), Record("/a/x") + Record("/a/x", 2) + Record("/a/b/y") + "garbage\n" + Record("/ab") +
                                             Record("/elsewhere", 256, "/c/z") + Record("/a", 256, "/a/q"));
    testkit::WriteFile(QueueOf("music") + ".tmp", Record("/c") + "{\"event\":1}");
    Json::Value out;
    ASSERT_TRUE(GetProgress(out));
    EXPECT_EQ(out["pause"], J(R"({"paused": false, "resume_time": -1})"));
    ASSERT_EQ(out["shares"].size(), 2u);
    EXPECT_EQ(out["shares"][0], J(R"({"share": "music", "queue": 7, "companion": 2, "pending": 9, "files": 6, "unread": [],
        "folders": [{"path": "/music/a", "pending": 4, "files": 3}, {"path": "/music/a/b", "pending": 1, "files": 1},
                    {"path": "/music/c", "pending": 2, "files": 2}]})"));
    EXPECT_EQ(out["shares"][1]["pending"].asUInt(), 0u);
    EXPECT_EQ(testkit::LogMessages(), (std::vector<std::string>{"Malformed command: garbage", "Malformed command: {\"event\":1}"}));
    testkit::ClearLog();
    ASSERT_TRUE(GetProgress(out));
    EXPECT_TRUE(testkit::LogLines().empty());  // each malformed line is logged once per process
    const long long later = time(nullptr) + 3600;
    for (const auto& [resume, paused] : std::vector<std::pair<long long, bool>>{{0, true}, {1, false}, {later, true}, {-1, false}}) {
        testkit::WriteFile(StatusConf(), "{\"resume_time\": " + std::to_string(resume) + "}");
        ASSERT_TRUE(GetProgress(out));
        EXPECT_EQ(out["pause"], J("{\"paused\": " + std::string(paused ? "true" : "false") + ", \"resume_time\": " + std::to_string(resume) + "}"));
    }
}

}  // namespace

// What the daemon stand-in counts applied of a companion is what the report counts pending in it,
// per folder too (a rename's old path included), and a new companion is counted afresh.
TEST_F(ExplainTest, TheDaemonCountsAppliedFilesAsTheReportCountsThemPending) {
    testkit::WriteFile(FolderConf(), R"({"/music/a": {}, "/music/c": {}})");
    MakeDir(music_ + "/@eaDir");
    const std::string companion = QueueOf("music") + ".tmp";
    testkit::WriteFile(companion, Record("/a/x") + Record("/a/x", 2) + Record("/elsewhere", 256, "/c/z") + Record("/a/y") +
                                      Record("/c"));
    Json::Value out;
    ASSERT_TRUE(GetProgress(out));
    const Json::Value& music = out["shares"][0];
    ASSERT_EQ(music["files"].asUInt64(), 4u);
    fileindexd_ref::Batch batch;
    ASSERT_EQ(ReadQueueRecords(companion, [&](const QueueRecordView& record) { batch.push_back(record); }, [](off_t, size_t) {}),
              QueueReading::Read);
    std::vector<Folder> folders;
    ASSERT_TRUE(IndexMgr::List(folders));
    fileindexd_ref::AppliedFiles applied;
    for (int companions = 1; companions <= 2; ++companions) {
        applied.Count(batch, folders, true);
        EXPECT_EQ(applied.Files(), music["files"].asUInt64()) << companions;
        for (const auto& folder : music["folders"]) {
            const auto found = applied.PerFolder().find(folder["path"].asString());
            EXPECT_EQ(folder["files"].asUInt64(), 2u) << folder["path"].asString();
            EXPECT_EQ(found == applied.PerFolder().end() ? 0 : found->second, folder["files"].asUInt64()) << folder["path"].asString() << companions;
        }
    }
}

// A path seen again among the last kRecentFiles new files is the same file; further back, a new
// change. Repeats do not push older files out.
TEST(FileChangesTest, ARepeatIsOneFileWithinTheRecentOnesAndANewChangeBeyond) {
    const auto others = [](size_t n) {
        std::vector<std::string> paths;
        for (size_t i = 0; i < n; ++i) paths.push_back("/v/" + std::to_string(i));
        return paths;
    };
    const auto around = [](std::vector<std::string> between) {
        between.insert(between.begin(), "/v/a");
        between.push_back("/v/a");
        return between;
    };
    const size_t recent = FileChanges::kRecentFiles;
    std::vector<std::string> full = others(recent);
    full.push_back(full.back());  // the newest, in the window's last place
    const std::vector<std::pair<std::vector<std::string>, size_t>> cases = {
        {around({}), 1},
        {full, recent},
        {around(others(recent - 1)), recent},
        {around(others(recent)), recent + 2},
        {around(std::vector<std::string>(3 * recent, "/v/b")), 2},
    };
    for (const auto& [paths, files] : cases) {
        FileChanges changes;
        size_t counted = 0;
        for (const auto& path : paths) counted += changes.IsNewFile(path) ? 1 : 0;
        EXPECT_EQ(counted, files) << paths.size();
    }
}
