// One SQLite connection with a cache of prepared statements.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <unordered_map>

struct sqlite3;
struct sqlite3_stmt;

namespace emu {

// Owns the connection and every statement it prepared; both live until the object is destroyed.
// Thread safety: none. The owner serialises every use (SqliteStore holds its mutex around all
// calls), including the use of statements handed out by prepareCached.
class SqliteDatabase {
public:
    // Opens or creates `path` (":memory:" for a private in-memory database). Returns null and
    // sets `error` on failure.
    static std::unique_ptr<SqliteDatabase> open(const std::string& path, std::string& error);
    ~SqliteDatabase();
    SqliteDatabase(const SqliteDatabase&) = delete;
    SqliteDatabase& operator=(const SqliteDatabase&) = delete;

    // Runs one or more statements without results. Returns false and sets `error` on failure.
    bool exec(const std::string& sql, std::string& error);

    // Returns the prepared statement for `sql`, preparing it on first use. The statement stays
    // owned by the cache; callers wrap it in a SqliteStatement, which resets it after use.
    // Returns null and sets `error` when the text does not prepare.
    sqlite3_stmt* prepareCached(const std::string& sql, std::string& error);

    // The last error text of the connection.
    std::string lastError() const;

    sqlite3* handle() { return db_; }

private:
    explicit SqliteDatabase(sqlite3* db) : db_(db) {}
    void clearCache();

    sqlite3* db_;
    std::unordered_map<std::string, sqlite3_stmt*> cache_;
};

}  // namespace emu
