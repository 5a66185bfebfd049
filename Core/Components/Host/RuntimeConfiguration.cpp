#include "RuntimeConfiguration.h"

#include <sqlite3.h>

#include "GetRuntimeConfigurationMessage.h"
#include "PrivateFile.h"
#include "ResetRuntimeConfigurationMessage.h"
#include "RuntimeConfigurationMessage.h"
#include "SqliteStatement.h"
#include "SqliteTransaction.h"

namespace trelm {

namespace {

char const kMemory[] = ":memory:";

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
    uError e = sqliteExec(db,
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
    SqliteTransaction tx(db_);
    TRELM_RETURN_IF_ERROR(tx.begin());
    SqliteStatement st(db_, "INSERT OR REPLACE INTO runtime_configuration (tag, key, value) VALUES (?1, ?2, ?3)");
    TRELM_RETURN_IF_ERROR(st.ready());
    for (Configuration::Value const& value : values) {
        String text;
        uError e = value.value().as(text);
        if (e.failed()) return TRELM_WRAP_MSG(kInvalid, e, "value of " + value.key() + " has no text form");
        TRELM_RETURN_IF_ERROR(st.reset().text(1, tag).text(2, value.key()).text(3, text).run("store"));
    }
    return tx.commit();
}

uError RuntimeConfiguration::reset(String const& tag, Set<String> const& keys) {
    std::lock_guard<std::mutex> lock(mutex_);
    TRELM_RETURN_IF_ERROR(ensureOpenLocked());
    SqliteTransaction tx(db_);
    TRELM_RETURN_IF_ERROR(tx.begin());
    SqliteStatement st(db_, "DELETE FROM runtime_configuration WHERE tag = ?1 AND key = ?2");
    TRELM_RETURN_IF_ERROR(st.ready());
    for (String const& key : keys) TRELM_RETURN_IF_ERROR(st.reset().text(1, tag).text(2, key).run("reset"));
    return tx.commit();
}

uError RuntimeConfiguration::get(String const& tag, Map<String, Variant>& values) {
    std::lock_guard<std::mutex> lock(mutex_);
    TRELM_RETURN_IF_ERROR(ensureOpenLocked());
    SqliteStatement st(db_, "SELECT value FROM runtime_configuration WHERE tag = ?1 AND key = ?2");
    TRELM_RETURN_IF_ERROR(st.ready());
    // Read everything first so that a failure leaves the caller's map untouched.
    Map<String, Variant> found;
    SqliteTransaction tx(db_);
    TRELM_RETURN_IF_ERROR(tx.begin("BEGIN"));
    for (auto const& entry : values) {
        int const rc = st.reset().text(1, tag).text(2, entry.first).step();
        if (rc == SQLITE_ROW) {
            TRELM_RETURN_IF_ERROR(found.insert(entry.first, Variant(String(st.column(0)))));
        } else if (rc != SQLITE_DONE) {
            return st.error("get");
        }
    }
    TRELM_RETURN_IF_ERROR(tx.commit());
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
    String path;
    TRELM_RETURN_IF_ERROR(sqliteStorePath(group, path));
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
