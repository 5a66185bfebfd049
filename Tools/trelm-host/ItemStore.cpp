#include "ItemStore.h"

#include <sqlite3.h>

#include <sys/stat.h>

#include <ctime>


#include "JsonText.h"
#include "PrivateFile.h"
#include "SqliteStatement.h"
#include "SqliteTransaction.h"
#include "WipeMessage.h"
#include "trelm/GUID.h"

namespace trelm {
namespace host {

namespace {

char const kMemory[] = ":memory:";

char const kSchema[] =
    "CREATE TABLE IF NOT EXISTS item ("
    " account TEXT NOT NULL, object_type INTEGER NOT NULL, service_id TEXT NOT NULL,"
    " host_id TEXT NOT NULL UNIQUE, source TEXT NOT NULL, fields TEXT NOT NULL,"
    " first_seen INTEGER NOT NULL, last_seen INTEGER NOT NULL, deleted INTEGER NOT NULL DEFAULT 0,"
    " seen_pass INTEGER NOT NULL,"
    " PRIMARY KEY (account, object_type, service_id)) WITHOUT ROWID;"
    "CREATE INDEX IF NOT EXISTS item_source ON item (source);"
    "CREATE TABLE IF NOT EXISTS pass ("
    " source TEXT NOT NULL, account TEXT NOT NULL, object_type INTEGER NOT NULL,"
    " pass INTEGER NOT NULL, open INTEGER NOT NULL, resume TEXT NOT NULL, boundaries TEXT NOT NULL,"
    " rows INTEGER NOT NULL, PRIMARY KEY (source, account, object_type)) WITHOUT ROWID;";

// Every error of the store's statements says which store it is about.
char const kPrefix[] = "item store: ";

std::string boundariesText(std::vector<std::int64_t> const& seconds) {
    std::string text;
    for (std::int64_t s : seconds) text += (text.empty() ? "" : ",") + std::to_string(s);
    return text;
}

std::vector<std::int64_t> parseBoundaries(std::string const& text) {
    std::vector<std::int64_t> seconds;
    std::size_t begin = 0;
    while (begin < text.size()) {
        std::size_t end = text.find(',', begin);
        if (end == std::string::npos) end = text.size();
        seconds.push_back(std::stoll(text.substr(begin, end - begin)));
        begin = end + 1;
    }
    return seconds;
}

std::int64_t now() { return static_cast<std::int64_t>(std::time(nullptr)); }

}  // namespace

ItemStore::ItemStore(String name, String componentId) : Component(std::move(name), std::move(componentId)) {}

ItemStore::~ItemStore() { closeLocked(); }

std::string ItemStore::encode(Record const& fields) {
    return jsonText(toJson(fields));
}

uError ItemStore::open(String const& path) {
    std::lock_guard<std::mutex> lock(mutex_);
    closeLocked();
    path_ = path;
    return openLocked();
}

void ItemStore::close() {
    std::lock_guard<std::mutex> lock(mutex_);
    closeLocked();
    path_ = String();
}

void ItemStore::closeLocked() {
    if (db_ != nullptr) sqlite3_close_v2(db_);
    db_ = nullptr;
}

uError ItemStore::openLocked() {
    if (db_ != nullptr) return TRELM_OK();
    if (path_.empty()) return TRELM_ERROR_MSG(kFailure, "the item store is not open");
    if (path_ != kMemory) TRELM_RETURN_IF_ERROR(createPrivateFile(path_));
    sqlite3* db = nullptr;
    uError e;
    if (sqlite3_open_v2(path_.cStr(), &db, SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE, nullptr) != SQLITE_OK) {
        e = sqliteError(db, "item store: cannot open");
    } else {
        sqlite3_busy_timeout(db, 5000);
        // A killed host loses at most the window it was writing; the journal keeps the rest whole.
        // Committed windows survive the process at once; only a power loss may take the last few.
        e = sqliteExec(db, "PRAGMA journal_mode=WAL");
        if (e.ok()) e = sqliteExec(db, "PRAGMA synchronous=NORMAL");
        if (e.ok()) e = sqliteExec(db, kSchema);
    }
    if (e.failed()) {
        sqlite3_close_v2(db);
        return TRELM_WRAP_MSG(kFailure, e,
                              "the item store " + path_ + " cannot be used; move it away or delete it to sync afresh");
    }
    db_ = db;
    return TRELM_OK();
}

bool ItemStore::existsLocked() const {
    struct stat st {};
    return db_ != nullptr || path_ == kMemory || ::stat(path_.cStr(), &st) == 0;
}

bool ItemStore::exists() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return existsLocked();
}

String ItemStore::path() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return path_;
}

