// Checks a parsed FQL statement against the catalog and the service's rules, annotating the
// tree for translation.
#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "FqlAst.h"
#include "FqlCatalog.h"
#include "Store.h"

namespace emu {

// Rules, in the order they are applied to each statement (subqueries where they stand):
//   603 unknown table; 602 unknown column or part of a structured column; 605 unknown function,
//   606 wrong number of arguments; 604 a WHERE that does not constrain an indexable column
//   with = or IN (each branch of an OR on its own). The friend table counts as constrained
//   only when one side is the viewer or both sides are given; friend_request only when uid_to
//   is the viewer.
// One checker per statement; not thread-safe. The catalog must outlive the checked tree.
class FqlChecker {
public:
    FqlChecker(const FqlCatalog& catalog, std::int64_t viewer) : catalog_(catalog), viewer_(viewer) {}

    Status check(FqlSelect& select);

    // Whether an expression holds no column (a literal, or functions of literals and me()).
    static bool isConstant(const FqlExpr& expr);

private:
    // What a part of a WHERE tells about the indexable columns it pins down.
    struct Constraints {
        bool indexable = false;
        // Indexable column -> the values it is compared with (nullopt: not a known constant,
        // e.g. a subquery or an expression).
        std::map<const FqlColumn*, std::vector<std::optional<std::int64_t>>> pinned;
    };

    Status checkExpr(FqlExpr& expr, const FqlTable& table);
    Constraints analyse(const FqlExpr& expr, const FqlTable& table) const;
    bool satisfies(const FqlTable& table, const Constraints& c) const;
    bool allViewer(const Constraints& c, const FqlTable& table, const char* column) const;
    std::optional<std::int64_t> constantUid(const FqlExpr& expr) const;

    const FqlCatalog& catalog_;
    const std::int64_t viewer_;
};

}  // namespace emu
