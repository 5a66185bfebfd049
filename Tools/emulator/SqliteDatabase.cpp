#include "SqliteDatabase.h"

#include <sqlite3.h>

namespace emu {

namespace {
// Generated FQL statements share a handful of shapes; a cache that grows past this bound is
// being fed unusual statements and is emptied.
constexpr std::size_t kMaxCachedStatements = 512;
}  // namespace

std::unique_ptr<SqliteDatabase> SqliteDatabase::open(const std::string& path, std::string& error) {
    sqlite3* db = nullptr;
    // The store serialises access itself, so SQLite's own connection mutex is not needed.
    const int flags = SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE | SQLITE_OPEN_NOMUTEX | SQLITE_OPEN_URI;
    if (sqlite3_open_v2(path.c_str(), &db, flags, nullptr) != SQLITE_OK) {
        error = db ? sqlite3_errmsg(db) : "cannot allocate a database connection";
        sqlite3_close(db);
        return nullptr;
    }
    sqlite3_busy_timeout(db, 5000);
    return std::unique_ptr<SqliteDatabase>(new SqliteDatabase(db));
}

SqliteDatabase::~SqliteDatabase() {
    clearCache();
    sqlite3_close(db_);
}

void SqliteDatabase::clearCache() {
    for (auto& entry : cache_) sqlite3_finalize(entry.second);
    cache_.clear();
}

bool SqliteDatabase::exec(const std::string& sql, std::string& error) {
    char* message = nullptr;
    if (sqlite3_exec(db_, sql.c_str(), nullptr, nullptr, &message) != SQLITE_OK) {
        error = message ? message : sqlite3_errmsg(db_);
        sqlite3_free(message);
        return false;
    }
    return true;
}

sqlite3_stmt* SqliteDatabase::prepareCached(const std::string& sql, std::string& error) {
    auto found = cache_.find(sql);
    if (found != cache_.end()) return found->second;
    if (cache_.size() >= kMaxCachedStatements) {
        // Statements in the middle of a result stay; the rest are dropped.
        for (auto it = cache_.begin(); it != cache_.end();) {
            if (sqlite3_stmt_busy(it->second)) {
                ++it;
                continue;
            }
            sqlite3_finalize(it->second);
            it = cache_.erase(it);
        }
    }
    sqlite3_stmt* stmt = nullptr;
    if (sqlite3_prepare_v3(db_, sql.c_str(), static_cast<int>(sql.size()), SQLITE_PREPARE_PERSISTENT, &stmt,
                           nullptr) != SQLITE_OK) {
        error = sqlite3_errmsg(db_);
        sqlite3_finalize(stmt);
        return nullptr;
    }
    cache_.emplace(sql, stmt);
    return stmt;
}

std::string SqliteDatabase::lastError() const { return sqlite3_errmsg(db_); }

}  // namespace emu
