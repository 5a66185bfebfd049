// The emulator's SQLite schema: applications and accounts, the social graph, albums and photos,
// the stream and the inbox.
#pragma once

#include <string>

namespace emu {

class SqliteDatabase;

// Stateless. Structured FQL values are kept flat (user.city, user.status_message,
// stream.att_name, thread.recipients as "uid,uid"). Text keys that the client orders and pages
// by are stored next to the id they are made from ("<uid> ", the id followed by a blank) and
// indexed together with the owning side, so that a page is a range scan of one index.
// Every function requires the caller to hold the database's lock.
class Schema {
public:
    // Creates every table and index that does not exist yet.
    static bool create(SqliteDatabase& db, std::string& error);
    // Secondary indexes are dropped for a bulk load and made again afterwards, which is much
    // faster than maintaining them row by row.
    static bool dropSecondaryIndexes(SqliteDatabase& db, std::string& error);
    static bool createSecondaryIndexes(SqliteDatabase& db, std::string& error);
    // True when the database holds no user yet.
    static bool isEmpty(SqliteDatabase& db, bool& empty, std::string& error);
};

}  // namespace emu
