// What a share's users can write reaches the daemon stand-in's queue take and record applier, the
// search index and the views as it is: records climbing out of the share, links, FIFOs and foreign
// databases where the index and the queue belong, names with control characters. Nothing outside
// the share is opened (an inotify watch on the canaries tells), nothing blocks, nothing is lost.
#include "testkit.h"

#include <sqlite3.h>

#include <algorithm>
#include <filesystem>
#include <set>

#include "queue_take.h"
#include "search_index.h"
#include "share_indexer.h"
#include "text_safety.h"

namespace {

using fileindexd_ref::Batch;
using testkit::OpenWatch;
using QIRA::FILEINDEX::QueueRecordView;
using Paths = std::set<std::string>;

class HostileShareTest : public testkit::IndexFixture {
protected:
    void SetUp() override {
        IndexFixture::SetUp();
        testkit::WriteFile(FolderConf(), R"({"/music": {"document": true}, "/photo": {"document": true}})");
        ASSERT_TRUE(IndexMgr::List(folders_));
    }
    static QueueRecordView Record(unsigned event, const std::string& path, const std::string& old = "") {
        QueueRecordView record;
        record.event = event;
        record.path = path;
        record.path_old = old;
        return record;
    }
    // The share paths a search of `query` finds in the share's index; every path in it for "".
    Paths Found(const std::string& share, const std::string& query = "") {
        tools::IndexProblem problem;
        std::string error;
        const auto index = tools::SearchIndex::Open(ShareDir(share), false, problem, error);
        std::map<std::string, tools::StoredFile> stored;
        std::vector<tools::SearchHit> hits;
        if (!index || !(query.empty() ? index->Under("/" + share, stored) : index->Search(query, "", 100, hits, error))) {
            return {"(failed: " + error + ")"};
        }
        Paths paths;
        for (const auto& entry : stored) paths.insert(entry.first);
        for (const auto& hit : hits) paths.insert(hit.path);
        return paths;
    }
    std::string DbDir(const std::string& share) { return ShareDir(share) + "/@eaDir/QIRA@.fileindexdb"; }
    std::string IndexFile(const std::string& share) { return DbDir(share) + "/index.sqlite"; }
    // Builds the music share's index afresh and runs `statements` on it.
    void IndexMusicAndRun(const char* statements) {
        ASSERT_TRUE(fileindexd_ref::ShareIndexer("music", &stop_, extractor_).Reindex(folders_));
        sqlite3* db = nullptr;
        ASSERT_EQ(sqlite3_open(IndexFile("music").c_str(), &db), SQLITE_OK);
        EXPECT_EQ(sqlite3_exec(db, statements, nullptr, nullptr, nullptr), SQLITE_OK) << sqlite3_errmsg(db);
        sqlite3_close(db);
    }
    // Names in `dir` starting with `prefix`.
    static size_t CountNamed(const std::string& dir, const std::string& prefix) {
        std::error_code error;
        const auto names = std::filesystem::directory_iterator(dir, error);
        return std::count_if(begin(names), end(names), [&](const auto& e) { return e.path().filename().string().rfind(prefix, 0) == 0; });
    }

