#pragma once

#include <cstdint>
#include <string>

#include "trelm/Configuration.h"
#include "trelm/Export.h"
#include "trelm/String.h"
#include "trelm/uError.h"

struct sqlite3;
struct sqlite3_stmt;

namespace trelm {

// kFailure with "`what`: SQLite's message for `db`" ("out of memory" when there is no handle);
// when SQLite found the file damaged, the text names the file and says to move it away.
TRELM_API uError sqliteError(sqlite3* db, char const* what);
// Runs `sql` (one or more statements without results); kFailure naming the statement otherwise.
TRELM_API uError sqliteExec(sqlite3* db, char const* sql);

// The "path" key of a SQLite store component's configuration group: a file name, or ":memory:"
// (also when the key is absent). kInvalid naming the key when it is not a text.
TRELM_API uError sqliteStorePath(Configuration::Group const& group, String& path);

// A prepared statement of the host's SQLite stores, finalised when it goes out of scope.
//
// Binding returns the statement so binds chain; a failed bind is kept and reported by the next
// step() / run(), so a caller checks once. `prefix` is put before every error text this statement
// makes (the store's name), so a user reading the error knows which file it is about.
//
// Thread safety: none; the store that owns the connection serialises its use.
class TRELM_API SqliteStatement {
public:
    SqliteStatement(sqlite3* db, char const* sql, char const* prefix = "");
    ~SqliteStatement();
    SqliteStatement(SqliteStatement const&) = delete;
    SqliteStatement& operator=(SqliteStatement const&) = delete;

    // Whether the statement was prepared; kFailure with SQLite's reason otherwise.
    uError ready() const;
    // Back to its first step with no values bound.
    SqliteStatement& reset();
    SqliteStatement& text(int index, std::string const& value);
    SqliteStatement& text(int index, String const& value) { return text(index, value.str()); }
    SqliteStatement& integer(int index, std::int64_t value);
    // SQLITE_ROW, SQLITE_DONE or an error code (also a failed bind's).
    int step();
    // One step that must finish the statement; kFailure naming `what` otherwise.
    uError run(char const* what);
    // The error for the last failed step, naming `what`.
    uError error(char const* what) const;
    // Column `index` of the current row as text ("" for NULL) and as an integer.
    std::string column(int index) const;
    std::int64_t columnInt(int index) const;

private:
    sqlite3* db_;
    sqlite3_stmt* stmt_ = nullptr;
    char const* prefix_;
    int bindError_ = 0;
};

}  // namespace trelm
