// One share's search index: an SQLite database in the share's index database directory (the
// directory FILEIDXDBPathGet gives), with an FTS5 table over each indexed file's name, share path
// and, for plain-text documents, its text. The daemon stand-in writes it; fileindexctl and the
// console search it. Accents and letter case do not matter in a search, and every term is a prefix.
#pragma once

#include <sys/types.h>

#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

struct sqlite3;

namespace tools {

struct IndexedFile {
    std::string path;  // share path, e.g. /music/live/a.txt
    std::string type;  // "document", "audio", "video" or "photo"
    long long size = 0;
    long long mtime = 0;
    std::string text;  // the text of a plain-text document, valid UTF-8; empty otherwise
};

struct SearchHit {
    std::string path;
    std::string type;
    long long size = 0;
    long long mtime = 0;
    double rank = 0;  // lower is better
    std::vector<std::pair<std::string, bool>> snippet;  // pieces of text, true for the matched ones
};

class SearchIndex {
public:
    static constexpr const char* kFileName = "index.sqlite";

    // Opens the index in `dbDir`; `create` makes it (write-ahead log, schema) when it is missing,
    // otherwise a missing index is an error. Null with `error` set on failure.
    static std::unique_ptr<SearchIndex> Open(const std::string& dbDir, bool create, std::string& error);
    ~SearchIndex();
    SearchIndex(const SearchIndex&) = delete;
    SearchIndex& operator=(const SearchIndex&) = delete;

    // True while the index file is the one opened: not removed or replaced since.
    bool StillOnDisk() const;

    bool Begin();
    bool Commit();
    bool Put(const IndexedFile& file);
    // Removes `path` and everything beneath it.
    bool Remove(const std::string& path);
    // Moves `from` and everything beneath it to `to`.
    bool Rename(const std::string& from, const std::string& to);
    // Every stored path at or beneath `path`, with its size and modification time.
    std::map<std::string, std::pair<long long, long long>> Under(const std::string& path);
    long long Count();

    // The best hits for `query` (words, each a prefix, all required), of one type when `type` is
    // not empty. False, with `error` set, when the query holds no word.
    bool Search(const std::string& query, const std::string& type, int limit, std::vector<SearchHit>& hits,
                std::string& error);

private:
    SearchIndex(sqlite3* db, std::string file, dev_t dev, ino_t ino) : db_(db), file_(std::move(file)), dev_(dev), ino_(ino) {}
    bool Exec(const char* sql);

    sqlite3* db_;
    std::string file_;
    dev_t dev_;
    ino_t ino_;
};

// The FTS5 query for a person's words: each word quoted and a prefix, all required; "" when there
// is no word (punctuation alone is none).
std::string MatchExpression(const std::string& words);

}  // namespace tools
