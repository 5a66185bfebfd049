#pragma once

#include "SqliteStatement.h"
#include "trelm/Export.h"
#include "trelm/uError.h"

namespace trelm {

// A transaction on a connection of the host's SQLite stores: rolled back when it goes out of
// scope uncommitted, so a failed operation leaves the store as it was.
// Thread safety: none; the store that owns the connection serialises its use.
class TRELM_API SqliteTransaction {
public:
    explicit SqliteTransaction(sqlite3* db) : db_(db) {}
    ~SqliteTransaction();
    SqliteTransaction(SqliteTransaction const&) = delete;
    SqliteTransaction& operator=(SqliteTransaction const&) = delete;

    // `sql` is "BEGIN" for a reader, "BEGIN IMMEDIATE" for a writer (takes the write lock now,
    // so a busy store is waited for here rather than failing half-way).
    uError begin(char const* sql = "BEGIN IMMEDIATE");
    uError commit();

private:
    sqlite3* db_;
    bool open_ = false;
};

}  // namespace trelm
