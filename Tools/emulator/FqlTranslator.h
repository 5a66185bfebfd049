// Turns a checked FQL tree into one SQLite statement with bound parameters.
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "FqlAst.h"
#include "FqlCatalog.h"
#include "FqlPlan.h"

namespace emu {

// Translation rules:
// - Every literal becomes a parameter; names come from the catalog.
// - A number compared with a text compares as numbers: a text literal is converted here, any
//   other text expression with CAST(... AS NUMERIC).
// - `x IN (SELECT y FROM t WHERE ...)` at the top level of a WHERE becomes a join with t when y
//   is duplicate-free under the subquery's conditions (a key, or a key part whose other parts
//   are fixed by `=`); the same goes for the subquery's own WHERE, so nested subqueries become
//   a chain of joins. Afterwards x stands for y: `concat(x, ' ')` over a column whose text
//   key is stored reads the stored key (an index range rather than a sort), and the outer
//   table disappears altogether when nothing else is read from it and y always names one of
//   its rows.
// - ORDER BY is followed by the table's key in the same direction, unless the ordering
//   already determines it. With a LIMIT, the table the ordering reads is read first, along
//   its index, so that a page stops after its rows instead of sorting every match.
// - A keyset condition `a < T OR (a = T AND b < P)` also gets `a <= T`, which SQLite can use as
//   the start of an index range.
// - Each table's visibility condition is added for every table read.
// One translator per statement; not thread-safe.
class FqlTranslator {
public:
    FqlTranslator(std::int64_t viewer, std::int64_t now) : viewer_(viewer), now_(now) {}

    // REQUIRES: `select` passed FqlChecker.
    FqlPlan translate(const FqlSelect& select);

private:
    struct Fragment {
        std::string sql;
        std::vector<SqlValue> params;
        void append(const Fragment& other) {
            sql += other.sql;
            params.insert(params.end(), other.params.begin(), other.params.end());
        }
    };
    struct Instance {
        const FqlTable* table;
        std::string alias;
        int references = 0;
    };
    struct Join {
        int outer;
        const FqlColumn* outerColumn;
        int inner;
        const FqlColumn* innerColumn;
    };
    struct Scope {
        std::vector<int> instances;
        std::vector<Join> joins;
        std::vector<std::pair<int, const FqlExpr*>> conjuncts;
    };
    using ColumnRef = std::pair<int, const FqlColumn*>;

    void buildSelect(const FqlSelect& select, FqlPlan* plan, bool itemAsNumber, Fragment& out);
    void addOutputs(const FqlSelect& select, int root, FqlPlan& plan, Fragment& items);
    void absorb(Scope& scope, int instance, const FqlExpr& where);
    bool canJoin(const FqlExpr& conjunct, int instance) const;
    static bool isDistinct(const FqlSelect& sub, const FqlColumn& column);
    static bool isPlainColumn(const FqlExpr& expr);
    static bool orderDeterminesKey(const FqlExpr& order, const FqlTable& table);
    static std::vector<std::unique_ptr<FqlExpr>> impliedBounds(const FqlExpr& disjunction);

    FqlType typeOf(const FqlExpr& expr) const;
    void render(const FqlExpr& expr, int instance, Fragment& out);
    void renderNumber(const FqlExpr& expr, int instance, Fragment& out);
    void renderCall(const FqlExpr& expr, int instance, Fragment& out);
    void renderColumn(int instance, const FqlColumn& column, const FqlField* field, Fragment& out);
    ColumnRef resolve(ColumnRef ref) const;
    void expand(const std::string& sqlTemplate, const std::string& alias, Fragment& out) const;
    int newInstance(const FqlTable* table);

    const std::int64_t viewer_;
    const std::int64_t now_;
    std::vector<Instance> instances_;
    // A joined column and the column of the inner table that stands for it.
    std::map<ColumnRef, ColumnRef> sameAs_;
    // While set, the instances that rendering reads from are recorded here.
    std::vector<int>* touched_ = nullptr;
};

}  // namespace emu
