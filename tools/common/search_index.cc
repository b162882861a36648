#include "search_index.h"
#include "search_query.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <sqlite3.h>

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <climits>
#include <cstdlib>
#include <mutex>
#include <set>
#include <sstream>
#include <tuple>
#include <variant>

#include "beneath.h"
#include "fileindex/json.h"

namespace tools {
namespace {

const char kPragmas[] = "PRAGMA journal_mode=WAL; PRAGMA synchronous=NORMAL;";
// Every connection keeps its temporary files (statement journals, sorts) in memory: SQLite may
// open no file outside the share.
const char kInMemoryTemp[] = "PRAGMA temp_store=MEMORY;";
const char kSchema[] =
    "CREATE TABLE IF NOT EXISTS files(id INTEGER PRIMARY KEY, path TEXT NOT NULL UNIQUE, type TEXT NOT NULL,"
    " size INTEGER NOT NULL, mtime INTEGER NOT NULL, problem TEXT NOT NULL DEFAULT '',"
    " fields TEXT NOT NULL DEFAULT '{}', name TEXT NOT NULL DEFAULT '',"
    // The fields again as typed columns, for filters, ranges, sorting and facets.
    " title TEXT, author TEXT, artist TEXT, album TEXT, genre TEXT, year INTEGER, pages INTEGER, duration INTEGER,"
    " taken TEXT, camera TEXT);"
    // The columns filters compare with an order: a filter that keeps few files reads only those.
    "CREATE INDEX IF NOT EXISTS files_type ON files(type);"
    "CREATE INDEX IF NOT EXISTS files_size ON files(size);"
    "CREATE INDEX IF NOT EXISTS files_mtime ON files(mtime);"
    "CREATE INDEX IF NOT EXISTS files_year ON files(year);"
    "CREATE INDEX IF NOT EXISTS files_duration ON files(duration);"
    "CREATE INDEX IF NOT EXISTS files_taken ON files(taken);"
    "CREATE VIRTUAL TABLE IF NOT EXISTS search USING fts5(name, path, body,"
    " tokenize = 'unicode61 remove_diacritics 2', prefix = '2 3');";

// Rows at `?1` or beneath it: every path beneath sorts between "<path>/" and "<path>0".
const char kUnder[] = "(path = ?1 OR (path >= ?1 || '/' AND path < ?1 || '0'))";

// How long opening and checking an index may take.
constexpr std::chrono::seconds kOpenBudget{2};
// Virtual machine steps between two looks at the deadline.
constexpr int kProgressSteps = 1000;

// --- Files SQLite opens: beneath a registered share directory only --------------------------

std::mutex g_dirsMutex;
std::set<std::string> g_shareDirs;  // real paths

bool IsWithinDir(const std::string& path, const std::string& dir) {
    return path.size() > dir.size() && path.compare(0, dir.size(), dir) == 0 && path[dir.size()] == '/';
}

// The registered share directory holding `path`, or "".
std::string ShareDirOf(const std::string& path) {
    std::lock_guard<std::mutex> lock(g_dirsMutex);
    std::string found;
    for (const auto& dir : g_shareDirs) {
        if (IsWithinDir(path, dir) && dir.size() > found.size()) found = dir;
    }
    return found;
}

// A regular file with one link, owned by this process's user when it is opened for writing; or
// a directory opened for reading (SQLite syncs the directory of its journal).
bool AcceptableFile(int fd, int flags) {
    struct stat st;
    if (fstat(fd, &st) != 0) return false;
    if (S_ISDIR(st.st_mode)) return (flags & O_ACCMODE) == O_RDONLY;
    const bool writing = (flags & O_ACCMODE) != O_RDONLY;
    return S_ISREG(st.st_mode) && st.st_nlink == 1 && (!writing || st.st_uid == geteuid());
}

// SQLite's open(): resolved beneath the share directory, never through a link, never blocking.
int ConfinedOpen(const char* path, int flags, int mode) {
    const std::string file = path != nullptr ? path : "";
    const std::string shareDir = ShareDirOf(file);
    if (shareDir.empty()) {
        errno = EACCES;
        return -1;
    }
    const Fd base(open(shareDir.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    if (!base.Valid()) return -1;
    Fd fd(OpenBeneath(base.Get(), file.substr(shareDir.size() + 1), flags, static_cast<mode_t>(mode)));
    if (!fd.Valid()) return -1;
    if (!AcceptableFile(fd.Get(), flags)) {
        errno = EPERM;
        return -1;
    }
    // SQLite expects blocking descriptors for its regular files; O_NONBLOCK only kept a FIFO from
    // holding the open.
    fcntl(fd.Get(), F_SETFL, fcntl(fd.Get(), F_GETFL) & ~O_NONBLOCK);
    return fd.Release();
}

// SQLite resolves links in a path by reading them: a link on the way makes the open fail.
ssize_t RefusedReadlink(const char*, char*, size_t) {
    errno = EPERM;
    return -1;
}

void ConfineSqliteFiles() {
    static std::once_flag once;
    std::call_once(once, [] {
        sqlite3_vfs* vfs = sqlite3_vfs_find(nullptr);
        vfs->xSetSystemCall(vfs, "open", reinterpret_cast<sqlite3_syscall_ptr>(&ConfinedOpen));
        vfs->xSetSystemCall(vfs, "readlink", reinterpret_cast<sqlite3_syscall_ptr>(&RefusedReadlink));
    });
}

// --- Statements ------------------------------------------------------------------------------

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
    // Null, a whole number or a text, as the value is.
    Statement& Bind(int index, const Json::Value& value) {
        if (value.isIntegral()) return Bind(index, static_cast<long long>(value.asLargestInt()));
        if (value.isString()) return Bind(index, value.asString());
        sqlite3_bind_null(statement_, index);
        return *this;
    }
    Statement& Bind(int index, long long number) {
        sqlite3_bind_int64(statement_, index, number);
        return *this;
    }
    // True for each row; false at the end or on failure (Done tells which).
    bool Step() {
        rc_ = sqlite3_step(statement_);
        return rc_ == SQLITE_ROW;
    }
    bool Done() const { return rc_ == SQLITE_DONE; }
    bool Reset() { return sqlite3_reset(statement_) == SQLITE_OK; }
    bool Run() {
        rc_ = sqlite3_step(statement_);
        return rc_ == SQLITE_DONE || rc_ == SQLITE_ROW;
    }
    std::string Text(int column) const {
        const auto* text = sqlite3_column_text(statement_, column);
        return text ? std::string(reinterpret_cast<const char*>(text), static_cast<size_t>(sqlite3_column_bytes(statement_, column)))
                    : std::string();
    }
    long long Number(int column) const { return sqlite3_column_int64(statement_, column); }
    bool IsNull(int column) const { return sqlite3_column_type(statement_, column) == SQLITE_NULL; }
    bool IsNumber(int column) const {
        const int type = sqlite3_column_type(statement_, column);
        return type == SQLITE_INTEGER || type == SQLITE_FLOAT;
    }
    double Real(int column) const { return sqlite3_column_double(statement_, column); }

private:
    sqlite3_stmt* statement_ = nullptr;
    int rc_ = SQLITE_OK;
};

using SchemaRows = std::vector<std::tuple<std::string, std::string, std::string, std::string>>;

// Every object of the schema: type, name, table and SQL, sorted. Empty with `ok` false on failure.
SchemaRows SchemaOf(sqlite3* db, bool& ok) {
    SchemaRows rows;
    Statement list(db, "SELECT type, name, tbl_name, coalesce(sql, '') FROM sqlite_schema");
    while (list.Ok() && list.Step()) rows.emplace_back(list.Text(0), list.Text(1), list.Text(2), list.Text(3));
    ok = list.Ok() && list.Done();
    std::sort(rows.begin(), rows.end());
    return rows;
}

// Our schema as SQLite stores it, made once in memory.
const SchemaRows& OurSchema() {
    static const SchemaRows schema = [] {
        sqlite3* db = nullptr;
        sqlite3_open_v2(":memory:", &db, SQLITE_OPEN_READWRITE, nullptr);
        sqlite3_exec(db, kSchema, nullptr, nullptr, nullptr);
        bool ok = false;
        SchemaRows rows = SchemaOf(db, ok);
        sqlite3_close(db);
        return rows;
    }();
    return schema;
}

// The rows less the indexes of ours among them: an index that is missing (made before it was
// ours, or dropped) costs speed only, and the daemon's next open makes it again.
SchemaRows WithoutOurIndexes(SchemaRows rows) {
    const SchemaRows& ours = OurSchema();
    rows.erase(std::remove_if(rows.begin(), rows.end(),
                              [&ours](const auto& row) { return std::get<0>(row) == "index" && std::binary_search(ours.begin(), ours.end(), row); }),
               rows.end());
    return rows;
}

IndexProblem ProblemOf(int rc) {
    switch (rc & 0xff) {
        case SQLITE_CORRUPT:
        case SQLITE_NOTADB:
        case SQLITE_CANTOPEN:
        case SQLITE_PERM:
            return IndexProblem::Damaged;
        case SQLITE_INTERRUPT:
            return IndexProblem::TimedOut;
        default:
            return IndexProblem::Failed;
    }
}

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

std::string RealPath(const std::string& path) {
    char real[PATH_MAX];
    return realpath(path.c_str(), real) != nullptr ? std::string(real) : std::string();
}

// The index file as it stands: false when there is none; `acceptable` false when it is not one
// SQLite may open (see AcceptableFile).
bool IndexFileStat(const std::string& shareDir, bool writing, struct stat& st, bool& acceptable) {
    const Fd base(open(shareDir.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    const Fd fd(base.Valid() ? OpenBeneath(base.Get(), std::string(SearchIndex::kDirName) + "/" + SearchIndex::kFileName,
                                           O_RDONLY)
                             : -1);
    if (!fd.Valid()) {
        acceptable = errno == ENOENT;
        return false;
    }
    acceptable = fstat(fd.Get(), &st) == 0 && S_ISREG(st.st_mode) && AcceptableFile(fd.Get(), writing ? O_RDWR : O_RDONLY);
    return true;
}

Statement& BindQuery(Statement& statement, const SearchQuery& query, const std::string& type) {
    statement.Bind(1, query.match).Bind(2, type);
    int next = 4;
    for (const auto& param : query.params) {
        if (const auto* text = std::get_if<std::string>(&param)) statement.Bind(next++, *text);
        else statement.Bind(next++, std::get<long long>(param));
    }
    return statement;
}

// A facet's value, ordered as SQLite orders values: numbers by their value before texts.
using FacetValue = std::tuple<bool, long long, std::string>;  // is a text, number, as text

// At most kMaxFacetValues of `counts`, the commonest first, alike in the order of their values.
std::vector<std::pair<FacetValue, long long>> Commonest(const std::map<FacetValue, long long>& counts) {
    std::vector<std::pair<FacetValue, long long>> values(counts.begin(), counts.end());
    std::stable_sort(values.begin(), values.end(), [](const auto& a, const auto& b) { return a.second > b.second; });
    values.resize(std::min(values.size(), static_cast<size_t>(kMaxFacetValues)));
    return values;
}

// " FROM ... WHERE ..." of a parsed query: ?1 the words, ?2 the type ("" for any), the
// parameters of its filters from ?4 on.
std::string From(const SearchQuery& query) {
    std::string where;
    int next = 4;
    for (const char c : query.where) where += c == '?' ? "?" + std::to_string(next++) : std::string(1, c);
    // With words, the words' matches lead: CROSS JOIN keeps SQLite from looking each file of a
    // filter's index up in the text index instead.
    return std::string(query.match.empty() ? " FROM files f WHERE" : " FROM search CROSS JOIN files f ON f.id = search.rowid WHERE"
                                                                     " search MATCH ?1 AND") +
           " (?2 = '' OR f.type = ?2) AND (" + where + ")";
}

}  // namespace

std::string QueryError(const std::string& query) {
    SearchQuery parsed;
    std::string error;
    ParseSearchQuery(query, parsed, error);
    return error;
}

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

std::unique_ptr<SearchIndex> SearchIndex::Open(const std::string& shareDir, bool create, IndexProblem& problem,
                                               std::string& error) {
    ConfineSqliteFiles();
    const std::string real = RealPath(shareDir);
    problem = IndexProblem::Missing;
    error = "the share directory " + shareDir + " cannot be reached";
    if (real.empty()) return nullptr;
    {
        std::lock_guard<std::mutex> lock(g_dirsMutex);
        g_shareDirs.insert(real);
    }
    struct stat before{};
    bool acceptable = false;
    const bool existed = IndexFileStat(real, create, before, acceptable);
    if (!acceptable) {
        problem = IndexProblem::Damaged;
        error = "the index is not a regular file of this service reached without a link";
        return nullptr;
    }
    if (!existed && !create) {
        error = "the share has no index yet";
        return nullptr;
    }
    const std::string file = real + "/" + kDirName + "/" + kFileName;
    sqlite3* db = nullptr;
    const int flags = (create ? SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE : SQLITE_OPEN_READONLY) | SQLITE_OPEN_NOFOLLOW;
    const int rc = sqlite3_open_v2(file.c_str(), &db, flags, nullptr);
    std::unique_ptr<SearchIndex> index(new SearchIndex(db, real, 0, 0));
    if (rc != SQLITE_OK) {
        problem = existed ? ProblemOf(rc) : IndexProblem::Failed;
        error = db ? sqlite3_errmsg(db) : "out of memory";
        return nullptr;
    }
    sqlite3_db_config(db, SQLITE_DBCONFIG_DEFENSIVE, 1, nullptr);
    sqlite3_db_config(db, SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr);
    sqlite3_progress_handler(db, kProgressSteps, &SearchIndex::OnProgress, index.get());
    sqlite3_busy_timeout(db, 1000);
    index->SetDeadline(std::chrono::steady_clock::now() + kOpenBudget);
    const bool made = index->Exec(kInMemoryTemp) && (!create || (index->Exec(kPragmas) && index->Exec(kSchema)));
    // A statement of the schema that fails outright met an object of its name that is not ours
    // (a view where a table belongs, a table without the column to index).
    const bool clash = !made && sqlite3_errcode(db) == SQLITE_ERROR;
    bool listed = false;
    const bool ours = made && WithoutOurIndexes(SchemaOf(db, listed)) == WithoutOurIndexes(OurSchema());
    struct stat after{};
    const bool same = IndexFileStat(real, create, after, acceptable) && acceptable &&
                      (!existed || (after.st_dev == before.st_dev && after.st_ino == before.st_ino));
    if (!ours || !same) {
        const bool failed = (!made || !listed) && !clash;
        problem = failed ? (index->problem_ == IndexProblem::None ? ProblemOf(sqlite3_extended_errcode(db)) : index->problem_)
                         : IndexProblem::Damaged;
        error = failed ? sqlite3_errmsg(db) : "the index's schema is not this service's";
        return nullptr;
    }
    index->dev_ = after.st_dev;
    index->ino_ = after.st_ino;
    index->SetDeadline(std::chrono::steady_clock::time_point::max());
    problem = IndexProblem::None;
    error.clear();
    return index;
}

std::string SearchIndex::SetAside(const std::string& shareDir) {
    const std::string real = RealPath(shareDir);
    const Fd base(real.empty() ? -1 : open(real.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    if (!base.Valid()) return "";
    const Fd dir(OpenBeneath(base.Get(), kDirName, O_RDONLY | O_DIRECTORY));
    if (!dir.Valid()) {
        if (errno == ENOENT) return "";  // nothing to move
        // The database directory itself is of the wrong kind: move it aside in "@eaDir".
        const Fd eaDir(OpenBeneath(base.Get(), "@eaDir", O_RDONLY | O_DIRECTORY));
        const std::string name = NameOf(kDirName);
        const std::string aside = SetAsideName(name);
        if (!eaDir.Valid() || renameat(eaDir.Get(), name.c_str(), eaDir.Get(), aside.c_str()) != 0) return "";
        return real + "/@eaDir/" + aside;
    }
    const std::string aside = SetAsideName(kFileName);
    if (renameat(dir.Get(), kFileName, dir.Get(), aside.c_str()) != 0) return "";
    // The write-ahead log and shared memory belong to what went aside; anything else at their
    // names goes aside too.
    for (const char* extra : {"-wal", "-shm"}) {
        const std::string name = std::string(kFileName) + extra;
        if (unlinkat(dir.Get(), name.c_str(), 0) != 0 && errno == EISDIR) {
            renameat(dir.Get(), name.c_str(), dir.Get(), SetAsideName(name).c_str());
        }
    }
    return real + "/" + kDirName + "/" + aside;
}

SearchIndex::~SearchIndex() { sqlite3_close(db_); }

int SearchIndex::OnProgress(void* self) {
    const auto* index = static_cast<const SearchIndex*>(self);
    return (index->stop_ != nullptr && *index->stop_ != 0) || std::chrono::steady_clock::now() >= index->deadline_;
}

void SearchIndex::SetDeadline(std::chrono::steady_clock::time_point deadline, const volatile sig_atomic_t* stop) {
    deadline_ = deadline;
    stop_ = stop;
}

bool SearchIndex::StillOnDisk() const {
    struct stat st{};
    bool acceptable = false;
    return IndexFileStat(shareDir_, false, st, acceptable) && st.st_dev == dev_ && st.st_ino == ino_;
}

bool SearchIndex::Check(int rc) {
    if (rc == SQLITE_OK || rc == SQLITE_DONE || rc == SQLITE_ROW) return true;
    problem_ = ProblemOf(sqlite3_extended_errcode(db_));
    return false;
}

bool SearchIndex::Exec(const char* sql) { return Check(sqlite3_exec(db_, sql, nullptr, nullptr, nullptr)); }

bool SearchIndex::Begin() {
    problem_ = IndexProblem::None;
    return Exec("BEGIN IMMEDIATE");
}

bool SearchIndex::Commit() { return Exec("COMMIT"); }

void SearchIndex::Rollback() {
    if (sqlite3_get_autocommit(db_) == 0) sqlite3_exec(db_, "ROLLBACK", nullptr, nullptr, nullptr);
}

// "make model", either alone when the other is missing.
std::string CameraOf(const Json::Value& fields) {
    const auto text = [&fields](const char* name) { return fields[name].isString() ? fields[name].asString() : std::string(); };
    const std::string make = text("camera_make");
    const std::string model = text("camera_model");
    return make.empty() || model.empty() ? make + model : make + " " + model;
}

// The fields whose words a search finds as it finds the text's (and a filter on a text field
// looks for first).
const char* const kSearchedFields[] = {"title", "author", "artist", "album", "album_artist", "genre", "camera_make", "camera_model", "lens"};

// The text searched for a file: its own and its text fields'.
std::string SearchedText(const IndexedFile& file, const Json::Value& fields) {
    std::string text = file.text;
    for (const char* field : kSearchedFields) {
        if (fields[field].isString()) text += "\n" + fields[field].asString();
    }
    return text;
}

// The columns a file's fields fill, each from the field of its name.
const char* const kFieldColumns[] = {"title", "author", "artist", "album", "genre", "year", "pages", "duration", "taken"};

bool SearchIndex::Put(const IndexedFile& file) {
    std::string columns, values, updates;
    int next = 9;
    for (const char* column : kFieldColumns) {
        columns += std::string(", ") + column;
        values += ", ?" + std::to_string(next++);
        updates += std::string(", ") + column + " = excluded." + column;
    }
    Statement upsert(db_, "INSERT INTO files(path, type, size, mtime, problem, fields, name, camera" + columns +
                              ") VALUES(?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8" + values + ") ON CONFLICT(path) DO UPDATE SET"
                              " type = excluded.type, size = excluded.size, mtime = excluded.mtime, problem = excluded.problem,"
                              " fields = excluded.fields, name = excluded.name, camera = excluded.camera" + updates +
                              " RETURNING id");
    const Json::Value fields = file.fields.isObject() ? file.fields : Json::Value(Json::objectValue);
    const std::string camera = CameraOf(fields);
    if (upsert.Ok()) {
        upsert.Bind(1, file.path).Bind(2, file.type).Bind(3, file.size).Bind(4, file.mtime).Bind(5, file.problem)
            .Bind(6, QIRA::FILEINDEX::toString(fields)).Bind(7, NameOf(file.path))
            .Bind(8, camera.empty() ? Json::Value() : Json::Value(camera));
        next = 9;
        for (const char* column : kFieldColumns) upsert.Bind(next++, fields[column]);
    }
    if (!upsert.Ok() || !upsert.Step()) return Check(SQLITE_ERROR);
    const long long id = upsert.Number(0);
    // Finished before the next statement: a RETURNING statement left open and finalized later,
    // after other writes, rolls the whole transaction back in defensive mode.
    if (!upsert.Reset()) return Check(SQLITE_ERROR);
    Statement drop(db_, "DELETE FROM search WHERE rowid = ?1");
    Statement add(db_, "INSERT INTO search(rowid, name, path, body) VALUES(?1, ?2, ?3, ?4)");
    return (drop.Ok() && add.Ok() && drop.Bind(1, id).Run() &&
            add.Bind(1, id).Bind(2, NameOf(file.path)).Bind(3, file.path).Bind(4, SearchedText(file, fields)).Run()) ||
           Check(SQLITE_ERROR);
}

bool SearchIndex::Remove(const std::string& path) {
    Statement search(db_, std::string("DELETE FROM search WHERE rowid IN (SELECT id FROM files WHERE ") + kUnder + ")");
    Statement files(db_, std::string("DELETE FROM files WHERE ") + kUnder);
    return (search.Ok() && files.Ok() && search.Bind(1, path).Run() && files.Bind(1, path).Run()) || Check(SQLITE_ERROR);
}

bool SearchIndex::Rename(const std::string& from, const std::string& to) {
    if (from == to) return true;
    if (!Remove(to)) return false;
    Statement rows(db_, std::string("SELECT id, path FROM files WHERE ") + kUnder);
    if (!rows.Ok()) return Check(SQLITE_ERROR);
    rows.Bind(1, from);
    std::vector<std::pair<long long, std::string>> moved;
    while (rows.Step()) moved.emplace_back(rows.Number(0), to + rows.Text(1).substr(from.size()));
    if (!rows.Done()) return Check(SQLITE_ERROR);
    for (const auto& [id, path] : moved) {
        Statement file(db_, "UPDATE files SET path = ?2 WHERE id = ?1");
        Statement search(db_, "UPDATE search SET name = ?2, path = ?3 WHERE rowid = ?1");
        if (!file.Ok() || !search.Ok() || !file.Bind(1, id).Bind(2, path).Run() ||
            !search.Bind(1, id).Bind(2, NameOf(path)).Bind(3, path).Run()) {
            return Check(SQLITE_ERROR);
        }
    }
    return true;
}

bool SearchIndex::Under(const std::string& path, std::map<std::string, StoredFile>& stored) {
    stored.clear();
    Statement rows(db_, std::string("SELECT path, size, mtime, type FROM files WHERE ") + kUnder);
    if (!rows.Ok()) return Check(SQLITE_ERROR);
    rows.Bind(1, path);
    while (rows.Step()) stored[rows.Text(0)] = {rows.Number(1), rows.Number(2), rows.Text(3)};
    return rows.Done() || Check(SQLITE_ERROR);
}

bool SearchIndex::Entry(const std::string& path, IndexedFile& file) {
    Statement row(db_, "SELECT type, size, mtime, problem, fields FROM files WHERE path = ?1");
    if (!row.Ok() || !row.Bind(1, path).Step()) return false;
    Json::Value fields;
    file = {path, row.Text(0), row.Number(1), row.Number(2), "", row.Text(3),
            QIRA::FILEINDEX::fromString(fields, row.Text(4)) && fields.isObject() ? fields : Json::Value(Json::objectValue)};
    return true;
}

long long SearchIndex::Count() {
    Statement count(db_, "SELECT count(*) FROM files");
    return count.Ok() && count.Step() ? count.Number(0) : -1;
}

long long SearchIndex::CountUnder(const std::string& path) {
    Statement count(db_, std::string("SELECT count(*) FROM files WHERE ") + kUnder);
    if (!count.Ok()) return -1;
    count.Bind(1, path);
    return count.Step() ? count.Number(0) : -1;
}

bool SearchIndex::Search(const std::string& query, const std::string& type, int limit, std::vector<SearchHit>& hits,
                         std::string& error, const std::string& sort) {
    SearchQuery parsed;
    if (!ParseSearchQuery(query, parsed, error)) return false;
    const bool words = !parsed.match.empty();
    // "+" keeps SQLite from walking a whole index in the order asked for: the hits are few, or
    // sorting them costs less than that walk.
    const std::string order = sort == "date" ? "+f.mtime DESC, +f.path" : sort == "name" ? "+f.name, +f.path" : words ? "rank, +f.path" : "+f.path";
    // With words, the best hits are chosen first and only theirs get a snippet.
    const std::string sql =
        words ? "WITH top AS (SELECT f.id AS id, bm25(search, 10.0, 2.0, 1.0) AS rank" + From(parsed) + " ORDER BY " + order +
                    " LIMIT ?3) SELECT f.path, f.type, f.size, f.mtime, top.rank AS rank, snippet(search, -1, char(2), char(3), '…', 12),"
                    " f.fields FROM top JOIN search ON search.rowid = top.id JOIN files f ON f.id = top.id WHERE search MATCH ?1 ORDER BY " + order
              : "SELECT f.path, f.type, f.size, f.mtime, 0, '', f.fields" + From(parsed) + " ORDER BY " + order + " LIMIT ?3";
    Statement rows(db_, sql);
    if (rows.Ok()) {
        BindQuery(rows, parsed, type).Bind(3, static_cast<long long>(limit));
        while (rows.Step()) {
            hits.push_back({rows.Text(0), rows.Text(1), rows.Number(2), rows.Number(3), rows.Real(4), SnippetPieces(rows.Text(5)),
                            rows.Text(6)});
        }
        if (rows.Done()) return true;
    }
    error = SearchError();
    return false;
}

bool SearchIndex::CountHits(const std::string& query, const std::string& type, long long& count, std::string& error) {
    SearchQuery parsed;
    if (!ParseSearchQuery(query, parsed, error)) return false;
    // Words alone are counted in the text index: each of its rows is a file's.
    const bool wordsAlone = !parsed.match.empty() && parsed.where == "1" && type.empty();
    Statement counted(db_, wordsAlone ? std::string("SELECT count(*) FROM search WHERE search MATCH ?1") : "SELECT count(*)" + From(parsed));
    if (counted.Ok() && (wordsAlone ? counted.Bind(1, parsed.match) : BindQuery(counted, parsed, type)).Step()) {
        count = counted.Number(0);
        return true;
    }
    error = SearchError();
    return false;
}

bool SearchIndex::Facets(const std::string& query, const std::string& type, Json::Value& facets, std::string& error) {
    SearchQuery parsed;
    if (!ParseSearchQuery(query, parsed, error)) return false;
    // One pass over the hits counts all four; the commonest values of each are kept.
    const char* const kinds[] = {"type", "year", "artist", "camera"};
    std::map<FacetValue, long long> counts[4];
    Statement rows(db_, "SELECT f.type, f.year, f.artist, nullif(f.camera, '')" + From(parsed));
    if (rows.Ok()) {
        BindQuery(rows, parsed, type);
        while (rows.Step()) {
            for (int kind = 0; kind < 4; ++kind) {
                if (rows.IsNull(kind)) continue;
                auto& count = counts[kind];
                const FacetValue value{!rows.IsNumber(kind), rows.Number(kind), rows.Text(kind)};
                const auto known = count.find(value);
                if (known != count.end()) ++known->second;
                else if (count.size() < kMaxFacetDistinct) count.emplace(value, 1);
            }
        }
    }
    if (!rows.Ok() || !rows.Done()) {
        error = SearchError();
        return false;
    }
    facets = Json::Value(Json::objectValue);
    for (int kind = 0; kind < 4; ++kind) {
        facets[kinds[kind]] = Json::Value(Json::objectValue);
        for (const auto& [value, count] : Commonest(counts[kind])) {
            facets[kinds[kind]][std::get<std::string>(value)] = static_cast<Json::Int64>(count);
        }
    }
    return true;
}

std::string SearchIndex::SearchError() {
    Check(SQLITE_ERROR);
    return problem_ == IndexProblem::TimedOut ? "the search took too long" : sqlite3_errmsg(db_);
}

}  // namespace tools
