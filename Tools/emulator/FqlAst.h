// The syntax tree of one FQL statement, as the parser builds it and the checker annotates it.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace emu {

struct FqlColumn;
struct FqlField;
struct FqlTable;
struct FqlSelect;

enum class FqlExprKind {
    Column,      // text: the name as written, possibly dotted ("current_location.city")
    Integer,     // integer
    String,      // text: the literal's value, quotes removed and doubled quotes undone
    Call,        // text: the function name as written; args: the arguments
    Negate,      // args[0]
    Not,         // args[0]
    Binary,      // op; args[0], args[1]
    InList,      // args[0] IN (args[1..]); negated for NOT IN
    InSubquery,  // args[0] IN (subquery); negated for NOT IN
};

enum class FqlBinaryOp { Or, And, Eq, Ne, Lt, Le, Gt, Ge, Add, Sub, Mul, Div };

enum class FqlFunction { None, Now, Rand, Strlen, Concat, Substr, Strpos, Lower, Upper, Me };

// A node owns its children and its subquery.
struct FqlExpr {
    FqlExprKind kind = FqlExprKind::Integer;
    std::size_t position = 0;  // offset of the node's first character in the statement
    std::string text;
    std::int64_t integer = 0;
    FqlBinaryOp op = FqlBinaryOp::Eq;
    bool negated = false;
    std::vector<std::unique_ptr<FqlExpr>> args;
    std::unique_ptr<FqlSelect> subquery;

    // Set by the checker; they point into the catalog, which outlives every tree.
    const FqlColumn* column = nullptr;
    const FqlField* field = nullptr;  // the part of a structured column named by a dotted path
    FqlFunction function = FqlFunction::None;

    bool isComparison() const {
        return kind == FqlExprKind::Binary && op >= FqlBinaryOp::Eq && op <= FqlBinaryOp::Ge;
    }
};

struct FqlSelect {
    std::vector<std::unique_ptr<FqlExpr>> items;
    std::string tableName;
    std::size_t tablePosition = 0;
    std::unique_ptr<FqlExpr> where;
    std::unique_ptr<FqlExpr> orderBy;
    bool descending = false;
    std::optional<std::int64_t> limit;
    std::optional<std::int64_t> offset;

    const FqlTable* table = nullptr;  // set by the checker
};

}  // namespace emu