uError ItemStore::sendConfigImpl(Configuration::Group const& group) {
    String path;
    TRELM_RETURN_IF_ERROR(sqliteStorePath(group, path));
    std::lock_guard<std::mutex> lock(mutex_);
    if (path == path_) return TRELM_OK();
    closeLocked();
    path_ = path;
    return TRELM_OK();
}

uError ItemStore::handleMessage(IMessage& msg) {
    if (msg.type() != WipeMessage::kType) return TRELM_OK();
    auto const* wipeMessage = dynamic_cast<WipeMessage const*>(&msg);
    if (wipeMessage == nullptr) return TRELM_ERROR(kInvalid);
    for (auto const& [tag, value] : wipeMessage->params) {
        (void)value;
        unsigned items = 0;
        TRELM_RETURN_IF_ERROR(wipe(tag, items));
        std::lock_guard<std::mutex> lock(mutex_);
        wipes_.push_back(Wipe{tag, items});
    }
    return TRELM_OK();
}

uError ItemStore::openPass(Scope const& scope, Pass& pass) {
    std::lock_guard<std::mutex> lock(mutex_);
    TRELM_RETURN_IF_ERROR(openLocked());
    SqliteStatement select(db_, "SELECT pass, open, resume, boundaries, rows FROM pass"
                          " WHERE source = ?1 AND account = ?2 AND object_type = ?3", kPrefix);
    TRELM_RETURN_IF_ERROR(select.ready());
    select.text(1, scope.source).text(2, scope.account).integer(3, scope.type);
    Pass found;
    int rc = select.step();
    if (rc == SQLITE_ROW) {
        found.id = select.columnInt(0);
        if (select.columnInt(1) != 0) {
            found.continued = true;
            found.resume = select.column(2);
            found.boundaries = parseBoundaries(select.column(3));
            found.rows = select.columnInt(4);
            pass = std::move(found);
            return TRELM_OK();
        }
    } else if (rc != SQLITE_DONE) {
        return sqliteError(db_, "item store: reading a pass");
    }
    found.id += 1;
    SqliteStatement open(db_, "INSERT OR REPLACE INTO pass (source, account, object_type, pass, open, resume, boundaries, rows)"
                        " VALUES (?1, ?2, ?3, ?4, 1, '', '', 0)", kPrefix);
    TRELM_RETURN_IF_ERROR(open.ready());
    open.text(1, scope.source).text(2, scope.account).integer(3, scope.type).integer(4, found.id);
    TRELM_RETURN_IF_ERROR(open.run("opening a pass"));
    pass = std::move(found);
    return TRELM_OK();
}

