#include "search_index.h"

#include <sys/stat.h>

#include <sqlite3.h>

#include <algorithm>
#include <cctype>
#include <sstream>

namespace tools {
namespace {

const char kSchema[] =
    "PRAGMA journal_mode=WAL;"
    "PRAGMA synchronous=NORMAL;"
    "CREATE TABLE IF NOT EXISTS files(id INTEGER PRIMARY KEY, path TEXT NOT NULL UNIQUE, type TEXT NOT NULL,"
    " size INTEGER NOT NULL, mtime INTEGER NOT NULL);"
    "CREATE VIRTUAL TABLE IF NOT EXISTS search USING fts5(name, path, body,"
    " tokenize = 'unicode61 remove_diacritics 2', prefix = '2 3');";

// Rows at `?1` or beneath it: every path beneath sorts between "<path>/" and "<path>0".
const char kUnder[] = "(path = ?1 OR (path >= ?1 || '/' AND path < ?1 || '0'))";

// A prepared statement, finalized on every way out.
class Statement {
public:
    Statement(sqlite3* db, const std::string& sql) { sqlite3_prepare_v2(db, sql.c_str(), -1, &statement_, nullptr); }
    ~Statement() { sqlite3_finalize(statement_); }
    Statement(const Statement&) = delete;
    Statement& operator=(const Statement&) = delete;

