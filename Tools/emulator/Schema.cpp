#include "Schema.h"

#include "SqliteDatabase.h"
#include "SqliteStatement.h"

namespace emu {

namespace {

const char* const kTables = R"sql(
CREATE TABLE IF NOT EXISTS application(
  api_key TEXT PRIMARY KEY, secret TEXT NOT NULL, name TEXT NOT NULL, app_id INTEGER NOT NULL);
CREATE TABLE IF NOT EXISTS account(
  email TEXT PRIMARY KEY, password TEXT NOT NULL, uid INTEGER NOT NULL);
CREATE TABLE IF NOT EXISTS sequence(
  name TEXT PRIMARY KEY, value INTEGER NOT NULL);
CREATE TABLE IF NOT EXISTS user(
  uid INTEGER PRIMARY KEY, name TEXT, first_name TEXT, last_name TEXT, birthday TEXT, sex TEXT,
  city TEXT, state TEXT, country TEXT, zip TEXT,
  status_message TEXT, status_time INTEGER, status_id INTEGER,
  locale TEXT, about_me TEXT, hidden INTEGER NOT NULL DEFAULT 0);
CREATE TABLE IF NOT EXISTS friend(
  uid1 INTEGER NOT NULL, key2 TEXT NOT NULL, uid2 INTEGER NOT NULL,
  PRIMARY KEY(uid1, key2)) WITHOUT ROWID;
CREATE TABLE IF NOT EXISTS friend_request(
  uid_to INTEGER NOT NULL, from_key TEXT NOT NULL, uid_from INTEGER NOT NULL, time INTEGER,
  message TEXT, unread INTEGER, PRIMARY KEY(uid_to, from_key)) WITHOUT ROWID;
CREATE TABLE IF NOT EXISTS album(
  aid TEXT PRIMARY KEY, owner INTEGER NOT NULL, cover_pid TEXT, name TEXT, created INTEGER,
  modified INTEGER, description TEXT, location TEXT, link TEXT, size INTEGER NOT NULL DEFAULT 0,
  visible TEXT NOT NULL, type TEXT NOT NULL, app_default INTEGER NOT NULL DEFAULT 0);
CREATE TABLE IF NOT EXISTS photo(
  pid TEXT PRIMARY KEY, aid TEXT NOT NULL, owner INTEGER NOT NULL, src_small TEXT, src_big TEXT,
  src TEXT, link TEXT, caption TEXT, created INTEGER, modified INTEGER, visible TEXT NOT NULL);
CREATE TABLE IF NOT EXISTS photo_tag(
  pid TEXT NOT NULL, subject INTEGER NOT NULL, text TEXT, xcoord REAL, ycoord REAL, created INTEGER,
  PRIMARY KEY(pid, subject)) WITHOUT ROWID;
CREATE TABLE IF NOT EXISTS stream(
  post_id TEXT PRIMARY KEY, source_id INTEGER NOT NULL, actor_id INTEGER NOT NULL, target_id INTEGER,
  filter_key TEXT NOT NULL, type INTEGER NOT NULL, app_id INTEGER, attribution TEXT, message TEXT,
  att_name TEXT, att_href TEXT, att_caption TEXT, att_description TEXT,
  created_time INTEGER NOT NULL, updated_time INTEGER NOT NULL);
CREATE TABLE IF NOT EXISTS stream_media(
  post_id TEXT NOT NULL, idx INTEGER NOT NULL, href TEXT, alt TEXT, type TEXT, src TEXT,
  photo_aid TEXT, photo_pid TEXT, photo_owner INTEGER, width INTEGER, height INTEGER,
  PRIMARY KEY(post_id, idx)) WITHOUT ROWID;
CREATE TABLE IF NOT EXISTS thread(
  thread_id INTEGER PRIMARY KEY, owner INTEGER NOT NULL, folder_id INTEGER NOT NULL, subject TEXT,
  recipients TEXT, updated_time INTEGER, message_count INTEGER, snippet TEXT, snippet_author INTEGER,
  unread INTEGER);
CREATE TABLE IF NOT EXISTS message(
  message_id TEXT PRIMARY KEY, thread_id INTEGER NOT NULL, seq INTEGER NOT NULL, author_id INTEGER,
  body TEXT, created_time INTEGER, att_name TEXT, att_href TEXT);
)sql";

// Indexes other than the primary keys. Each one serves a lookup or an order the client uses:
// friendship tests and reverse lookups, albums and photos by owner, photo events and the
// stream newest first, tags by subject, mailboxes by owner and messages by thread.
const char* const kIndexes = R"sql(
CREATE INDEX IF NOT EXISTS friend_pair ON friend(uid1, uid2);
CREATE INDEX IF NOT EXISTS friend_reverse ON friend(uid2, uid1);
CREATE INDEX IF NOT EXISTS user_name ON user(name);
CREATE INDEX IF NOT EXISTS album_owner ON album(owner, created);
CREATE INDEX IF NOT EXISTS album_cover ON album(cover_pid);
CREATE INDEX IF NOT EXISTS photo_album ON photo(aid, created);
CREATE INDEX IF NOT EXISTS photo_created ON photo(created, pid);
CREATE INDEX IF NOT EXISTS photo_owner ON photo(owner, created);
CREATE INDEX IF NOT EXISTS photo_tag_subject ON photo_tag(subject);
CREATE INDEX IF NOT EXISTS stream_created ON stream(created_time, post_id);
CREATE INDEX IF NOT EXISTS stream_source ON stream(source_id, created_time);
CREATE INDEX IF NOT EXISTS stream_filter ON stream(filter_key, created_time);
CREATE INDEX IF NOT EXISTS thread_owner ON thread(owner, updated_time);
CREATE INDEX IF NOT EXISTS thread_folder ON thread(folder_id, updated_time);
CREATE INDEX IF NOT EXISTS message_thread ON message(thread_id, created_time, seq);
)sql";

const char* const kDropIndexes = R"sql(
DROP INDEX IF EXISTS friend_pair;
DROP INDEX IF EXISTS friend_reverse;
DROP INDEX IF EXISTS user_name;
DROP INDEX IF EXISTS album_owner;
DROP INDEX IF EXISTS album_cover;
DROP INDEX IF EXISTS photo_album;
DROP INDEX IF EXISTS photo_created;
DROP INDEX IF EXISTS photo_owner;
DROP INDEX IF EXISTS photo_tag_subject;
DROP INDEX IF EXISTS stream_created;
DROP INDEX IF EXISTS stream_source;
DROP INDEX IF EXISTS stream_filter;
DROP INDEX IF EXISTS thread_owner;
DROP INDEX IF EXISTS thread_folder;
DROP INDEX IF EXISTS message_thread;
)sql";

}  // namespace

bool Schema::create(SqliteDatabase& db, std::string& error) {
    return db.exec(kTables, error) && db.exec(kIndexes, error);
}

bool Schema::dropSecondaryIndexes(SqliteDatabase& db, std::string& error) { return db.exec(kDropIndexes, error); }

bool Schema::createSecondaryIndexes(SqliteDatabase& db, std::string& error) { return db.exec(kIndexes, error); }

bool Schema::isEmpty(SqliteDatabase& db, bool& empty, std::string& error) {
    sqlite3_stmt* raw = db.prepareCached("SELECT EXISTS (SELECT 1 FROM user)", error);
    if (!raw) return false;
    SqliteStatement stmt(raw);
    if (!stmt.step()) {
        error = db.lastError();
        return false;
    }
    empty = stmt.getInt(0) == 0;
    return true;
}

}  // namespace emu