    std::vector<QIRA::FILEINDEX::Folder> folders_;
    volatile sig_atomic_t stop_ = 0;
    fileindexd_ref::ExtractorClient extractor_{{FILEINDEX_EXTRACTOR, {}, std::chrono::seconds(30)}};
};

// Every path not canonical beneath the share, at the start, middle or end of a batch and through
// every kind of record, a move's old path included, is refused: the index holds the good records'
// files only, and nothing outside the share, in another share or beside it, is opened.
TEST_F(HostileShareTest, RecordsClimbingOutOfTheShareChangeNothingAndOpenNothingOutside) {
    const std::string outside = Path("/outside");
    MakeDir(outside);
    MakeDir(music_ + "x");
    for (const auto& file : {outside + "/secret.txt", photo_ + "/a/other.txt", music_ + "x/sibling.txt"}) {
        testkit::WriteFile(file, "secret");
    }
    testkit::WriteFile(music_ + "/a/one.txt", "good");
    testkit::WriteFile(music_ + "/b/two.txt", "good");
    const std::vector<std::string> climbing = {
        music_ + "/a/../../../outside/secret.txt", music_ + "/../photo/a/other.txt", music_ + "/..", music_ + "x/sibling.txt",
        outside + "/secret.txt", music_ + "/a/./../../photo", music_ + "//a", music_ + "/a/", music_ + std::string("/a\0/../..", 9),
        "../../outside", ""};
    fileindexd_ref::ShareIndexer indexer("music", &stop_, extractor_);
    OpenWatch watch({outside, photo_ + "/a", music_ + "x"});
    for (const auto& bad : climbing) {
        for (const unsigned event : {1u, 2u, 4u, 8u, 256u, 65536u, 131072u}) {
            for (size_t at = 0; at < 3; ++at) {
                SCOPED_TRACE(bad + " event " + std::to_string(event) + " at " + std::to_string(at));
                Batch batch = {Record(2, music_ + "/a/one.txt"), Record(2, music_ + "/b/two.txt")};
                batch.insert(batch.begin() + static_cast<long>(at), Record(event, bad, event == 256 ? music_ + "/a" : ""));
                batch.push_back(Record(256, music_ + "/c", bad));  // a move from outside moves nothing in
                testing::internal::CaptureStdout();
                EXPECT_TRUE(indexer.Apply(batch, folders_));
                const std::string log = testing::internal::GetCapturedStdout();
                EXPECT_EQ(Found("music"), (Paths{"/music/a/one.txt", "/music/b/two.txt"}));
                EXPECT_EQ(testkit::CountOf(log, "records refused"), 1u) << log;
                EXPECT_EQ(watch.Opened(), std::vector<std::string>{});
            }
        }
    }
}

// The index as a FIFO, a link, a directory, garbage, a cut database, one with a view or a trigger,
// or one of another user: never opened for writing, set aside, the share marked need-reindex and
// a new index made; a search of the thing answers Damaged at once.
TEST_F(HostileShareTest, AnIndexNotOursIsSetAsideAndRebuiltAndSearchSaysItIsDamaged) {
    testkit::WriteFile(music_ + "/a/one.txt", "good");
    ASSERT_TRUE(fileindexd_ref::ShareIndexer("photo", &stop_, extractor_).Reindex(folders_));  // a real index elsewhere, to link to
    const std::string photoIndex = testkit::ReadFile(IndexFile("photo"));
    const auto sql = [this](const char* statements) { return [this, statements] { IndexMusicAndRun(statements); }; };
    struct Case {
        std::string name;
        std::function<void()> plant;
        bool searchRefuses = true;  // a search may read another user's index; only the daemon refuses to write it
    };
    const std::vector<Case> cases = {
        {"a FIFO", [this] { ASSERT_EQ(mkfifo(IndexFile("music").c_str(), 0644), 0); }},
        {"a link to another share's index", [this] { ASSERT_EQ(symlink(IndexFile("photo").c_str(), IndexFile("music").c_str()), 0); }},
        {"a directory", [this] { MakeDir(IndexFile("music")); }},
        {"a file for the database directory", [this] {
             std::filesystem::remove_all(DbDir("music"));
             testkit::WriteFile(DbDir("music"), "x");
         }},
        {"a hard link to another share's index", [this] { ASSERT_EQ(link(IndexFile("photo").c_str(), IndexFile("music").c_str()), 0); }},
        {"garbage", [this] { testkit::WriteFile(IndexFile("music"), std::string(8192, 'x')); }},
        {"a cut database", [this, sql] {
             sql("PRAGMA wal_checkpoint(TRUNCATE); PRAGMA journal_mode=DELETE;")();
             ASSERT_EQ(truncate(IndexFile("music").c_str(), 3000), 0);
         }},
        {"a recursive view for a table", sql("DROP TABLE files; CREATE VIEW files(id, path, type, size, mtime) AS WITH RECURSIVE r(x)"
                                             " AS (SELECT 1 UNION ALL SELECT x + 1 FROM r) SELECT x, '', '', 0, 0 FROM r;")},
        {"a trigger", sql("CREATE TRIGGER t AFTER INSERT ON files BEGIN DELETE FROM files; END;")},
        {"another user's file", [this, sql] {
             sql("")();
             ASSERT_EQ(chown(IndexFile("music").c_str(), 12345, 12345), 0);
         }, false},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        std::filesystem::remove_all(music_ + "/@eaDir");
        MakeDir(DbDir("music"));
        ASSERT_TRUE(StatusMgr::ShareSetNeedReindex("music", false));
        c.plant();
        const int damaged = testkit::RunBounded(10, [this] {
            tools::IndexProblem problem;
            std::string error;
            return !tools::SearchIndex::Open(ShareDir("music"), false, problem, error) && problem == tools::IndexProblem::Damaged;
        });
        EXPECT_EQ(damaged, c.searchRefuses ? 1 : 0);
        testing::internal::CaptureStdout();
        EXPECT_TRUE(fileindexd_ref::ShareIndexer("music", &stop_, extractor_).Apply({Record(2, music_ + "/a/one.txt")}, folders_));
        EXPECT_NE(testing::internal::GetCapturedStdout().find("set aside as"), std::string::npos);
        EXPECT_EQ(CountNamed(DbDir("music"), "index.sqlite.set-aside.") + CountNamed(music_ + "/@eaDir", "QIRA@.fileindexdb.set-aside."), 1u);
        EXPECT_TRUE(StatusMgr::ShareIsNeedReindex("music"));
        EXPECT_EQ(Found("music"), Paths{"/music/a/one.txt"});
        EXPECT_EQ(testkit::ReadFile(IndexFile("photo")), photoIndex);
    }
}

// Corruption met after the checks fails the batch, sets the index aside and marks the share; the
// next batch starts a new index.
TEST_F(HostileShareTest, CorruptionMetLaterSetsTheIndexAsideAndMarksTheShare) {
    testkit::WriteFile(music_ + "/a/one.txt", "good");
    IndexMusicAndRun("PRAGMA wal_checkpoint(TRUNCATE); PRAGMA journal_mode=DELETE;");
    const std::string text = testkit::ReadFile(IndexFile("music"));
    testkit::WriteFile(IndexFile("music"), text.substr(0, 4096) + std::string(text.size() - 4096, '\x7f'));  // all but the schema
    fileindexd_ref::ShareIndexer later("music", &stop_, extractor_);
    testing::internal::CaptureStdout();
    EXPECT_FALSE(later.Apply({Record(2, music_ + "/a/one.txt")}, folders_));
    EXPECT_NE(testing::internal::GetCapturedStdout().find("the index turned out damaged; set aside as"), std::string::npos);
    EXPECT_EQ(later.LastProblem(), tools::IndexProblem::Damaged);
    EXPECT_TRUE(StatusMgr::ShareIsNeedReindex("music"));
    EXPECT_TRUE(later.Apply({Record(2, music_ + "/a/one.txt")}, folders_));
    EXPECT_EQ(Found("music"), Paths{"/music/a/one.txt"});
}

// A change applied as it happens and a walk keep the same entries out: recycle bin, snapshot,
// hidden and system names at any level, links on the way, and what lies past the depth bound
// (logged once).
TEST_F(HostileShareTest, LiveRecordsAndWalksGiveTheSameIndex) {
    const std::string deep = music_ + testkit::Deep(QIRA::FILEINDEX::MaxEntryDepth() - 1);
    MakeDir(deep + "/e");
    const std::vector<std::string> files = {"/#recycle/r.txt", "/#snapshot/s.txt", "/a/@tmp/t.txt", "/a/@__thumb/u.txt",
                                            "/a/@eaDir/v.txt", "/a/.DS_Store", "/a/ok.txt"};
    Batch batch;
    for (const auto& file : files) {
        MakeDir(music_ + file.substr(0, file.rfind('/')));
        testkit::WriteFile(music_ + file, "text");
        batch.push_back(Record(2, music_ + file));
    }
    // A link inside the share is a way neither a walk nor a live record takes.
    MakeDir(music_ + "/b/sub");
    testkit::WriteFile(music_ + "/b/sub/x.txt", "text");
    ASSERT_EQ(symlink("../b", (music_ + "/a/link").c_str()), 0);
    batch.push_back(Record(2, music_ + "/a/link/sub/x.txt"));
    batch.push_back(Record(2, music_ + "/b/sub/x.txt"));
    testkit::WriteFile(deep + "/at-the-bound.txt", "text");
    testkit::WriteFile(deep + "/e/past-the-bound.txt", "text");
    batch.push_back(Record(2, deep + "/at-the-bound.txt"));
    batch.push_back(Record(1, deep + "/e/past-the-bound.txt"));
    batch.push_back(Record(1, deep + "/e"));
    const Paths expected = {"/music/a/ok.txt", "/music/b/sub/x.txt", deep.substr(music_.size() - 6) + "/at-the-bound.txt"};
    fileindexd_ref::ShareIndexer indexer("music", &stop_, extractor_);
    testing::internal::CaptureStdout();
    ASSERT_TRUE(indexer.Apply(batch, folders_));
    EXPECT_EQ(Found("music"), expected);
    ASSERT_TRUE(indexer.Reindex(folders_));
    EXPECT_EQ(Found("music"), expected);
    EXPECT_EQ(testkit::CountOf(testing::internal::GetCapturedStdout(), "holds entries too deep"), 1u);
}

// The queue and its companion are reached through the share directory only: a link in place of
// "@eaDir" leads nowhere, files of the wrong kind are set aside, a failed batch stays for the next
// pass, and a long companion is served a batch at a time.
TEST_F(HostileShareTest, QueueTakeNeverFollowsLinksSetsAsideWrongKindsAndLosesNoBatch) {
    const auto line = [](const std::string& path) { return "{\"event\":2,\"path\":\"" + path + "\"}\n"; };
    const std::string photoQueue = QueueOf("photo");
    MakeDir(photo_ + "/@eaDir");
    testkit::WriteFile(photoQueue, line(photo_ + "/a/x.txt"));
    ASSERT_EQ(symlink((photo_ + "/@eaDir").c_str(), (music_ + "/@eaDir").c_str()), 0);
    fileindexd_ref::QueueTake music("music", music_);
    music.Take();
    EXPECT_EQ(music.ApplyNext(10, [](const Batch&) { return true; }), 0u);
    EXPECT_EQ(testkit::ReadFile(photoQueue), line(photo_ + "/a/x.txt"));
    EXPECT_FALSE(testkit::Exists(photoQueue + ".tmp"));
    ASSERT_EQ(unlink((music_ + "/@eaDir").c_str()), 0);

    MakeDir(music_ + "/@eaDir");
    testkit::WriteFile(photo_ + "/elsewhere", line(photo_ + "/a/x.txt"));
    for (const auto& plant : std::vector<std::function<void(const std::string&)>>{
             [](const std::string& path) { ASSERT_EQ(mkfifo(path.c_str(), 0644), 0); },
             [this](const std::string& path) { MakeDir(path); },
             [this](const std::string& path) { ASSERT_EQ(symlink((photo_ + "/elsewhere").c_str(), path.c_str()), 0); }}) {
        for (const std::string name : {"QIRA@file_index_queue", "QIRA@file_index_queue.tmp"}) {
            SCOPED_TRACE(name);
            ASSERT_TRUE(StatusMgr::ShareSetNeedReindex("music", false));
            plant(music_ + "/@eaDir/" + name);
            EXPECT_FALSE(QIRA::FILEINDEX::QueueFileProblems("music").empty());
            testing::internal::CaptureStdout();
            music.Take();
            EXPECT_NE(testing::internal::GetCapturedStdout().find("not a queue file; set aside as " + name + ".set-aside."),
                      std::string::npos);
            EXPECT_TRUE(StatusMgr::ShareIsNeedReindex("music"));
            EXPECT_EQ(QIRA::FILEINDEX::QueueFileProblems("music"), Json::Value(Json::objectValue));
        }
    }
    EXPECT_EQ(testkit::ReadFile(photo_ + "/elsewhere"), line(photo_ + "/a/x.txt"));  // a linked file is never taken

    std::string records;
    for (int i = 0; i < 2500; ++i) records += line(music_ + "/a/" + std::to_string(i) + ".txt");
    testkit::WriteFile(QueueOf("music"), records);
    music.Take();
    ASSERT_TRUE(StatusMgr::ShareSetNeedReindex("music", false));
    testing::internal::CaptureStdout();
    EXPECT_EQ(music.ApplyNext(1000, [](const Batch&) { return false; }), 0u);
    EXPECT_NE(testing::internal::GetCapturedStdout().find("1000 records not applied"), std::string::npos);
    EXPECT_TRUE(StatusMgr::ShareIsNeedReindex("music"));
    std::vector<std::string> first;
    for (const auto& [expected, applied] : {std::pair{1000u, 1000u}, {1000u, 2000u}, {501u, 0u}}) {
        EXPECT_EQ(music.ApplyNext(1000, [&](const Batch& batch) {
            if (first.empty()) first.push_back(batch.front().path);
            return true;
        }), expected);
        EXPECT_EQ(music.HasMore(), expected == 1000u);
        EXPECT_EQ(music.Applied(), applied);  // of the companion being read
        if (applied != 1000u) continue;
        testkit::WriteFile(QueueOf("music"), line(music_ + "/a/late.txt"));  // taken behind what is left
        music.Take();
    }
    EXPECT_EQ(first, std::vector<std::string>{music_ + "/a/0.txt"});  // the failed batch came again
    EXPECT_FALSE(testkit::Exists(QueueOf("music") + ".tmp"));
    // A companion the library will not read (sparse) is removed unread, its share marked.
    ASSERT_TRUE(StatusMgr::ShareSetNeedReindex("music", false));
    testkit::WriteFile(QueueOf("music") + ".tmp", "");
    ASSERT_EQ(truncate((QueueOf("music") + ".tmp").c_str(), 8 << 20), 0);
    EXPECT_EQ(music.ApplyNext(1000, [](const Batch&) { return true; }), 0u);
    EXPECT_TRUE(StatusMgr::ShareIsNeedReindex("music"));
    EXPECT_FALSE(testkit::Exists(QueueOf("music") + ".tmp"));
}

// A flood of records for one file reads it once per batch; a record that asks for a fresh read
// after one that did not still gets it.
TEST_F(HostileShareTest, RecordsForOnePathAreAppliedOncePerBatch) {
    const std::string big = music_ + "/a/big.txt";
    testkit::WriteFile(big, "before " + std::string(256 * 1024, 'w'));
    Batch batch(1000, Record(2, big));
    batch.push_back(Record(8, big));
    fileindexd_ref::ShareIndexer indexer("music", &stop_, extractor_);
    OpenWatch watch({music_ + "/a"}, IN_OPEN);
    ASSERT_TRUE(indexer.Apply(batch, folders_));
    const auto opened = watch.Opened();
    EXPECT_EQ(std::count(opened.begin(), opened.end(), "big.txt"), 1) << opened.size();
    EXPECT_EQ(Found("music"), Paths{"/music/a/big.txt"});  // deleted, then there again: kept

    struct stat st;
    ASSERT_EQ(stat(big.c_str(), &st), 0);
    testkit::WriteFile(big, "after! " + std::string(256 * 1024, 'w'));  // same size and time: only a read tells
    const timespec times[2] = {st.st_atim, st.st_mtim};
    ASSERT_EQ(utimensat(AT_FDCWD, big.c_str(), times, 0), 0);
    ASSERT_TRUE(indexer.Apply({Record(4, big), Record(2, big)}, folders_));
    EXPECT_EQ(Found("music", "after"), Paths{"/music/a/big.txt"});
}

// A path's entries are those at it or beneath it on a slash boundary: moving or removing
// /music/a/live leaves /music/a/live.txt and /music/a/live-2023 alone, and what moved is found by
// its new path, not its old one.
TEST_F(HostileShareTest, MovesAndRemovalsKeepToTheirPathAndRenameTheText) {
    MakeDir(music_ + "/a/live");
    MakeDir(music_ + "/a/live-2023");
    for (const std::string file : {"/a/live/x.txt", "/a/live.txt", "/a/live-2023/y.txt"}) testkit::WriteFile(music_ + file, "text");
    fileindexd_ref::ShareIndexer indexer("music", &stop_, extractor_);
    ASSERT_TRUE(indexer.Reindex(folders_));
    ASSERT_EQ(rename((music_ + "/a/live").c_str(), (music_ + "/a/gone").c_str()), 0);
    ASSERT_TRUE(indexer.Apply({Record(256, music_ + "/a/gone", music_ + "/a/live")}, folders_));
    EXPECT_EQ(Found("music"), (Paths{"/music/a/gone/x.txt", "/music/a/live-2023/y.txt", "/music/a/live.txt"}));
    EXPECT_EQ(Found("music", "gone"), Paths{"/music/a/gone/x.txt"});
    EXPECT_EQ(Found("music", "live"), (Paths{"/music/a/live-2023/y.txt", "/music/a/live.txt"}));
    ASSERT_EQ(rename((music_ + "/a/gone/x.txt").c_str(), (music_ + "/a/live.txt.bak").c_str()), 0);
    ASSERT_EQ(rmdir((music_ + "/a/gone").c_str()), 0);
    ASSERT_TRUE(indexer.Apply({Record(8, music_ + "/a/gone"), Record(1, music_ + "/a/live.txt.bak")}, folders_));
    // ".bak" tells no type: the file is typed by what it holds, text.
    EXPECT_EQ(Found("music"), (Paths{"/music/a/live-2023/y.txt", "/music/a/live.txt", "/music/a/live.txt.bak"}));
    // A file moved in from a place the index does not keep is indexed at its new path.
    MakeDir(music_ + "/a/@tmp");
    testkit::WriteFile(music_ + "/a/@tmp/draft.txt", "drafted");
    ASSERT_EQ(rename((music_ + "/a/@tmp/draft.txt").c_str(), (music_ + "/a/final.txt").c_str()), 0);
    ASSERT_TRUE(indexer.Apply({Record(256, music_ + "/a/final.txt", music_ + "/a/@tmp/draft.txt")}, folders_));
    EXPECT_EQ(Found("music", "drafted"), Paths{"/music/a/final.txt"});
}

// Names are shown as their bytes, never acted on: the table escapes them as ls does, JSON carries
// valid UTF-8 with the bytes beside a name that is not.
TEST_F(HostileShareTest, NamesWithControlCharactersAndBrokenUtf8AreShownSafely) {
    struct Case {
        std::string raw;
        std::string escaped;
    };
    std::vector<Case> cases = {{"\\", "\\\\"}, {"\x7f", "\\177"}, {"\xc2\x80", "\\302\\200"}, {"\xc2\x9f", "\\302\\237"},
                               {"\xc2\xa0", "\xc2\xa0"}, {"\xff", "\\377"},
                               {"\xe2\x82", "\\342\\202"}, {"caf\xc3\xa9 \xe2\x82\xac", "caf\xc3\xa9 \xe2\x82\xac"}};
    const char* named[] = {"\\a", "\\b", "\\t", "\\n", "\\v", "\\f", "\\r"};
    for (int c = 1; c < 0x20; ++c) {
        const std::string octal = {'\\', static_cast<char>('0' + (c >> 6)), static_cast<char>('0' + ((c >> 3) & 7)),
                                   static_cast<char>('0' + (c & 7))};
        cases.push_back({std::string(1, static_cast<char>(c)), c >= 7 && c <= 13 ? named[c - 7] : octal});
    }
    for (const auto& c : cases) {
        EXPECT_EQ(tools::EscapeForTerminal(c.raw), c.escaped) << tools::Hex(c.raw);
        EXPECT_EQ(tools::FromHex(tools::Hex(c.raw)), c.raw);
        EXPECT_TRUE(tools::IsValidUtf8(tools::ValidUtf8(c.raw, "?")));
    }

    for (const std::string name : {"a\nb.txt", "\x1b[31mred.txt", "caf\xe9.txt"}) testkit::WriteFile(music_ + "/a/" + name, "needle");
    ASSERT_TRUE(fileindexd_ref::ShareIndexer("music", &stop_, extractor_).Reindex(folders_));
    const auto table = testkit::Run({FILEINDEXCTL, "search", "needle"});
    EXPECT_EQ(table.status, 0) << table.err;
    for (const std::string shown : {"/music/a/a\\nb.txt ", "/music/a/\\033[31mred.txt ", "/music/a/caf\\351.txt "}) {
        EXPECT_NE(table.out.find(shown), std::string::npos) << table.out;
    }
    EXPECT_EQ(table.out.find('\x1b'), std::string::npos);
    EXPECT_EQ(testkit::CountOf(table.out, "\n"), 5u);  // the header, three rows and the count
    const auto json = testkit::Run({FILEINDEXCTL, "--json", "search", "needle"});
    EXPECT_TRUE(tools::IsValidUtf8(json.out));
    std::set<std::string> raw;
    const Json::Value answer = testkit::ParseJson(json.out);
    for (const auto& hit : answer["result"]["hits"]) {
        raw.insert(hit.isMember("path_hex") ? tools::FromHex(hit["path_hex"].asString()) : hit["path"].asString());
    }
    EXPECT_EQ(raw, (std::set<std::string>{"/music/a/a\nb.txt", "/music/a/\x1b[31mred.txt", "/music/a/caf\xe9.txt"}));
}

// A query is bounded in bytes and words, each bound held exactly, the CLI naming the bound; the
// number of hits is bounded over the whole answer.
TEST_F(HostileShareTest, QueriesAreBoundedInBytesWordsAndHits) {
    const auto words = [](size_t n) {
        std::string query;
        for (size_t i = 0; i < n; ++i) query += "w ";
        return query;
    };
    EXPECT_EQ(tools::QueryError(std::string(tools::kMaxQueryBytes, 'x')), "");
    EXPECT_EQ(tools::QueryError(std::string(tools::kMaxQueryBytes + 1, 'x')), "the query is longer than 1024 bytes");
    EXPECT_EQ(tools::QueryError(words(tools::kMaxQueryWords)), "");
    EXPECT_EQ(tools::QueryError(words(tools::kMaxQueryWords + 1)), "the query has more than 32 words");
    const auto refused = testkit::Run({FILEINDEXCTL, "search", words(tools::kMaxQueryWords + 1)});
    EXPECT_EQ(refused.status, 2);
    EXPECT_NE(refused.err.find("the query has more than 32 words"), std::string::npos) << refused.err;
    // The limit holds over the whole answer, not per share, and keeps the best hits of all: a name
    // in the second share ranks above every text.
    for (const auto& dir : {music_, photo_}) {
        for (const char* name : {"/a/1.txt", "/a/2.txt", "/a/3.txt"}) testkit::WriteFile(dir + name, "needle");
    }
    testkit::WriteFile(photo_ + "/a/needle.txt", "");
    for (const auto& share : {"music", "photo"}) ASSERT_TRUE(fileindexd_ref::ShareIndexer(share, &stop_, extractor_).Reindex(folders_));
    const auto run = [](std::vector<std::string> args, const std::vector<std::string>& page) {
        args.insert(args.end(), page.begin(), page.end());
        return testkit::Run(args);
    };
    const auto search = [&run](const std::vector<std::string>& page) {
        return testkit::ParseJson(run({FILEINDEXCTL, "--json", "search", "needle"}, page).out)["result"];
    };
    for (const auto& [limit, hits] : {std::pair{"1", 1u}, {"4", 4u}, {"7", 7u}, {"1000", 7u}}) {
        const Json::Value answer = search({"--limit", limit});
        EXPECT_EQ(answer["hits"].size(), hits) << limit;
        EXPECT_EQ(answer["total"].asInt(), 7);
        EXPECT_EQ(answer["hits"][0]["path"].asString(), "/photo/a/needle.txt");
    }
    // Pages follow each other: three of three hits and one of one cover the whole answer once.
    Json::Value all = search({"--limit", "7"})["hits"], paged(Json::arrayValue);
    for (const char* offset : {"0", "3", "6"}) {
        const Json::Value page = search({"--limit", "3", "--offset", offset});
        for (const auto& hit : page["hits"]) paged.append(hit);
    }
    EXPECT_EQ(paged, all);
    EXPECT_EQ(search({"--type", "photo"})["total"].asInt(), 0);  // the total keeps to the type asked for
    for (const auto& [page, footer] : std::vector<std::pair<std::vector<std::string>, std::string>>{
             {{"--limit", "7"}, "(7 found)"}, {{"--limit", "3", "--offset", "3"}, "(4-6 of 7; --offset 6 for more)"},
             {{"--offset", "6"}, "(7-7 of 7)"}, {{"--offset", "7"}, "(none from 8 on; 7 found)"}}) {
        EXPECT_NE(run({FILEINDEXCTL, "search", "needle"}, page).out.find("\n" + footer + "\n"), std::string::npos) << footer;
    }
    EXPECT_EQ(testkit::Run({FILEINDEXCTL, "search", "needle", "--offset", "10001"}).status, 2);
}

// The CLI reads a share's index only where its user may read the share's directory.
TEST_F(HostileShareTest, SearchReadsNoIndexOfAShareTheCallerCannotRead) {
    testkit::WriteFile(music_ + "/a/one.txt", "needle");
    ASSERT_TRUE(fileindexd_ref::ShareIndexer("music", &stop_, extractor_).Reindex(folders_));
    ASSERT_EQ(chmod(root().c_str(), 0755), 0);
    const auto asNobody = [](auto call) {
        return testkit::RunBounded(30, [call] { return setgid(65534) == 0 && setuid(65534) == 0 && call(); });
    };
    // A checkout closed to other users (a clone in a 0700 directory) leaves them no tool to run.
    if (asNobody([] { return access(FILEINDEXCTL, X_OK) == 0; }) != 1) {
        GTEST_SKIP() << "uid 65534 cannot run " << FILEINDEXCTL << ": the checkout is closed to other users";
    }
    for (const mode_t mode : {0700, 0711, 0744}) {  // neither listing nor entering is enough alone
        ASSERT_EQ(chmod(music_.c_str(), mode), 0);
        const int refused = asNobody([] {
            const auto result = testkit::Run({FILEINDEXCTL, "search", "--share", "music", "needle"});
            return result.status == 1 && result.err.find("you may not read the directory of share music") != std::string::npos;
        });
        EXPECT_EQ(refused, 1) << std::oct << mode;
    }
}

}  // namespace