    bool Ok() const { return statement_ != nullptr; }
    Statement& Bind(int index, const std::string& text) {
        sqlite3_bind_text(statement_, index, text.data(), static_cast<int>(text.size()), SQLITE_TRANSIENT);
        return *this;
    }
    Statement& Bind(int index, long long number) {
        sqlite3_bind_int64(statement_, index, number);
        return *this;
    }
    bool Step() { return sqlite3_step(statement_) == SQLITE_ROW; }
    bool Run() {
        const int rc = sqlite3_step(statement_);
        return rc == SQLITE_DONE || rc == SQLITE_ROW;
    }
    std::string Text(int column) const {
        const auto* text = sqlite3_column_text(statement_, column);
        return text ? std::string(reinterpret_cast<const char*>(text), static_cast<size_t>(sqlite3_column_bytes(statement_, column)))
                    : std::string();
    }
    long long Number(int column) const { return sqlite3_column_int64(statement_, column); }
    double Real(int column) const { return sqlite3_column_double(statement_, column); }

private:
    sqlite3_stmt* statement_ = nullptr;
};

std::string NameOf(const std::string& path) { return path.substr(path.rfind('/') + 1); }

// The snippet's text with its matches, split at the markers FTS5 put around them.
std::vector<std::pair<std::string, bool>> SnippetPieces(const std::string& snippet) {
    std::vector<std::pair<std::string, bool>> pieces;
    std::string piece;
    bool inMatch = false;
    for (const char c : snippet) {
        if (c == '\x02' || c == '\x03') {
            if (!piece.empty()) pieces.emplace_back(piece, inMatch);
            piece.clear();
            inMatch = c == '\x02';
        } else {
            piece += c;
        }
    }
    if (!piece.empty()) pieces.emplace_back(piece, inMatch);
    return pieces;
}

}  // namespace

std::string MatchExpression(const std::string& words) {
    std::istringstream in(words);
    std::string expression;
    for (std::string word; in >> word;) {
        const bool hasLetters = std::any_of(word.begin(), word.end(), [](char c) {
            return std::isalnum(static_cast<unsigned char>(c)) || static_cast<unsigned char>(c) >= 0x80;
        });
        if (!hasLetters) continue;  // punctuation alone makes no token
        std::string quoted = "\"";
        for (const char c : word) quoted += c == '"' ? std::string("\"\"") : std::string(1, c);
        expression += (expression.empty() ? "" : " ") + quoted + "\"*";
    }
    return expression;
}

std::unique_ptr<SearchIndex> SearchIndex::Open(const std::string& dbDir, bool create, std::string& error) {
    const std::string file = dbDir + "/" + kFileName;
    sqlite3* db = nullptr;
    const int flags = (create ? SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE : SQLITE_OPEN_READONLY) | SQLITE_OPEN_NOFOLLOW;
    if (sqlite3_open_v2(file.c_str(), &db, flags, nullptr) != SQLITE_OK) {
        error = db ? sqlite3_errmsg(db) : "out of memory";
        sqlite3_close(db);
        return nullptr;
    }
    sqlite3_busy_timeout(db, 5000);
    struct stat st;
    if ((create && sqlite3_exec(db, kSchema, nullptr, nullptr, nullptr) != SQLITE_OK) || stat(file.c_str(), &st) != 0) {
        error = sqlite3_errmsg(db);
        sqlite3_close(db);
        return nullptr;
    }
    return std::unique_ptr<SearchIndex>(new SearchIndex(db, file, st.st_dev, st.st_ino));
}

SearchIndex::~SearchIndex() { sqlite3_close(db_); }

bool SearchIndex::StillOnDisk() const {
    struct stat st;
    return stat(file_.c_str(), &st) == 0 && st.st_dev == dev_ && st.st_ino == ino_;
}

bool SearchIndex::Exec(const char* sql) { return sqlite3_exec(db_, sql, nullptr, nullptr, nullptr) == SQLITE_OK; }

bool SearchIndex::Begin() { return Exec("BEGIN IMMEDIATE"); }

bool SearchIndex::Commit() { return Exec("COMMIT"); }

bool SearchIndex::Put(const IndexedFile& file) {
    Statement upsert(db_,
                     "INSERT INTO files(path, type, size, mtime) VALUES(?1, ?2, ?3, ?4) ON CONFLICT(path) DO UPDATE SET"
                     " type = excluded.type, size = excluded.size, mtime = excluded.mtime RETURNING id");
    if (!upsert.Ok() || !upsert.Bind(1, file.path).Bind(2, file.type).Bind(3, file.size).Bind(4, file.mtime).Step()) {
        return false;
    }
    const long long id = upsert.Number(0);
    Statement drop(db_, "DELETE FROM search WHERE rowid = ?1");
    Statement add(db_, "INSERT INTO search(rowid, name, path, body) VALUES(?1, ?2, ?3, ?4)");
    return drop.Ok() && add.Ok() && drop.Bind(1, id).Run() &&
           add.Bind(1, id).Bind(2, NameOf(file.path)).Bind(3, file.path).Bind(4, file.text).Run();
}

bool SearchIndex::Remove(const std::string& path) {
    Statement search(db_, std::string("DELETE FROM search WHERE rowid IN (SELECT id FROM files WHERE ") + kUnder + ")");
    Statement files(db_, std::string("DELETE FROM files WHERE ") + kUnder);
    return search.Ok() && files.Ok() && search.Bind(1, path).Run() && files.Bind(1, path).Run();
}

bool SearchIndex::Rename(const std::string& from, const std::string& to) {
    if (from == to) return true;
    if (!Remove(to)) return false;
    Statement rows(db_, std::string("SELECT id, path FROM files WHERE ") + kUnder);
    if (!rows.Ok()) return false;
    rows.Bind(1, from);
    std::vector<std::pair<long long, std::string>> moved;
    while (rows.Step()) moved.emplace_back(rows.Number(0), to + rows.Text(1).substr(from.size()));
    for (const auto& [id, path] : moved) {
        Statement file(db_, "UPDATE files SET path = ?2 WHERE id = ?1");
        Statement search(db_, "UPDATE search SET name = ?2, path = ?3 WHERE rowid = ?1");
        if (!file.Ok() || !search.Ok() || !file.Bind(1, id).Bind(2, path).Run() ||
            !search.Bind(1, id).Bind(2, NameOf(path)).Bind(3, path).Run()) {
            return false;
        }
    }
    return true;
}

std::map<std::string, std::pair<long long, long long>> SearchIndex::Under(const std::string& path) {
    std::map<std::string, std::pair<long long, long long>> stored;
    Statement rows(db_, std::string("SELECT path, size, mtime FROM files WHERE ") + kUnder);
    if (!rows.Ok()) return stored;
    rows.Bind(1, path);
    while (rows.Step()) stored[rows.Text(0)] = {rows.Number(1), rows.Number(2)};
    return stored;
}

long long SearchIndex::Count() {
    Statement count(db_, "SELECT count(*) FROM files");
    return count.Ok() && count.Step() ? count.Number(0) : -1;
}

bool SearchIndex::Search(const std::string& query, const std::string& type, int limit, std::vector<SearchHit>& hits,
                         std::string& error) {
    const std::string expression = MatchExpression(query);
    if (expression.empty()) {
        error = "the query holds no word";
        return false;
    }
    Statement rows(db_,
                   "SELECT f.path, f.type, f.size, f.mtime, bm25(search, 10.0, 2.0, 1.0) AS rank,"
                   " snippet(search, -1, char(2), char(3), '…', 12) FROM search JOIN files f ON f.id = search.rowid"
                   " WHERE search MATCH ?1 AND (?2 = '' OR f.type = ?2) ORDER BY rank LIMIT ?3");
    if (!rows.Ok()) {
        error = sqlite3_errmsg(db_);
        return false;
    }
    rows.Bind(1, expression).Bind(2, type).Bind(3, static_cast<long long>(limit));
    while (rows.Step()) {
        hits.push_back({rows.Text(0), rows.Text(1), rows.Number(2), rows.Number(3), rows.Real(4), SnippetPieces(rows.Text(5))});
    }
    return true;
}

}  // namespace tools
