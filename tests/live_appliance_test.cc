// The live appliance end to end: the notification stand-in watches what the library registers,
// the daemon stand-in indexes what the queues report, and a search finds it. Every wait is for the
// event itself; what must not happen is shown by a later change that did.
#include "testkit.h"

#include <httplib.h>

#include "daemon_progress.h"
#include "media_fixtures.h"

#include <algorithm>

namespace {

// The notification stand-in watching what the library registers; its records are read from the
// queues before any daemon takes them.
class NotifierTest : public testkit::IndexFixture {
protected:
    void SetUp() override {
        IndexFixture::SetUp();
        notifierLog_ = Path("/notifier.log");
        notifier_ = testkit::Start({QIRANOTIFYD_SIM}, notifierLog_);
        ASSERT_TRUE(testkit::WaitFor([&] { return Logged(notifierLog_, "ready"); }));
    }
    void TearDown() override {
        EXPECT_EQ(testkit::Stop(notifier_), 0) << testkit::ReadFile(notifierLog_);
        IndexFixture::TearDown();
    }
    static bool Logged(const std::string& log, const std::string& text) {
        return testkit::ReadFile(log).find(text) != std::string::npos;
    }
    // Adds the folder with the given switches and waits until the notifier watches it.
    void Index(const std::string& path, const std::string& flags) {
        ASSERT_TRUE(IndexMgr::Upsert(J(R"([{"path": ")" + path + R"(", )" + flags + "}]")));
        std::string fullPath;
        ASSERT_TRUE(GetFullPath(fullPath, path));
        ASSERT_TRUE(testkit::WaitFor([&] { return Logged(notifierLog_, "watching " + fullPath + " ("); }));
    }
    // The queue's records as "event path [path_old]".
    std::vector<std::string> Records(const std::string& share) {
        std::vector<std::string> records;
        for (const auto& record : Queue(share)) {
            records.push_back(std::to_string(record["event"].asUInt()) + " " + record["path"].asString() +
                              (record.isMember("path_old") ? " " + record["path_old"].asString() : ""));
        }
        return records;
    }
    bool Holds(const std::string& share, const std::string& record) {
        const auto records = Records(share);
        return std::find(records.begin(), records.end(), record) != records.end();
    }

    std::string notifierLog_;
    pid_t notifier_ = -1;
};

// Beside the notifier, the daemon stand-in indexes what the queues report.
class LiveApplianceTest : public NotifierTest {
protected:
    void SetUp() override {
        NotifierTest::SetUp();
        daemon_.reset();
        daemonLog_ = Path("/daemon.log");
        // A file that keeps the worker busy ends at the CPU limit, however slow the machine.
        indexer_ = testkit::Start({FILEINDEXD_REF, "--interval", "20", "--extract-cpu", "1", "--extract-deadline", "600000"}, daemonLog_);
        ASSERT_TRUE(testkit::WaitFor([&] { return Logged(daemonLog_, "listening on"); }));
    }
    void TearDown() override {
        if (indexer_ > 0) { EXPECT_EQ(testkit::Stop(indexer_), 0) << testkit::ReadFile(daemonLog_); }
        NotifierTest::TearDown();
    }
    std::vector<std::string> Search(const std::vector<std::string>& extra) {
        std::vector<std::string> args = {FILEINDEXCTL, "--json", "search"};
        args.insert(args.end(), extra.begin(), extra.end());
        const Json::Value answer = testkit::ParseJson(testkit::Run(args).out);
        std::vector<std::string> paths;
        for (const auto& hit : answer["result"]["hits"]) paths.push_back(hit["path"].asString());
        return paths;
    }
    // Pauses the daemon and queues `count` records of files missing from /music/a behind the
    // music share's queue.
    void PauseAndQueueFlood(int count) {
        ASSERT_TRUE(StatusMgr::Pause(0));
        ASSERT_TRUE(testkit::WaitFor([&] { return Logged(daemonLog_, "\"type\":\"pause\""); }));
        std::string flood;
        for (int i = 0; i < count; ++i) flood += "{\"event\":2,\"path\":\"" + music_ + "/a/gone" + std::to_string(i) + ".txt\"}\n";
        testkit::WriteFile(QueueOf("music"), testkit::ReadFile(QueueOf("music")) + flood);
    }
    // Restarts the daemon applying at most 1000 records a share and pass, so that a flood is
    // served in turns counted in records: a fast machine applies one within a single time slice.
    void RestartPaced() {
        ASSERT_EQ(testkit::Stop(indexer_), 0);
        daemonLog_ = Path("/daemon-paced.log");
        indexer_ = testkit::Start({FILEINDEXD_REF, "--interval", "20", "--pace", "1000"}, daemonLog_);
        ASSERT_TRUE(testkit::WaitFor([&] { return Logged(daemonLog_, "listening on"); }));
    }
    // Waits until the search finds exactly `paths`, in any order.
    bool Finds(const std::string& query, std::vector<std::string> paths) {
        std::sort(paths.begin(), paths.end());
        return testkit::WaitFor([&] {
            std::vector<std::string> found = Search({query, "--limit", "100"});
            std::sort(found.begin(), found.end());
            return found == paths;
        });
    }

