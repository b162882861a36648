// Words and filters over an index of known files: each filter on both sides of its bounds, the
// orders, the facets, and the errors that name the part of a query that is wrong.
#include <sqlite3.h>

#include "search_index.h"
#include "testkit.h"

namespace {

using Paths = std::vector<std::string>;

constexpr long long kNewYear2026 = 1767225600;  // 2026-01-01 00:00:00 UTC
constexpr long long kMiB = 1 << 20;

class SearchQueryTest : public testkit::Sandbox {
protected:
    void SetUp() override {
        Sandbox::SetUp();
        dir_ = Path("/share");
        MakeDir(dir_ + "/@eaDir/QIRA@.fileindexdb");
        ASSERT_TRUE(Reopen(true)) << error_;
        const std::vector<tools::IndexedFile> files = {
            {"/s/song1.mp3", "audio", 3 * kMiB, kNewYear2026 - 1, "So What Miles Davis Kind of Blue", "",
             testkit::ParseJson(R"({"title": "So What", "artist": "Miles Davis", "album": "Kind of Blue", "year": 1959, "duration": 545})")},
            {"/s/song2.flac", "audio", 20 * kMiB, kNewYear2026, "Blue Train John Coltrane", "",
             testkit::ParseJson(R"({"artist": "John Coltrane", "album": "Blue Train", "year": 1958, "duration": 3600})")},
            {"/s/IMG_1.jpg", "photo", 100, 10, "", "",
             testkit::ParseJson(R"({"taken": "2019-06-01 00:00:00", "camera_make": "FUJIFILM", "camera_model": "X-T3"})")},
            {"/s/IMG_2.jpg", "photo", 100, 20, "", "",
             testkit::ParseJson(R"({"taken": "2019-08-31 23:59:59", "camera_make": "Canon", "camera_model": "EOS R5"})")},
            {"/s/IMG_3.jpg", "photo", 100, 30, "", "",
             testkit::ParseJson(R"({"taken": "2019-09-01 00:00:00", "camera_make": "FUJIFILM", "camera_model": "X100V"})")},
            {"/s/invoice.pdf", "document", kMiB + 1, kNewYear2026 - 86400, "invoice for services", "",
             testkit::ParseJson(R"({"title": "Invoice 42", "author": "Ann", "pages": 3})")},
            {"/s/notes.txt", "document", kMiB, kNewYear2026 + 86400, "invoice draft", "", Json::Value(Json::objectValue)},
        };
        ASSERT_TRUE(index_->Begin());
        for (const auto& file : files) ASSERT_TRUE(index_->Put(file));
        ASSERT_TRUE(index_->Commit());
    }
    bool Reopen(bool create) {
        index_ = tools::SearchIndex::Open(dir_, create, problem_, error_);
        return index_ != nullptr;
    }
    // Runs `statements` on the index's file, the index closed: the first column of the last row
    // they give, -1 when none.
    int Sql(const std::string& statements) {
        index_.reset();
        sqlite3* db = nullptr;
        int last = -1;
        EXPECT_EQ(sqlite3_open((dir_ + "/@eaDir/QIRA@.fileindexdb/index.sqlite").c_str(), &db), SQLITE_OK);
        const auto keep = [](void* out, int, char** values, char**) { *static_cast<int*>(out) = values[0] ? atoi(values[0]) : -1; return 0; };
        EXPECT_EQ(sqlite3_exec(db, statements.c_str(), keep, &last, nullptr), SQLITE_OK) << sqlite3_errmsg(db);
        sqlite3_close(db);
        return last;
    }
    Paths Find(const std::string& query, const std::string& sort = "relevance", bool ordered = false) {
        std::vector<tools::SearchHit> hits;
        std::string error;
        if (!index_->Search(query, "", 100, hits, error, sort)) return {"error: " + error};
        Paths paths;
        for (const auto& hit : hits) paths.push_back(hit.path.substr(3));
        if (!ordered) std::sort(paths.begin(), paths.end());
        return paths;
    }
    std::string dir_;
    std::unique_ptr<tools::SearchIndex> index_;
    tools::IndexProblem problem_;
    std::string error_;
};

TEST_F(SearchQueryTest, EachFilterKeepsToItsBoundsOnBothSides) {
    const std::vector<std::pair<std::string, Paths>> cases = {
        {"type:audio", {"song1.mp3", "song2.flac"}},
        {"artist:davis", {"song1.mp3"}},
        {"artist:DAV", {"song1.mp3"}},
        {"artist:avis", {}},  // a word's start, not its middle
        {"artist:\"miles davis\"", {"song1.mp3"}},
        {"album:blue", {"song1.mp3", "song2.flac"}},
        {"artist:blue", {}},  // in the album and the text, not the artist
        {"blue type:audio year:1959", {"song1.mp3"}},
        {"year:1958..1959", {"song1.mp3", "song2.flac"}},
        {"year:1958..1958", {"song2.flac"}},
        {"year:>1958", {"song1.mp3"}},
        {"year:<1959", {"song2.flac"}},
        {"duration:1h", {"song2.flac"}},
        {"duration:>1h", {}},
        {"duration:>59m", {"song2.flac"}},
        {"duration:9:05", {"song1.mp3"}},
        {"duration:<9:05", {}},
        {"taken:2019-06..2019-08", {"IMG_1.jpg", "IMG_2.jpg"}},
        {"taken:2019-09", {"IMG_3.jpg"}},
        {"taken:>2019-08", {"IMG_3.jpg"}},
        {"taken:<2019-06", {}},
        {"taken:2019-06-01", {"IMG_1.jpg"}},
        {"camera:fuji", {"IMG_1.jpg", "IMG_3.jpg"}},
        {"camera:x100v", {"IMG_3.jpg"}},
        {"invoice size:>1M", {"invoice.pdf"}},
        {"invoice size:1M", {"notes.txt"}},
        {"invoice size:<1M", {}},
        {"invoice modified:<2026-01-01", {"invoice.pdf"}},
        {"modified:2026", {"notes.txt", "song2.flac"}},
        {"modified:>2025-12-31", {"notes.txt", "song2.flac"}},
        {"pages:3 title:invoice author:ann", {"invoice.pdf"}},
    };
    for (const auto& [query, expected] : cases) EXPECT_EQ(Find(query), expected) << query;
}

TEST_F(SearchQueryTest, HitsComeInTheOrderAskedAndFacetsCountThemAll) {
    EXPECT_EQ(Find("type:audio", "date", true), (Paths{"song2.flac", "song1.mp3"}));
    EXPECT_EQ(Find("invoice", "name", true), (Paths{"invoice.pdf", "notes.txt"}));
    EXPECT_EQ(Find("type:photo", "relevance", true), (Paths{"IMG_1.jpg", "IMG_2.jpg", "IMG_3.jpg"}));
    Json::Value facets;
    ASSERT_TRUE(index_->Facets("blue", "", facets, error_)) << error_;
    EXPECT_EQ(facets, testkit::ParseJson(R"({"type": {"audio": 2}, "year": {"1958": 1, "1959": 1},
        "artist": {"John Coltrane": 1, "Miles Davis": 1}, "camera": {}})"));
    long long count = -1;
    for (const auto& [type, expected] : std::vector<std::pair<std::string, long long>>{{"", 2}, {"document", 2}, {"audio", 0}}) {
        ASSERT_TRUE(index_->CountHits("invoice", type, count, error_)) << error_;
        EXPECT_EQ(count, expected) << type;
    }
    ASSERT_TRUE(index_->Facets("type:photo", "", facets, error_)) << error_;
    EXPECT_EQ(facets["camera"], testkit::ParseJson(R"({"FUJIFILM X-T3": 1, "Canon EOS R5": 1, "FUJIFILM X100V": 1})"));
    // Ten values at most: the commonest, then ties by value, numbers by their value before texts.
    ASSERT_TRUE(index_->Begin());
    int n = 0;
    for (const char* year : {"1010", "1010", "999", "1000", "1001", "1002", "1003", "1004", "1005", "1006", "1007", "1008", "\"x\""}) {
        ASSERT_TRUE(index_->Put({"/s/y" + std::to_string(n++), "audio", 1, 1, "capped", "", testkit::ParseJson(std::string("{\"year\": ") + year + "}")}));
    }
    ASSERT_TRUE(index_->Commit());
    ASSERT_TRUE(index_->Facets("capped", "", facets, error_)) << error_;
    EXPECT_EQ(facets["year"], testkit::ParseJson(R"({"1010": 2, "999": 1, "1000": 1, "1001": 1, "1002": 1, "1003": 1, "1004": 1,
        "1005": 1, "1006": 1, "1007": 1})"));
    // Values first met once a facet counts kMaxFacetDistinct are left out, however common.
    const std::string distinct = std::to_string(tools::kMaxFacetDistinct);
    Sql("WITH RECURSIVE n(i) AS (SELECT 0 UNION ALL SELECT i + 1 FROM n WHERE i < " + distinct + " + 2)"
        " INSERT INTO files(path, type, size, mtime, artist) SELECT '/t/' || i, 'audio', 1, 1, CASE WHEN i < " + distinct +
        " - 1 THEN 'a' || i WHEN i < " + distinct + " + 1 THEN 'last' ELSE 'late' END FROM n;"
        " INSERT INTO search(rowid, name, path, body) SELECT id, '', path, 'endless' FROM files WHERE path LIKE '/t/%';");
    ASSERT_TRUE(Reopen(false)) << error_;
    ASSERT_TRUE(index_->Facets("endless", "", facets, error_)) << error_;
    EXPECT_EQ(facets["artist"]["last"], 2);
    EXPECT_FALSE(facets["artist"].isMember("late"));
}

// An index without the indexes of its columns (made before they were, or dropped) is searched as
// it is, and the daemon's next open makes them again.
TEST_F(SearchQueryTest, AnIndexWithoutItsColumnIndexesIsStillOurs) {
    const std::string count = " SELECT count(*) FROM sqlite_schema WHERE name LIKE 'files_%';";
    ASSERT_EQ(Sql("DROP INDEX files_type; DROP INDEX files_taken;" + count), 4);
    ASSERT_TRUE(Reopen(false)) << error_;
    EXPECT_EQ(Find("type:photo taken:2019-06..2019-08"), (Paths{"IMG_1.jpg", "IMG_2.jpg"}));
    ASSERT_TRUE(Reopen(true)) << error_;
    EXPECT_EQ(Sql(count), 6);
    // An index of one of our names is ours only as we make it.
    Sql("DROP INDEX files_type; CREATE INDEX files_type ON files(size);");
    EXPECT_FALSE(Reopen(false));
    EXPECT_EQ(problem_, tools::IndexProblem::Damaged);
}

TEST(SearchQueryErrors, ABadQueryNamesItsBadPart) {
    const std::vector<std::pair<std::string, std::string>> cases = {
        {"year:19x9", "\"year:19x9\": give a whole number N, a range a..b, >N or <N"},
        {"year:1960..1950", "\"year:1960..1950\": give a whole number N, a range a..b, >N or <N"},
        {"taken:2019-13", "\"taken:2019-13\": give a date YYYY, YYYY-MM or YYYY-MM-DD, a range a..b, >date or <date"},
        {"taken:2019-02-30", "\"taken:2019-02-30\": give a date YYYY, YYYY-MM or YYYY-MM-DD, a range a..b, >date or <date"},
        {"size:1.5M", "\"size:1.5M\": give a size such as 200K, 1M or 2G, a range a..b, >N or <N"},
        {"duration:1:60", "\"duration:1:60\": give a duration such as 90s, 5m, 1h or 1:30, a range a..b, >N or <N"},
        {"type:movie", "\"type:movie\": a type is document, audio, video or photo"},
        {"artist:", "\"artist:\": give a word to look for"},
        {"artst:miles", "\"artst:miles\": there is no field \"artst\"; the fields are type, title, author, artist, album, "
                        "genre, camera, year, pages, size, duration, taken and modified"},
        {"artist:\"miles", "the quote after \"artist:\"\" is not closed"},
        {"!! ?", "the query holds no word"},
        {"12:30 year:1959", ""},  // a word with a colon, and a filter
    };
    for (const auto& [query, error] : cases) EXPECT_EQ(tools::QueryError(query), error) << query;
}

}  // namespace
