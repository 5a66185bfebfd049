// A scoped use of a prepared statement: bind, step, read columns, reset on destruction.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "SqlValue.h"

struct sqlite3_stmt;

namespace emu {

// Does not own the statement (the SqliteDatabase cache does); resets it and clears its bindings
// when destroyed so the next user starts clean. Thread safety: as for SqliteDatabase.
class SqliteStatement {
public:
    explicit SqliteStatement(sqlite3_stmt* stmt) : stmt_(stmt) {}
    ~SqliteStatement();
    SqliteStatement(const SqliteStatement&) = delete;
    SqliteStatement& operator=(const SqliteStatement&) = delete;

    // Parameters are numbered from 1.
    void bind(int index, std::int64_t value);
    void bind(int index, const std::string& value);
    void bind(int index, const SqlValue& value);
    // REQUIRES: `value` stays valid until the statement is reset (string literals, static tables).
    void bindStatic(int index, const char* value);
    void bindNull(int index);

    // Advances to the next row: true while there is a row, false when done or on an error
    // (ok() tells which).
    bool step();
    bool ok() const { return ok_; }

    // Runs a statement without result rows; false on error.
    bool run();

    int columnCount() const;
    bool isNull(int column) const;
    std::int64_t getInt(int column) const;
    double getReal(int column) const;
    // The column's text; numbers as SQLite renders them, NULL as "".
    std::string getText(int column) const;
    // The same text without a copy, valid until the next step or reset.
    std::string_view textView(int column) const;

private:
    sqlite3_stmt* stmt_;
    bool ok_ = true;
};

}  // namespace emu
