#include "RuntimeConfiguration.h"

#include <sqlite3.h>

#include "GetRuntimeConfigurationMessage.h"
#include "PrivateFile.h"
#include "ResetRuntimeConfigurationMessage.h"
#include "RuntimeConfigurationMessage.h"

namespace trelm {

namespace {

char const kMemory[] = ":memory:";

uError sqliteError(sqlite3* db, char const* what) {
    String text = String(what) + ": " + (db != nullptr ? sqlite3_errmsg(db) : "out of memory");
    return TRELM_ERROR_MSG(kFailure, text);
}

// A prepared statement, finalised when it goes out of scope.
struct Statement {
    sqlite3_stmt* stmt = nullptr;
    ~Statement() { sqlite3_finalize(stmt); }
};

uError exec(sqlite3* db, char const* sql) {
    if (sqlite3_exec(db, sql, nullptr, nullptr, nullptr) != SQLITE_OK) return sqliteError(db, sql);
    return TRELM_OK();
}

// One transaction per message: rolled back unless committed.
struct Transaction {
    sqlite3* db;
    bool open = false;
    ~Transaction() {
        if (open) sqlite3_exec(db, "ROLLBACK", nullptr, nullptr, nullptr);
    }
    uError begin(char const* sql) {
        uError e = exec(db, sql);
        open = e.ok();
        return e;
    }
    uError commit() {
        uError e = exec(db, "COMMIT");
        if (e.ok()) open = false;
        return e;
    }
};

uError prepare(sqlite3* db, char const* sql, Statement& st) {
    if (sqlite3_prepare_v2(db, sql, -1, &st.stmt, nullptr) != SQLITE_OK) return sqliteError(db, "prepare");
    return TRELM_OK();
}

uError bindText(sqlite3* db, sqlite3_stmt* stmt, int index, String const& text) {
    if (sqlite3_bind_text(stmt, index, text.cStr(), static_cast<int>(text.size()), SQLITE_TRANSIENT) != SQLITE_OK) {
        return sqliteError(db, "bind");
    }
    return TRELM_OK();
}

}  // namespace

RuntimeConfiguration::RuntimeConfiguration(String name, String componentId)
    : Component(std::move(name), std::move(componentId)) {}

RuntimeConfiguration::~RuntimeConfiguration() { closeLocked(); }

uError RuntimeConfiguration::open(String const& path) {
    std::lock_guard<std::mutex> lock(mutex_);
    return openLocked(path);
}

void RuntimeConfiguration::close() {
    std::lock_guard<std::mutex> lock(mutex_);
    closeLocked();
    openFailed_ = false;
}

void RuntimeConfiguration::closeLocked() {
    if (db_ != nullptr) sqlite3_close_v2(db_);
    db_ = nullptr;
    path_ = String();
}

uError RuntimeConfiguration::openLocked(String const& path) {
    closeLocked();
    openFailed_ = true;
    if (path.empty()) return TRELM_ERROR_MSG(kInvalid, "empty store path");
    if (path != kMemory) {
        TRELM_RETURN_IF_ERROR(createPrivateFile(path));
    }
    sqlite3* db = nullptr;
    int rc = sqlite3_open_v2(path.cStr(), &db, SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE, nullptr);
    if (rc != SQLITE_OK) {
        uError e = sqliteError(db, "cannot open the runtime configuration store");
        sqlite3_close_v2(db);
        return e;
    }
    sqlite3_busy_timeout(db, 5000);
    uError e = exec(db,
                    "CREATE TABLE IF NOT EXISTS runtime_configuration ("
                    " tag TEXT NOT NULL, key TEXT NOT NULL, value TEXT NOT NULL,"
                    " PRIMARY KEY (tag, key)) WITHOUT ROWID");
    if (e.failed()) {
        sqlite3_close_v2(db);
        return e;
    }
    db_ = db;
    path_ = path;
    openFailed_ = false;
    return TRELM_OK();
}

uError RuntimeConfiguration::ensureOpenLocked() {
    if (db_ != nullptr) return TRELM_OK();
    if (openFailed_) return TRELM_ERROR_MSG(kFailure, "the runtime configuration store is not open");
    return openLocked(String(kMemory));
}

uError RuntimeConfiguration::store(String const& tag, Set<Configuration::Value> const& values) {
    std::lock_guard<std::mutex> lock(mutex_);
    TRELM_RETURN_IF_ERROR(ensureOpenLocked());
    Transaction tx{db_};
    TRELM_RETURN_IF_ERROR(tx.begin("BEGIN IMMEDIATE"));
    Statement st;
    uError e = prepare(db_, "INSERT OR REPLACE INTO runtime_configuration (tag, key, value) VALUES (?1, ?2, ?3)", st);
    if (e.failed()) return e;
    for (Configuration::Value const& value : values) {
        String text;
        e = value.value().as(text);
        if (e.failed()) return TRELM_WRAP_MSG(kInvalid, e, "value of " + value.key() + " has no text form");
        sqlite3_reset(st.stmt);
        e = bindText(db_, st.stmt, 1, tag);
        if (e.ok()) e = bindText(db_, st.stmt, 2, value.key());
        if (e.ok()) e = bindText(db_, st.stmt, 3, text);
        if (e.failed()) return e;
        if (sqlite3_step(st.stmt) != SQLITE_DONE) return sqliteError(db_, "store");
    }
    return tx.commit();
}

uError RuntimeConfiguration::reset(String const& tag, Set<String> const& keys) {
    std::lock_guard<std::mutex> lock(mutex_);
    TRELM_RETURN_IF_ERROR(ensureOpenLocked());
    Transaction tx{db_};
    TRELM_RETURN_IF_ERROR(tx.begin("BEGIN IMMEDIATE"));
    Statement st;
    uError e = prepare(db_, "DELETE FROM runtime_configuration WHERE tag = ?1 AND key = ?2", st);
    if (e.failed()) return e;
    for (String const& key : keys) {
        sqlite3_reset(st.stmt);
        e = bindText(db_, st.stmt, 1, tag);
        if (e.ok()) e = bindText(db_, st.stmt, 2, key);
        if (e.failed()) return e;
        if (sqlite3_step(st.stmt) != SQLITE_DONE) return sqliteError(db_, "reset");
    }
    return tx.commit();
}

uError RuntimeConfiguration::get(String const& tag, Map<String, Variant>& values) {
    std::lock_guard<std::mutex> lock(mutex_);
    TRELM_RETURN_IF_ERROR(ensureOpenLocked());
    Statement st;
    TRELM_RETURN_IF_ERROR(prepare(db_, "SELECT value FROM runtime_configuration WHERE tag = ?1 AND key = ?2", st));
    // Read everything first so that a failure leaves the caller's map untouched.
    Map<String, Variant> found;
    Transaction tx{db_};
    uError e = tx.begin("BEGIN");
    if (e.failed()) return e;
    for (auto const& entry : values) {
        sqlite3_reset(st.stmt);
        e = bindText(db_, st.stmt, 1, tag);
        if (e.ok()) e = bindText(db_, st.stmt, 2, entry.first);
        if (e.failed()) return e;
        int rc = sqlite3_step(st.stmt);
        if (rc == SQLITE_ROW) {
            auto const* text = reinterpret_cast<char const*>(sqlite3_column_text(st.stmt, 0));
            int size = sqlite3_column_bytes(st.stmt, 0);
            TRELM_RETURN_IF_ERROR(
                found.insert(entry.first, Variant(String(text != nullptr ? text : "", static_cast<unsigned>(size)))));
        } else if (rc != SQLITE_DONE) {
            return sqliteError(db_, "get");
        }
    }
    e = tx.commit();
    if (e.failed()) return e;
    if (Map<String, String> const* held = held_.search(tag)) {
        for (auto const& entry : values) {
            if (String const* value = held->search(entry.first)) {
                TRELM_RETURN_IF_ERROR(found.insert(entry.first, Variant(*value)));
            }
        }
    }
    for (auto const& [key, value] : found) {
        TRELM_RETURN_IF_ERROR(values.insert(key, value));
    }
    return TRELM_OK();
}

uError RuntimeConfiguration::hold(String const& tag, Set<Configuration::Value> const& values) {
    Map<String, String> texts;
    for (Configuration::Value const& value : values) {
        String text;
        uError e = value.value().as(text);
        if (e.failed()) return TRELM_WRAP_MSG(kInvalid, e, "value of " + value.key() + " has no text form");
        TRELM_RETURN_IF_ERROR(texts.insert(value.key(), text));
    }
    std::lock_guard<std::mutex> lock(mutex_);
    Map<String, String>* held = held_.search(tag);
    if (held == nullptr) {
        TRELM_RETURN_IF_ERROR(held_.insert(tag, std::move(texts)));
        return TRELM_OK();
    }
    for (auto const& [key, text] : texts) TRELM_RETURN_IF_ERROR(held->insert(key, text));
    return TRELM_OK();
}

void RuntimeConfiguration::release(String const& tag, Set<String> const& keys) {
    std::lock_guard<std::mutex> lock(mutex_);
    Map<String, String>* held = held_.search(tag);
    if (held == nullptr) return;
    // Removing cannot fail: nothing is allocated; an absent key is fine.
    for (String const& key : keys) held->remove(key).ignore();
    if (held->empty()) held_.remove(tag).ignore();
}

uError RuntimeConfiguration::sendConfigImpl(Configuration::Group const& group) {
    String path(kMemory);
    Variant v = group.get(String("path"));
    if (!v.empty()) {
        uError e = v.as(path);
        if (e.failed()) return TRELM_WRAP_MSG(kInvalid, e, "configuration key path is not a string");
    }
    std::lock_guard<std::mutex> lock(mutex_);
    // Configuring the same store again keeps it open (and an in-memory store's values alive).
    if (db_ != nullptr && path == path_) return TRELM_OK();
    return openLocked(path);
}

uError RuntimeConfiguration::handleMessage(IMessage& msg) {
    if (msg.type() == RuntimeConfigurationMessage::kType) {
        auto* m = dynamic_cast<RuntimeConfigurationMessage*>(&msg);
        if (m == nullptr) return TRELM_ERROR(kInvalid);
        return store(m->tag, m->values);
    }
    if (msg.type() == ResetRuntimeConfigurationMessage::kType) {
        auto* m = dynamic_cast<ResetRuntimeConfigurationMessage*>(&msg);
        if (m == nullptr) return TRELM_ERROR(kInvalid);
        return reset(m->tag, m->keys);
    }
    if (msg.type() == GetRuntimeConfigurationMessage::kType) {
        auto* m = dynamic_cast<GetRuntimeConfigurationMessage*>(&msg);
        if (m == nullptr) return TRELM_ERROR(kInvalid);
        return get(m->tag, m->values);
    }
    return TRELM_OK();
}

}  // namespace trelm
