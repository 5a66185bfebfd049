#include "SqliteStatement.h"

#include <sqlite3.h>

namespace emu {

SqliteStatement::~SqliteStatement() {
    sqlite3_reset(stmt_);
    sqlite3_clear_bindings(stmt_);
}

void SqliteStatement::bind(int index, std::int64_t value) { sqlite3_bind_int64(stmt_, index, value); }

void SqliteStatement::bind(int index, const std::string& value) {
    sqlite3_bind_text(stmt_, index, value.data(), static_cast<int>(value.size()), SQLITE_TRANSIENT);
}

void SqliteStatement::bindStatic(int index, const char* value) { sqlite3_bind_text(stmt_, index, value, -1, SQLITE_STATIC); }

void SqliteStatement::bind(int index, const SqlValue& value) {
    switch (value.kind) {
        case SqlValue::Kind::Null: bindNull(index); break;
        case SqlValue::Kind::Integer: bind(index, value.integer); break;
        case SqlValue::Kind::Real: sqlite3_bind_double(stmt_, index, value.real); break;
        case SqlValue::Kind::Text: bind(index, value.text); break;
    }
}

void SqliteStatement::bindNull(int index) { sqlite3_bind_null(stmt_, index); }

bool SqliteStatement::step() {
    const int rc = sqlite3_step(stmt_);
    if (rc == SQLITE_ROW) return true;
    ok_ = rc == SQLITE_DONE;
    return false;
}

bool SqliteStatement::run() {
    while (step()) {
    }
    return ok_;
}

int SqliteStatement::columnCount() const { return sqlite3_column_count(stmt_); }

bool SqliteStatement::isNull(int column) const { return sqlite3_column_type(stmt_, column) == SQLITE_NULL; }

std::int64_t SqliteStatement::getInt(int column) const { return sqlite3_column_int64(stmt_, column); }

double SqliteStatement::getReal(int column) const { return sqlite3_column_double(stmt_, column); }

std::string SqliteStatement::getText(int column) const {
    const unsigned char* text = sqlite3_column_text(stmt_, column);
    if (!text) return {};
    return std::string(reinterpret_cast<const char*>(text), static_cast<std::size_t>(sqlite3_column_bytes(stmt_, column)));
}

std::string_view SqliteStatement::textView(int column) const {
    const unsigned char* text = sqlite3_column_text(stmt_, column);
    if (!text) return {};
    return {reinterpret_cast<const char*>(text), static_cast<std::size_t>(sqlite3_column_bytes(stmt_, column))};
}

}  // namespace emu