uError ItemStore::commitWindow(Scope const& scope, Pass const& pass, std::vector<Incoming> const& rows,
                               std::vector<std::string> const& firstSeenKeys, Counts& counts) {
    std::lock_guard<std::mutex> lock(mutex_);
    TRELM_RETURN_IF_ERROR(openLocked());
    SqliteTransaction tx(db_);
    TRELM_RETURN_IF_ERROR(tx.begin());
    SqliteStatement select(db_, "SELECT fields, deleted, seen_pass FROM item"
                          " WHERE account = ?1 AND object_type = ?2 AND service_id = ?3", kPrefix);
    SqliteStatement insert(db_, "INSERT INTO item (account, object_type, service_id, host_id, source, fields, first_seen,"
                          " last_seen, deleted, seen_pass) VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7, ?7, 0, ?8)", kPrefix);
    SqliteStatement update(db_, "UPDATE item SET fields = ?4, last_seen = ?5, deleted = 0, seen_pass = ?6, source = ?7"
                          " WHERE account = ?1 AND object_type = ?2 AND service_id = ?3", kPrefix);
    TRELM_RETURN_IF_ERROR(select.ready());
    TRELM_RETURN_IF_ERROR(insert.ready());
    TRELM_RETURN_IF_ERROR(update.ready());
    std::int64_t const seenAt = now();
    Counts window;
    for (Incoming const& row : rows) {
        std::string fields = encode(row.fields);
        select.reset().text(1, scope.account).integer(2, scope.type).text(3, row.serviceId);
        int const rc = select.step();
        if (rc == SQLITE_DONE) {
            insert.reset().text(1, scope.account).integer(2, scope.type).text(3, row.serviceId);
            insert.text(4, GUID::generate().toString()).text(5, scope.source).text(6, fields);
            insert.integer(7, seenAt).integer(8, pass.id);
            TRELM_RETURN_IF_ERROR(insert.run("adding an item"));
            ++window.added;
            continue;
        }
        if (rc != SQLITE_ROW) return sqliteError(db_, "item store: reading an item");
        std::string const stored = select.column(0);
        bool const wasDeleted = select.columnInt(1) != 0;
        bool const seenBefore = select.columnInt(2) == pass.id;
        if (!firstSeenKeys.empty()) {
            Json const old = Json::parse(stored, nullptr, false);
            Json now = Json::parse(fields, nullptr, false);
            for (std::string const& key : firstSeenKeys) {
                if (old.is_object() && old.contains(key) && now.is_object()) now[key] = old[key];
            }
            fields = jsonText(now);
        }
        bool const same = fields == stored && !wasDeleted;
        update.reset().text(1, scope.account).integer(2, scope.type).text(3, row.serviceId);
        update.text(4, fields).integer(5, seenAt).integer(6, pass.id).text(7, scope.source);
        TRELM_RETURN_IF_ERROR(update.run("updating an item"));
        if (seenBefore && same) continue;  // a row seen again in the same pass counts once
        ++(same ? window.unchanged : window.changed);
    }
    SqliteStatement progress(db_, "UPDATE pass SET resume = ?5, boundaries = ?6, rows = ?7"
                            " WHERE source = ?1 AND account = ?2 AND object_type = ?3 AND pass = ?4 AND open = 1", kPrefix);
    TRELM_RETURN_IF_ERROR(progress.ready());
    progress.text(1, scope.source).text(2, scope.account).integer(3, scope.type).integer(4, pass.id);
    progress.text(5, pass.resume).text(6, boundariesText(pass.boundaries)).integer(7, pass.rows);
    TRELM_RETURN_IF_ERROR(progress.run("noting the pass's progress"));
    if (sqlite3_changes(db_) != 1) {
        return TRELM_ERROR_MSG(kFailure, "item store: the pass was closed or wiped while it was written");
    }
    TRELM_RETURN_IF_ERROR(tx.commit());
    counts.added += window.added;
    counts.changed += window.changed;
    counts.unchanged += window.unchanged;
    return TRELM_OK();
}

