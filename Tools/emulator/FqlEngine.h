// Runs FQL statements against the emulator's database and writes the answer rows.
#pragma once

#include <cstdint>
#include <string>

#include "AnswerWriter.h"
#include "AttachmentWriter.h"
#include "FqlPlan.h"
#include "Store.h"
#include "XmlNode.h"

namespace emu {

class SqliteDatabase;

// Statements are parsed, checked and translated afresh each time (a few microseconds); the
// prepared SQLite statement is reused through the database's cache, since statements of one
// shape translate to the same SQL text. Statements only ever read: a translated statement that
// would write is refused.
// Holds a reference to the database, which must outlive it. Not thread-safe: callers hold the
// store's lock around every call.
class FqlEngine {
public:
    explicit FqlEngine(SqliteDatabase& db) : db_(db), attachments_(db) {}

    // Parses, checks and translates `query` for `viewer`; `now` is the value of now().
    static Status compile(std::int64_t viewer, std::int64_t now, const std::string& query, FqlPlan& plan);

    // compile + execute: one <table> element per row, written inside the open element of `out`
    // as the rows come from SQLite. On failure part of the rows may have been written.
    Status run(std::int64_t viewer, std::int64_t now, const std::string& query, AnswerWriter& out);
    Status execute(const FqlPlan& plan, AnswerWriter& out);
    // The same rows appended to `root`, which becomes a list.
    Status run(std::int64_t viewer, std::int64_t now, const std::string& query, XmlNode& root);

private:
    SqliteDatabase& db_;
    AttachmentWriter attachments_;
};

}  // namespace emu