    std::string daemonLog_;
    pid_t indexer_ = -1;
};

using Paths = std::vector<std::string>;

// A file is found while it is there, under its new name once moved; a directory made and filled
// later is watched and indexed, and moves with its tree.
TEST_F(LiveApplianceTest, FilesAndDirectoriesAreFoundWhileTheyAreThereAndWhereTheyMoved) {
    Index("/music/a", R"("document": true)");
    testkit::WriteFile(music_ + "/a/notes.txt", "the needle in the haystack");
    EXPECT_TRUE(Finds("needle", Paths{"/music/a/notes.txt"}));
    ASSERT_EQ(rename((music_ + "/a/notes.txt").c_str(), (music_ + "/a/moved.txt").c_str()), 0);
    EXPECT_TRUE(Finds("needle", Paths{"/music/a/moved.txt"}));
    ASSERT_EQ(unlink((music_ + "/a/moved.txt").c_str()), 0);
    EXPECT_TRUE(Finds("needle", Paths{}));
    MakeDir(music_ + "/a/new/deeper");
    testkit::WriteFile(music_ + "/a/new/deeper/deep.md", "written after the registration");
    EXPECT_TRUE(Finds("registration", Paths{"/music/a/new/deeper/deep.md"}));
    ASSERT_EQ(rename((music_ + "/a/new").c_str(), (music_ + "/a/old").c_str()), 0);
    testkit::WriteFile(music_ + "/a/old/deeper/later.txt", "registration again");  // the moved tree is still watched
    EXPECT_TRUE(Finds("registration", (Paths{"/music/a/old/deeper/deep.md", "/music/a/old/deeper/later.txt"})));
}

// Files under "@eaDir", outside indexed folders, and of a kind the folder does not index never
// reach the index, nor do those of a deleted folder, whose entries leave it: a later file that did
// shows that their changes were seen and passed over.
TEST_F(LiveApplianceTest, EaDirOutsideFoldersSwitchedOffKindsAndDeletedFoldersStayOut) {
    Index("/music/a", R"("document": true, "audio": false)");
    Index("/music/c", R"("document": true)");
    MakeDir(music_ + "/a/@eaDir/inner");
    testkit::WriteFile(music_ + "/a/@eaDir/inner/hidden.txt", "secret");
    testkit::WriteFile(music_ + "/b/outside.txt", "secret");
    testkit::WriteFile(music_ + "/a/secret.mp3", "");
    testkit::WriteFile(music_ + "/c/before.txt", "secret");
    testkit::WriteFile(music_ + "/a/sentinel.txt", "secret");
    EXPECT_TRUE(Finds("secret", (Paths{"/music/a/sentinel.txt", "/music/c/before.txt"})));
    ASSERT_TRUE(IndexMgr::Delete(J(R"(["/music/c"])")));
    ASSERT_TRUE(testkit::WaitFor([&] { return Logged(notifierLog_, "no longer watching " + music_ + "/c\n"); }));
    testkit::WriteFile(music_ + "/c/after.txt", "secret");
    ASSERT_TRUE(IndexMgr::Upsert(J(R"([{"path": "/music/a", "audio": true}])")));  // the switch turned on
    EXPECT_TRUE(Finds("secret", (Paths{"/music/a/secret.mp3", "/music/a/sentinel.txt"})));
}

// The notifier watches as deep as the index reaches and no deeper, and says so once; a file past
// the bound stays out of the index, one at the bound is found.
TEST_F(LiveApplianceTest, TreesDeeperThanTheBoundAreNeitherWatchedNorIndexed) {
    const std::string deep = "/a" + testkit::Deep(MaxEntryDepth() - 2);
    MakeDir(music_ + deep + "/e/f");  // e lies at the bound, f past it
    MakeDir(music_ + deep + "/e2");
    Index("/music/a", R"("document": true)");
    for (const std::string& file : {deep + "/at-the-bound.txt", deep + "/e/past-the-bound.txt", deep + "/e/f/further.txt", std::string("/a/sentinel.txt")}) {
        testkit::WriteFile(music_ + file, "abyss");
    }
    EXPECT_TRUE(Finds("abyss", Paths{"/music" + deep + "/at-the-bound.txt", "/music/a/sentinel.txt"}));
    // Once per folder, naming a directory at the bound.
    const std::string log = testkit::ReadFile(notifierLog_);
    EXPECT_EQ(testkit::CountOf(log, "or anything deeper than 64 levels"), 1u);
    EXPECT_EQ(testkit::CountOf(log, music_ + deep + "/e or") + testkit::CountOf(log, music_ + deep + "/e2 or"), 1u) << log;
}

// A link in place of a share's "@eaDir" leads none of its records into the other share's queue,
// where the daemon would have to refuse them.
TEST_F(LiveApplianceTest, ALinkedEaDirLeadsNoRecordIntoAnotherSharesQueue) {
    Index("/music/a", R"("document": true)");
    Index("/photo/a", R"("document": true)");
    ASSERT_EQ(rename((music_ + "/@eaDir").c_str(), (music_ + "/b/moved-away").c_str()), 0);
    ASSERT_EQ(symlink((photo_ + "/@eaDir").c_str(), (music_ + "/@eaDir").c_str()), 0);
    testkit::WriteFile(music_ + "/a/lost.txt", "linked");
    testkit::WriteFile(photo_ + "/a/found.txt", "linked");
    EXPECT_TRUE(Finds("linked", Paths{"/photo/a/found.txt"}));
    EXPECT_FALSE(Logged(daemonLog_, "records refused")) << testkit::ReadFile(daemonLog_);
}

// Shares are served in turn: a file written into one share is applied between slices of a flood
// of records in another, not after it.
TEST_F(LiveApplianceTest, AFloodInOneShareDoesNotHoldAnotherBack) {
    RestartPaced();
    Index("/music/a", R"("document": true)");
    Index("/photo/a", R"("document": true)");
    PauseAndQueueFlood(50000);
    testkit::WriteFile(photo_ + "/a/found.txt", "served");
    ASSERT_TRUE(testkit::WaitFor([&] { return testkit::ReadFile(QueueOf("photo")).find("found.txt") != std::string::npos; }));
    const size_t before = testkit::ReadFile(daemonLog_).size();
    ASSERT_TRUE(StatusMgr::Resume());
    ASSERT_TRUE(testkit::WaitFor([&] { return testkit::RecordsApplied(testkit::ReadFile(daemonLog_).substr(before), "music") >= 50000; }));
    const std::string log = testkit::ReadFile(daemonLog_).substr(before);
    const size_t photo = log.find("share photo: ");
    ASSERT_NE(photo, std::string::npos) << log;
    EXPECT_LT(photo, log.rfind("share music: ")) << log;  // music was served again after photo
    EXPECT_TRUE(Finds("served", Paths{"/photo/a/found.txt"}));
    // Nothing taken is left once the daemon has published after the flood's last slice (it logs
    // the slice first).
    Json::Value published;
    ASSERT_TRUE(testkit::WaitFor([&] {
        published = tools::ReadDaemonProgress()["shares"]["music"];
        return published["applied"].asUInt64() == 0u && published["applied_files"].asUInt64() == 0u &&
               published["folders"]["/music/a"]["applied_files"].asUInt64() == 0u;
    }));
    EXPECT_GE(published["up_to_date"].asInt64(), static_cast<Json::Int64>(time(nullptr)) - 600);
    EXPECT_TRUE(published["folders"]["/music/a"]["up_to_date"].isInt64());  // brought up to date in the flood
}

// SIGTERM stops the daemon amid a flood rather than after draining it.
TEST_F(LiveApplianceTest, TheDaemonStopsAmidAFlood) {
    RestartPaced();
    Index("/music/a", R"("document": true)");
    PauseAndQueueFlood(200000);
    const size_t before = testkit::ReadFile(daemonLog_).size();
    ASSERT_TRUE(StatusMgr::Resume());
    ASSERT_TRUE(testkit::WaitFor([&] { return testkit::RecordsApplied(testkit::ReadFile(daemonLog_).substr(before), "music") > 0; }));
    EXPECT_EQ(testkit::Stop(indexer_), 0);
    indexer_ = -1;
    const std::string log = testkit::ReadFile(daemonLog_).substr(before);
    EXPECT_LT(testkit::RecordsApplied(log, "music"), 200000u);
    // What it published tells how far it got with the batch it had taken, so the batch never looks
    // frozen; the files it applied are those the report counts pending, as the tools take them off.
    const unsigned long long applied = testkit::RecordsApplied(log, "music");
    EXPECT_EQ(tools::ReadDaemonProgress()["shares"]["music"]["applied"].asUInt64(), applied);
    Json::Value progress;
    ASSERT_TRUE(GetProgress(progress));
    Json::Value& music = progress["shares"][0];
    tools::AddDaemonProgress(music, tools::ReadDaemonProgress());
    const unsigned long long left = music["pending"].asUInt64() - applied;  // every record a file of its own
    EXPECT_EQ(music["files_left"].asUInt64(), left);
    EXPECT_EQ(music["folders"][0]["files_left"].asUInt64(), left);
    EXPECT_NE(log.find("fileindexd-ref: stopped"), std::string::npos);
}

// Changes the kernel dropped are recovered by reindex records for every registered folder.
TEST_F(LiveApplianceTest, AnOverflowLeadsToReindexRecordsAndACompleteIndexAgain) {
    Index("/music/a", R"("document": true)");
    ASSERT_EQ(kill(notifier_, SIGSTOP), 0);
    int status = 0;
    ASSERT_EQ(waitpid(notifier_, &status, WUNTRACED), notifier_);
    Paths expected;
    for (int i = 0; i < 20; ++i) {
        const std::string name = "/a/lost" + std::to_string(100 + i) + ".txt";
        testkit::WriteFile(music_ + name, "overflowed");
        expected.push_back("/music" + name);
    }
    ASSERT_EQ(kill(notifier_, SIGUSR1), 0);  // throws the pending events away when it runs again
    ASSERT_EQ(kill(notifier_, SIGCONT), 0);
    ASSERT_TRUE(testkit::WaitFor([&] { return Logged(notifierLog_, "queued a reindex of " + music_ + "/a"); }));
    EXPECT_TRUE(Logged(notifierLog_, "raise fs.inotify.max_queued_events"));
    EXPECT_TRUE(Finds("overflowed", expected));
}

// A song is found by its artist, a PDF by a sentence inside, a photo by its camera, whatever their
// names; a damaged file is found by its name, with the reason in the log, and the rest goes on.
TEST_F(LiveApplianceTest, WhatFilesHoldIsFoundAndADamagedFileCostsOnlyItsContent) {
    testkit::WriteMp3(music_ + "/a/track01", "So What", "Miles Davis", "Kind of Blue", 1959);
    testkit::WriteFile(music_ + "/a/report.txt", testkit::MakePdf("Quarterly", "Ann", "Revenue grew in the third quarter"));
    testkit::WriteJpeg(music_ + "/a/IMG_0001.mp3", "2019:06:14 10:20:30", "FUJIFILM", "X-T3");  // its content decides
    testkit::WriteFile(music_ + "/a/broken.pdf", testkit::MakePdf("T", "A", "never read").substr(0, 40));
    testkit::WriteFile(music_ + "/a/endless.pdf", testkit::MakeEndlessPdf());
    testkit::WriteFile(music_ + "/a/exif.jpg", testkit::MakeJpegWithExif(5000, 0));
    testkit::WriteVideo(music_ + "/a/clip.bin", 3, "Beach");
    Index("/music/a", R"("document": true, "audio": true, "photo": true, "video": true)");
    EXPECT_TRUE(Finds("davis kind", Paths{"/music/a/track01"}));
    EXPECT_TRUE(Finds("revenue third quarter", Paths{"/music/a/report.txt"}));
    EXPECT_TRUE(Finds("fujifilm", Paths{"/music/a/IMG_0001.mp3"}));
    EXPECT_TRUE(Finds("broken", Paths{"/music/a/broken.pdf"}));
    for (const std::string problem : {"broken.pdf: indexed by name only: the PDF cannot be read",
                                      "endless.pdf: indexed by name only: the extractor ran past its CPU time limit",
                                      "exif.jpg: indexed by name only: the photo's metadata cannot be read"}) {
        EXPECT_TRUE(Logged(daemonLog_, "share music: /music/a/" + problem + "\n")) << problem << testkit::ReadFile(daemonLog_);
    }
    EXPECT_EQ(Search({"endless"}), Paths{"/music/a/endless.pdf"});
    EXPECT_EQ(Search({"exif", "type:photo"}), Paths{"/music/a/exif.jpg"});
    EXPECT_EQ(Search({"davis", "--type", "audio"}), Paths{"/music/a/track01"});
    // Filters, the fields of each kind, and the counts per type and camera.
    EXPECT_EQ(Search({"taken:2019-06", "camera:fuji", "type:photo"}), Paths{"/music/a/IMG_0001.mp3"});
    EXPECT_EQ(Search({"artist:davis", "year:1959"}), Paths{"/music/a/track01"});
    EXPECT_EQ(Search({"beach", "duration:2..3"}), Paths{"/music/a/clip.bin"});
    const std::string text = testkit::Run({FILEINDEXCTL, "search", "type:audio", "--facets"}).out;
    EXPECT_NE(text.find("So What, Miles Davis, Kind of Blue, 1959, 0:01"), std::string::npos) << text;
    EXPECT_NE(text.find("\ntype: audio 1\nyear: 1959 1\nartist: Miles Davis 1\n"), std::string::npos) << text;
    // Explain tells the kind the content gave, what was read, and why no more was.
    const Json::Value song = testkit::ParseJson(testkit::Run({FILEINDEXCTL, "--json", "explain", "/music/a/track01"}).out)["result"];
    EXPECT_EQ(song["verdict"], "in the index");
    EXPECT_EQ(song["file"]["type"], "audio");
    EXPECT_EQ(song["file"]["fields"]["artist"], "Miles Davis");
    EXPECT_TRUE(song["file"]["extraction_problem"].isNull());
    EXPECT_NE(testkit::Run({FILEINDEXCTL, "explain", "/music/a/track01"}).out.find(
                  "\nread from it: album Kind of Blue, artist Miles Davis, duration 1, title So What, year 1959\n"),
              std::string::npos);
    const std::string broken = testkit::Run({FILEINDEXCTL, "explain", "/music/a/broken.pdf"}).out;
    EXPECT_NE(broken.find("in the index: yes\nindexed by name only: the PDF cannot be read\n"), std::string::npos) << broken;
    const auto bad = testkit::Run({FILEINDEXCTL, "search", "year:19x9"});
    EXPECT_EQ(bad.status, 2);
    EXPECT_NE(bad.err.find("BAD_QUERY: \"year:19x9\": give a whole number"), std::string::npos) << bad.err;
    // A kind switched off leaves the index, though the name told no kind; switched on, it comes back.
    ASSERT_TRUE(IndexMgr::Upsert(J(R"([{"path": "/music/a", "audio": false}])")));
    EXPECT_TRUE(Finds("davis", Paths{}));
    ASSERT_TRUE(IndexMgr::Upsert(J(R"([{"path": "/music/a", "audio": true}])")));
    EXPECT_TRUE(Finds("davis", Paths{"/music/a/track01"}));
}

// Words are prefixes, accents and case do not matter, a name ranks above a text, and a search
// can keep to one type or one share; the console's API answers the same.
TEST_F(LiveApplianceTest, SearchFindsPrefixesWithoutAccentsBestFirst) {
    testkit::WriteFile(music_ + "/a/Crète.txt", "holidays");
    testkit::WriteFile(music_ + "/a/journal.txt", "a week in crete");
    testkit::WriteFile(music_ + "/a/crete.mp3", "");
    testkit::WriteFile(photo_ + "/a/crete.jpg", "");
    // Distinct times, the newest in the other share: the order by date runs across the shares.
    time_t when = 1600000000;
    for (const std::string& file : {music_ + "/a/crete.mp3", music_ + "/a/Crète.txt", music_ + "/a/journal.txt", photo_ + "/a/crete.jpg"}) {
        const timespec times[2] = {{when, 0}, {when, 0}};
        ASSERT_EQ(utimensat(AT_FDCWD, file.c_str(), times, 0), 0);
        when += 100;
    }
    Index("/music/a", R"("document": true, "audio": true)");
    Index("/photo/a", R"("photo": true)");
    ASSERT_TRUE(testkit::WaitFor([&] { return Search({"CRE"}).size() == 4; }));
    ASSERT_TRUE(testkit::WaitFor([&] {  // the banner counts what the indexes hold once the queues are drained
        return testkit::ParseJson(testkit::Run({FILEINDEXCTL, "--json", "service", "status"}).out)["result"]["banner"]["text"] ==
               "Up to date: 4 files indexed";
    }));
    Paths all = Search({"CRE"});
    EXPECT_EQ(all.back(), "/music/a/journal.txt");  // a match in the text ranks below those in names
    std::sort(all.begin(), all.end());
    EXPECT_EQ(all, (Paths{"/music/a/Crète.txt", "/music/a/crete.mp3", "/music/a/journal.txt", "/photo/a/crete.jpg"}));
    EXPECT_EQ(Search({"cret", "--type", "document"}), (Paths{"/music/a/Crète.txt", "/music/a/journal.txt"}));
    EXPECT_EQ(Search({"cret", "--share", "photo"}), Paths{"/photo/a/crete.jpg"});
    EXPECT_EQ(Search({"week", "cre"}), Paths{"/music/a/journal.txt"});
    const Paths newestFirst = {"/photo/a/crete.jpg", "/music/a/journal.txt", "/music/a/Crète.txt", "/music/a/crete.mp3"};
    EXPECT_EQ(Search({"cre", "--sort", "date"}), newestFirst);
    const auto text = testkit::Run({FILEINDEXCTL, "search", "week"});
    EXPECT_NE(text.out.find("/music/a/journal.txt  document  15"), std::string::npos) << text.out;
    EXPECT_NE(text.out.find("a [week] in crete\n(1 found)"), std::string::npos) << text.out;
    EXPECT_EQ(testkit::Run({FILEINDEXCTL, "search", "\"\""}).status, 2);

    pid_t web = -1;
    httplib::Client client("127.0.0.1", testkit::StartListening({FILEINDEX_WEB, "--listen", "127.0.0.1:0"}, Path("/web.log"), web));
    const httplib::Headers token = {{"X-Fileindex-Token", testkit::ReadFile(Path("/usr/qira/etc/fileindex/web.token")).substr(0, 64)}};
    EXPECT_EQ(client.Get("/api/search?q=week")->status, 403);  // a search reads the files' text: the token only
    std::string changed = token.begin()->second;
    changed[0] = changed[0] == '0' ? '1' : '0';
    EXPECT_EQ(client.Get("/api/search?q=week", {{"X-Fileindex-Token", changed}})->status, 403);
    const auto found = client.Get("/api/search?q=week&type=document", token);
    ASSERT_TRUE(found);
    const Json::Value hit = testkit::ParseJson(found->body)["result"]["hits"][0];
    EXPECT_EQ(hit["path"].asString(), "/music/a/journal.txt");
    EXPECT_EQ(hit["snippet"], J(R"([{"text": "a ", "match": false}, {"text": "week", "match": true},
                                    {"text": " in crete", "match": false}])"));
    EXPECT_EQ(client.Get("/api/search?q=", token)->status, 400);
    EXPECT_EQ(client.Get("/api/search?q=cre&sort=size", token)->status, 400);
    const Json::Value dated = testkit::ParseJson(client.Get("/api/search?q=cre&sort=date", token)->body)["result"]["hits"];
    Paths byDate;
    for (const auto& hit : dated) byDate.push_back(hit["path"].asString());
    EXPECT_EQ(byDate, newestFirst);
    EXPECT_EQ(client.Get("/api/search?q=crete&share=nosuch", token)->status, 404);
    for (int i = 0; i < 201; ++i) testkit::WriteFile(photo_ + "/a/many" + std::to_string(i) + ".jpg", "");
    ASSERT_TRUE(testkit::WaitFor([&] { return Search({"many", "--limit", "1000"}).size() == 201; }));
    const Json::Value capped = testkit::ParseJson(client.Get("/api/search?q=many&limit=1000", token)->body)["result"];
    EXPECT_EQ(capped["hits"].size(), 200u);
    EXPECT_EQ(capped["total"].asInt(), 201);
    EXPECT_EQ(testkit::ParseJson(client.Get("/api/search?q=many&offset=200", token)->body)["result"]["hits"].size(), 1u);
    EXPECT_EQ(client.Get("/api/search?q=many&offset=10001", token)->status, 400);
    EXPECT_EQ(testkit::Stop(web), 0);
}

// A link in place of a queue is not written through: the folder's share is marked for a full
// reindex instead.
TEST_F(NotifierTest, ALinkedQueueIsNotWrittenThroughAndItsShareIsMarked) {
    Index("/music/a", R"("document": true)");
    testkit::WriteFile(Path("/outside"), "");
    unlink(QueueOf("music").c_str());
    ASSERT_EQ(symlink(Path("/outside").c_str(), QueueOf("music").c_str()), 0);
    testkit::WriteFile(music_ + "/a/f.txt", "x");
    const std::string marked = "its queue " + QueueOf("music") + " could not be written: marked for a full reindex the share of ";
    ASSERT_TRUE(testkit::WaitFor([&] { return Logged(notifierLog_, marked + music_ + "/a"); })) << testkit::ReadFile(notifierLog_);
    EXPECT_EQ(testkit::ReadFile(Path("/outside")), "");
}

// A move inside one queue's trees is one record with its old path, between two folders of the
// share too; a move to another share's queue is a deletion in one and a creation in the other. A
// directory made later is watched, and so are its own directories, under their new path once
// moved; moving one out stops watching it alone, not a sibling sharing its prefix. Names on the
// ignore list are never reported, whenever they appear.
TEST_F(NotifierTest, MovesCarryTheirOldPathLaterDirectoriesAreWatchedIgnoredNamesNeverReported) {
    MakeDir(music_ + "/a/live");
    MakeDir(music_ + "/a/live-2023");
    for (const char* folder : {"/music/a", "/music/b", "/photo/a"}) Index(folder, R"("document": true)");
    testkit::WriteFile(music_ + "/a/f.txt", "x");
    for (const auto& [from, to] : std::vector<std::pair<std::string, std::string>>{
             {music_ + "/a/f.txt", music_ + "/a/g.txt"}, {music_ + "/a/g.txt", music_ + "/b/g.txt"},
             {music_ + "/b/g.txt", photo_ + "/a/g.txt"}, {music_ + "/a/live", music_ + "/c/live"}}) {
        ASSERT_EQ(rename(from.c_str(), to.c_str()), 0) << from;
    }
    MakeDir(music_ + "/a/@eaDir/inner");
    testkit::WriteFile(music_ + "/a/@eaDir/inner/hidden.txt", "x");
    MakeDir(music_ + "/a/later");
    ASSERT_TRUE(testkit::WaitFor([&] { return Holds("music", "1 " + music_ + "/a/later"); }));  // watched by now
    MakeDir(music_ + "/a/later/sub");
    ASSERT_TRUE(testkit::WaitFor([&] { return Holds("music", "1 " + music_ + "/a/later/sub"); }));
    ASSERT_EQ(rename((music_ + "/a/later").c_str(), (music_ + "/a/moved").c_str()), 0);
    testkit::WriteFile(music_ + "/a/moved/sub/h.txt", "x");
    testkit::WriteFile(music_ + "/a/live-2023/y.txt", "x");
    testkit::WriteFile(music_ + "/a/sentinel.txt", "x");
    testkit::WriteFile(photo_ + "/a/sentinel.txt", "x");  // each queue's last record: what came before is there
    ASSERT_TRUE(testkit::WaitFor([&] { return Holds("music", "2 " + music_ + "/a/sentinel.txt") && Holds("photo", "2 " + photo_ + "/a/sentinel.txt"); }));
    EXPECT_TRUE(Holds("photo", "1 " + photo_ + "/a/g.txt"));
    const std::vector<std::pair<std::string, bool>> music = {
        {"256 " + music_ + "/a/g.txt " + music_ + "/a/f.txt", true}, {"256 " + music_ + "/b/g.txt " + music_ + "/a/g.txt", true},
        {"8 " + music_ + "/b/g.txt", true}, {"8 " + music_ + "/a/live", true}, {"2 " + music_ + "/a/moved/sub/h.txt", true},
        {"2 " + music_ + "/a/live-2023/y.txt", true}, {"8 " + music_ + "/a/f.txt", false}, {"8 " + music_ + "/a/g.txt", false},
        {"1 " + music_ + "/a/g.txt", false}, {"1 " + music_ + "/b/g.txt", false}};
    for (const auto& [record, held] : music) EXPECT_EQ(Holds("music", record), held) << record;
    for (const auto& share : {"music", "photo"}) {
        for (const auto& record : Records(share)) {
            EXPECT_EQ(record.find("@eaDir"), std::string::npos) << record;
            EXPECT_EQ(record.rfind("256 ", 0) == 0 && share == std::string("photo"), false) << record;
        }
    }
}

}  // namespace