uError ItemStore::completePass(Scope const& scope, Pass const& pass, Counts& counts) {
    std::lock_guard<std::mutex> lock(mutex_);
    TRELM_RETURN_IF_ERROR(openLocked());
    SqliteTransaction tx(db_);
    TRELM_RETURN_IF_ERROR(tx.begin());
    SqliteStatement remove(db_, "UPDATE item SET deleted = 1"
                          " WHERE account = ?1 AND object_type = ?2 AND deleted = 0 AND seen_pass <> ?3", kPrefix);
    TRELM_RETURN_IF_ERROR(remove.ready());
    remove.text(1, scope.account).integer(2, scope.type).integer(3, pass.id);
    TRELM_RETURN_IF_ERROR(remove.run("marking removed items"));
    unsigned const removed = static_cast<unsigned>(sqlite3_changes(db_));
    SqliteStatement close(db_, "UPDATE pass SET open = 0, resume = '', boundaries = '', rows = ?5"
                         " WHERE source = ?1 AND account = ?2 AND object_type = ?3 AND pass = ?4", kPrefix);
    TRELM_RETURN_IF_ERROR(close.ready());
    close.text(1, scope.source).text(2, scope.account).integer(3, scope.type).integer(4, pass.id).integer(5, pass.rows);
    TRELM_RETURN_IF_ERROR(close.run("closing the pass"));
    TRELM_RETURN_IF_ERROR(tx.commit());
    counts.removed += removed;
    return TRELM_OK();
}

uError ItemStore::list(String const& account, int type, bool withRemoved, std::vector<Item>& out) {
    std::lock_guard<std::mutex> lock(mutex_);
    // Listing a store that was never made stores nothing and makes no file.
    if (!existsLocked()) {
        out.clear();
        return TRELM_OK();
    }
    TRELM_RETURN_IF_ERROR(openLocked());
    SqliteStatement plain(db_, "SELECT host_id, account, object_type, service_id, fields, first_seen, last_seen, deleted"
                         " FROM item WHERE object_type = ?1 AND (?2 = '' OR account = ?2) AND (?3 OR deleted = 0)"
                         " ORDER BY first_seen, account, service_id", kPrefix);
    TRELM_RETURN_IF_ERROR(plain.ready());
    plain.integer(1, type).text(2, account).integer(3, withRemoved ? 1 : 0);
    std::vector<Item> items;
    int rc = SQLITE_ROW;
    while ((rc = plain.step()) == SQLITE_ROW) {
        Item item;
        item.hostId = String(plain.column(0));
        item.account = String(plain.column(1));
        item.type = static_cast<int>(plain.columnInt(2));
        item.serviceId = String(plain.column(3));
        item.fields = plain.column(4);
        item.firstSeen = plain.columnInt(5);
        item.lastSeen = plain.columnInt(6);
        item.deleted = plain.columnInt(7) != 0;
        items.push_back(std::move(item));
    }
    if (rc != SQLITE_DONE) return sqliteError(db_, "item store: listing items");
    out = std::move(items);
    return TRELM_OK();
}

uError ItemStore::wipe(String const& source, unsigned& items) {
    std::lock_guard<std::mutex> lock(mutex_);
    // A store that was never made holds nothing to wipe; it is not made for that.
    if (!existsLocked()) {
        items = 0;
        return TRELM_OK();
    }
    TRELM_RETURN_IF_ERROR(openLocked());
    SqliteTransaction tx(db_);
    TRELM_RETURN_IF_ERROR(tx.begin());
    SqliteStatement removeItems(db_, "DELETE FROM item WHERE source = ?1", kPrefix);
    SqliteStatement removePasses(db_, "DELETE FROM pass WHERE source = ?1", kPrefix);
    TRELM_RETURN_IF_ERROR(removeItems.ready());
    TRELM_RETURN_IF_ERROR(removePasses.ready());
    removeItems.text(1, source);
    TRELM_RETURN_IF_ERROR(removeItems.run("wiping items"));
    unsigned const count = static_cast<unsigned>(sqlite3_changes(db_));
    removePasses.text(1, source);
    TRELM_RETURN_IF_ERROR(removePasses.run("wiping passes"));
    TRELM_RETURN_IF_ERROR(tx.commit());
    items = count;
    return TRELM_OK();
}

std::vector<ItemStore::Wipe> ItemStore::wipes() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return wipes_;
}

}  // namespace host
}  // namespace trelm
