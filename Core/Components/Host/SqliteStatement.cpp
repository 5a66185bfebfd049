#include "SqliteStatement.h"

#include <sqlite3.h>

namespace trelm {

uError sqliteError(sqlite3* db, char const* what) {
    if (db == nullptr) return TRELM_ERROR_MSG(kFailure, String(what) + ": out of memory");
    String text = String(what) + ": " + sqlite3_errmsg(db);
    int const code = sqlite3_errcode(db) & 0xff;
    if (code == SQLITE_CORRUPT || code == SQLITE_NOTADB) {
        char const* file = sqlite3_db_filename(db, "main");
        text += String("; ") + (file != nullptr && *file != '\0' ? file : "the database") +
                " is damaged: move it away or delete it to start afresh";
    }
    return TRELM_ERROR_MSG(kFailure, text);
}

uError sqliteExec(sqlite3* db, char const* sql) {
    if (sqlite3_exec(db, sql, nullptr, nullptr, nullptr) != SQLITE_OK) return sqliteError(db, sql);
    return TRELM_OK();
}

uError sqliteStorePath(Configuration::Group const& group, String& path) {
    String value(":memory:");
    Variant const v = group.get(String("path"));
    if (!v.empty()) {
        uError e = v.as(value);
        if (e.failed()) return TRELM_WRAP_MSG(kInvalid, e, "configuration key path is not a string");
    }
    path = value;
    return TRELM_OK();
}

SqliteStatement::SqliteStatement(sqlite3* db, char const* sql, char const* prefix) : db_(db), prefix_(prefix) {
    if (sqlite3_prepare_v2(db, sql, -1, &stmt_, nullptr) != SQLITE_OK) stmt_ = nullptr;
}

SqliteStatement::~SqliteStatement() { sqlite3_finalize(stmt_); }

uError SqliteStatement::ready() const { return stmt_ != nullptr ? TRELM_OK() : error("prepare"); }

SqliteStatement& SqliteStatement::reset() {
    sqlite3_reset(stmt_);
    sqlite3_clear_bindings(stmt_);
    bindError_ = 0;
    return *this;
}

SqliteStatement& SqliteStatement::text(int index, std::string const& value) {
    int const rc = sqlite3_bind_text(stmt_, index, value.data(), static_cast<int>(value.size()), SQLITE_TRANSIENT);
    if (rc != SQLITE_OK && bindError_ == 0) bindError_ = rc;
    return *this;
}

SqliteStatement& SqliteStatement::integer(int index, std::int64_t value) {
    int const rc = sqlite3_bind_int64(stmt_, index, value);
    if (rc != SQLITE_OK && bindError_ == 0) bindError_ = rc;
    return *this;
}

int SqliteStatement::step() { return bindError_ != 0 ? bindError_ : sqlite3_step(stmt_); }

uError SqliteStatement::run(char const* what) { return step() == SQLITE_DONE ? TRELM_OK() : error(what); }

uError SqliteStatement::error(char const* what) const { return sqliteError(db_, (String(prefix_) + what).cStr()); }

std::string SqliteStatement::column(int index) const {
    auto const* text = reinterpret_cast<char const*>(sqlite3_column_text(stmt_, index));
    return text != nullptr ? std::string(text, static_cast<std::size_t>(sqlite3_column_bytes(stmt_, index))) : "";
}

std::int64_t SqliteStatement::columnInt(int index) const { return sqlite3_column_int64(stmt_, index); }

}  // namespace trelm
