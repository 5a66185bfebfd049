#include "SqliteTransaction.h"

#include <sqlite3.h>

namespace trelm {

SqliteTransaction::~SqliteTransaction() {
    // A rollback that fails leaves SQLite to roll back when the connection closes.
    if (open_) sqlite3_exec(db_, "ROLLBACK", nullptr, nullptr, nullptr);
}

uError SqliteTransaction::begin(char const* sql) {
    uError e = sqliteExec(db_, sql);
    open_ = e.ok();
    return e;
}

uError SqliteTransaction::commit() {
    uError e = sqliteExec(db_, "COMMIT");
    if (e.ok()) open_ = false;
    return e;
}

}  // namespace trelm
