// One share's search index: an SQLite database "index.sqlite" in the share's index database
// directory ("<share>/@eaDir/QIRA@.fileindexdb"), with an FTS5 table over each indexed file's
// name, share path and, for plain-text documents, its text. The daemon stand-in writes it;
// fileindexctl and the console search it. Accents and letter case do not matter in a search, and
// every term is a prefix.
//
// The share's users can write in "@eaDir", so the index is treated as hostile. Every file SQLite
// opens for it is reached beneath the share directory without a link on the way (openat2),
// without blocking, and must be a regular file with one link (a writable one also owned by this
// process's user). The schema must be exactly ours (no view, no trigger), SQLite runs in defensive
// mode without trusting the schema, and every statement runs under a deadline.
#pragma once

#include <sys/types.h>

#include <chrono>
#include <csignal>
#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include <json/value.h>

struct sqlite3;

namespace tools {

struct IndexedFile {
    std::string path;  // share path, e.g. /music/live/a.txt
    std::string type;  // "document", "audio", "video" or "photo"
    long long size = 0;
    long long mtime = 0;
    std::string text;  // the text read from the file, valid UTF-8; empty when none
    std::string problem;  // why its content could not be read (indexed by name only); "" when none
    Json::Value fields = Json::Value(Json::objectValue);  // what was read besides the text
};

// What the index holds of a file, to tell whether it changed.
struct StoredFile {
    long long size = 0;
    long long mtime = 0;
    std::string type;
};

struct SearchHit {
    std::string path;
    std::string type;
    long long size = 0;
    long long mtime = 0;
    double rank = 0;  // lower is better
    std::vector<std::pair<std::string, bool>> snippet;  // pieces of text, true for the matched ones
    std::string fields;  // what was read of the file besides its text, a JSON object
};

// Why an index could not be opened or used.
enum class IndexProblem {
    None,
    Missing,  // no index file (yet)
    Damaged,  // not a regular file of ours, a link on the way, not SQLite, corrupt, or a schema not ours
    TimedOut, // a statement ran past its deadline or was stopped
    Failed,   // anything else (locked, out of memory, ...)
};

// A query is refused beyond these bounds, with an error naming the bound.
constexpr size_t kMaxQueryBytes = 1024;
constexpr size_t kMaxQueryWords = 32;
// Facets count at most this many values each, the commonest first.
constexpr int kMaxFacetValues = 10;
// A facet keeps counting at most this many distinct values: those first met later are not
// counted, so that an index of endless distinct values costs a search bounded memory.
constexpr size_t kMaxFacetDistinct = 10000;

class SearchIndex {
public:
    static constexpr const char* kFileName = "index.sqlite";
    static constexpr const char* kDirName = "@eaDir/QIRA@.fileindexdb";

    // Opens the index of the share whose directory is `shareDir`: read-write with `create` (the
    // file and schema are made when missing), read-only otherwise. Null with `problem` and `error`
    // set on failure; nothing is written to a file that fails the checks.
    static std::unique_ptr<SearchIndex> Open(const std::string& shareDir, bool create, IndexProblem& problem,
                                             std::string& error);
    // Moves the share's index file (or a database directory of the wrong kind) aside under a new
    // name in the same directory, never following a link, with the write-ahead log and shared
    // memory files. The name it was moved to, or "" when there was nothing to move or it failed.
    static std::string SetAside(const std::string& shareDir);

    ~SearchIndex();
    SearchIndex(const SearchIndex&) = delete;
    SearchIndex& operator=(const SearchIndex&) = delete;

    // True while the index file is the one opened: not removed or replaced since.
    bool StillOnDisk() const;
    // Statements fail with TimedOut once `deadline` passes or `*stop` becomes nonzero.
    void SetDeadline(std::chrono::steady_clock::time_point deadline, const volatile sig_atomic_t* stop = nullptr);
    // What made the last failing call fail.
    IndexProblem LastProblem() const { return problem_; }

    bool Begin();
    bool Commit();
    void Rollback();
    // Adds or replaces `file`. Its text is searched with the words of its text fields (title,
    // author, artist, album, album artist, genre, camera make and model, lens), which a filter on
    // such a field relies on.
    bool Put(const IndexedFile& file);
    // Removes `path` and everything beneath it.
    bool Remove(const std::string& path);
    // Moves `from` and everything beneath it to `to`.
    bool Rename(const std::string& from, const std::string& to);
    // Every stored path at or beneath `path`, with its size, modification time and type; false on failure.
    bool Under(const std::string& path, std::map<std::string, StoredFile>& stored);
    long long Count();
    // The stored file at exactly `path` (its text left out); false when there is none or on failure.
    bool Entry(const std::string& path, IndexedFile& file);
    // Stored paths at or beneath `path`; -1 on failure.
    long long CountUnder(const std::string& path);

    // The first hits for `query` (search_query.h), of one type when `type` is not empty, in the
    // order of `sort`: "relevance" (best first; path order without words), "date" (newest first)
    // or "name"; hits alike in path order, so that pages follow each other. False, with `error`
    // set, when the query fails QueryError or the statement fails.
    bool Search(const std::string& query, const std::string& type, int limit, std::vector<SearchHit>& hits,
                std::string& error, const std::string& sort = "relevance");
    // How many files Search would find without a limit; false as Search.
    bool CountHits(const std::string& query, const std::string& type, long long& count, std::string& error);
    // Over every hit: {"type", "year", "artist", "camera"}, each {value: hits}, at most
    // kMaxFacetValues values, the commonest first; false as Search.
    bool Facets(const std::string& query, const std::string& type, Json::Value& facets, std::string& error);

private:
    SearchIndex(sqlite3* db, std::string shareDir, dev_t dev, ino_t ino)
        : db_(db), shareDir_(std::move(shareDir)), dev_(dev), ino_(ino) {}
    bool Exec(const char* sql);
    // The error of a failed search statement, its problem recorded.
    std::string SearchError();
    bool Check(int rc);
    static int OnProgress(void* self);

    sqlite3* db_;
    std::string shareDir_;
    dev_t dev_;
    ino_t ino_;
    std::chrono::steady_clock::time_point deadline_ = std::chrono::steady_clock::time_point::max();
    const volatile sig_atomic_t* stop_ = nullptr;
    IndexProblem problem_ = IndexProblem::None;
};

// The FTS5 query for a person's words: each word quoted and a prefix, all required; "" when there
// is no word (punctuation alone is none).
std::string MatchExpression(const std::string& words);

// Why `query` cannot be searched ("" when it can): ParseSearchQuery's error (search_query.h).
std::string QueryError(const std::string& query);

}  // namespace tools
