// A translated FQL statement: the SQLite text, its parameters, and how to shape the answer.
#pragma once

#include <string>
#include <vector>

#include "SqlValue.h"

namespace emu {

// How one selected item becomes an element of a result row.
struct FqlOutput {
    enum class Kind {
        Scalar,      // <element>text</element> from one result column
        Struct,      // <element><field>..</field>..</element> from one column per field
        UidList,     // <element list="true"><uid>..</uid>..</element> from one "uid,uid" column
        Attachment,  // a stream attachment: post id, then one column per field, then the media
    };
    Kind kind = Kind::Scalar;
    std::string element;
    int column = 0;                   // the first result column of this item
    std::vector<std::string> fields;  // Struct and Attachment: the part names, in column order
};

// Plain value type. Every value that came from the statement's text is in `params`; `sql`
// is made only of the catalog's names and fixed fragments.
struct FqlPlan {
    std::string sql;
    std::vector<SqlValue> params;
    std::string rowElement;
    std::vector<FqlOutput> outputs;
    // When every selected item is a literal (the client's counting statement, "SELECT '' ..."),
    // each row is the same: `constantRow` holds its texts in output order, and `countSql` (same
    // parameters) only counts the matches, so that no row has to come out of SQLite.
    std::vector<std::string> constantRow;
    std::string countSql;
};

}  // namespace emu
