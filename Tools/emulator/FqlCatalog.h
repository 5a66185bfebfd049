// The FQL tables and columns the emulator serves, and how each maps onto the SQLite schema.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace emu {

enum class FqlType { Integer, Real, Text };

// How a selected column is shaped in an answer.
enum class FqlShape {
    Scalar,            // one element with text
    Struct,            // an element with one child per field (current_location, status)
    UidList,           // "uid,uid" stored flat, answered as a list of <uid>
    StreamAttachment,  // the post's attachment fields plus its media rows
};

// SQL templates below use "$" for the table's alias and "@" for the viewer's uid (bound as a
// parameter). They come from this catalog only, never from a request.
struct FqlField {
    std::string name;
    FqlType type;
    std::string sql;
};

struct FqlColumn {
    std::string name;
    FqlType type = FqlType::Text;
    bool indexable = false;
    FqlShape shape = FqlShape::Scalar;
    // Scalar: the stored column when the value is one ("" for computed values) and the SQL.
    std::string physical;
    std::string sql;
    // Struct, StreamAttachment: the stored parts (an attachment's first field is the post id).
    std::vector<FqlField> fields;
    // Non-zero: a user's privacy bit; the value is shown only to the user and their friends.
    int hiddenBit = 0;
    // A stored column holding this value followed by a blank (the client's text sort key).
    std::string textKey;
    // The FQL table whose key every value of this column names; that row always exists.
    std::string references;

    const FqlField* field(std::string_view fieldName) const;
};

struct FqlTable {
    std::string name;  // the same in FQL and SQL
    std::vector<FqlColumn> columns;
    // Column sets that identify a row.
    std::vector<std::vector<std::string>> uniqueKeys;
    // The key that breaks ORDER BY ties, in column order.
    std::vector<std::string> orderKey;
    // The rows the viewer may see; empty: every row.
    std::string visibility;

    // Case-insensitive lookup; null when the table has no such column.
    const FqlColumn* column(std::string_view columnName) const;
};

// Immutable after construction; safe to share between threads.
class FqlCatalog {
public:
    static const FqlCatalog& instance();
    // Case-insensitive lookup; null for an unknown table.
    const FqlTable* table(std::string_view tableName) const;
    const std::vector<FqlTable>& tables() const { return tables_; }

private:
    FqlCatalog();
    std::vector<FqlTable> tables_;
};

// ASCII case-insensitive equality, as FQL compares names and keywords.
bool equalsIgnoreCase(std::string_view a, std::string_view b);

}  // namespace emu
