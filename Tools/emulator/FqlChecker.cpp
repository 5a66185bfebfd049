#include "FqlChecker.h"

#include "SqlNumber.h"

namespace emu {

namespace {

struct FunctionSignature {
    const char* name;
    FqlFunction function;
    int minArgs;
    int maxArgs;  // -1: any number from minArgs on
};

const FunctionSignature kFunctions[] = {
    {"now", FqlFunction::Now, 0, 0},       {"rand", FqlFunction::Rand, 0, 0},
    {"strlen", FqlFunction::Strlen, 1, 1}, {"concat", FqlFunction::Concat, 1, -1},
    {"substr", FqlFunction::Substr, 3, 3}, {"strpos", FqlFunction::Strpos, 2, 2},
    {"lower", FqlFunction::Lower, 1, 1},   {"upper", FqlFunction::Upper, 1, 1},
    {"me", FqlFunction::Me, 0, 0},
};

const char* const kNotIndexable =
    "Your statement is not indexable - the WHERE clause must contain one of the columns marked with a star";

}  // namespace

bool FqlChecker::isConstant(const FqlExpr& expr) {
    if (expr.kind == FqlExprKind::Column || expr.kind == FqlExprKind::InSubquery) return false;
    for (const auto& a : expr.args)
        if (!isConstant(*a)) return false;
    return true;
}

Status FqlChecker::check(FqlSelect& select) {
    select.table = catalog_.table(select.tableName);
    if (!select.table) return ServiceError{603, "Unknown table: " + select.tableName};
    const FqlTable& table = *select.table;
    for (auto& item : select.items)
        if (Status s = checkExpr(*item, table)) return s;
    if (Status s = checkExpr(*select.where, table)) return s;
    if (select.orderBy)
        if (Status s = checkExpr(*select.orderBy, table)) return s;
    if (!analyse(*select.where, table).indexable) return ServiceError{604, kNotIndexable};
    return std::nullopt;
}

Status FqlChecker::checkExpr(FqlExpr& expr, const FqlTable& table) {
    switch (expr.kind) {
        case FqlExprKind::Column: {
            const std::size_t dot = expr.text.find('.');
            const std::string head = expr.text.substr(0, dot);
            expr.column = table.column(head);
            bool known = expr.column != nullptr;
            if (known && dot != std::string::npos) {
                // Only a structured column has parts, and only one level of them.
                const std::string rest = expr.text.substr(dot + 1);
                expr.field = rest.find('.') == std::string::npos ? expr.column->field(rest) : nullptr;
                known = expr.field != nullptr && expr.column->shape == FqlShape::Struct;
            }
            if (!known) return ServiceError{602, expr.text + " is not a member of the " + table.name + " table."};
            return std::nullopt;
        }
        case FqlExprKind::Call: {
            const FunctionSignature* signature = nullptr;
            for (const FunctionSignature& f : kFunctions)
                if (equalsIgnoreCase(f.name, expr.text)) signature = &f;
            if (!signature) return ServiceError{605, expr.text + " is not a valid function name."};
            const int given = static_cast<int>(expr.args.size());
            if (given < signature->minArgs || (signature->maxArgs >= 0 && given > signature->maxArgs))
                return ServiceError{606, expr.text + " function expects " + std::to_string(signature->minArgs) +
                                             " parameters; " + std::to_string(given) + " given."};
            expr.function = signature->function;
            break;
        }
        case FqlExprKind::InSubquery: {
            if (Status s = checkExpr(*expr.args[0], table)) return s;
            return check(*expr.subquery);
        }
        default: break;
    }
    for (auto& a : expr.args)
        if (Status s = checkExpr(*a, table)) return s;
    return std::nullopt;
}

std::optional<std::int64_t> FqlChecker::constantUid(const FqlExpr& expr) const {
    switch (expr.kind) {
        case FqlExprKind::Integer: return expr.integer;
        case FqlExprKind::String: {
            const SqlValue v = SqlNumber::fromText(expr.text);
            if (v.kind == SqlValue::Kind::Integer) return v.integer;
            return std::nullopt;
        }
        case FqlExprKind::Call:
            if (expr.function == FqlFunction::Me) return viewer_;
            return std::nullopt;
        default: return std::nullopt;
    }
}

FqlChecker::Constraints FqlChecker::analyse(const FqlExpr& expr, const FqlTable& table) const {
    Constraints c;
    auto isIndexColumn = [](const FqlExpr& e) {
        return e.kind == FqlExprKind::Column && e.column && !e.field && e.column->indexable;
    };
    switch (expr.kind) {
        case FqlExprKind::Binary: {
            if (expr.op == FqlBinaryOp::Or) {
                c.indexable = analyse(*expr.args[0], table).indexable && analyse(*expr.args[1], table).indexable;
                return c;
            }
            if (expr.op == FqlBinaryOp::And) {
                Constraints l = analyse(*expr.args[0], table);
                Constraints r = analyse(*expr.args[1], table);
                c.pinned = std::move(l.pinned);
                for (auto& [column, values] : r.pinned)
                    c.pinned[column].insert(c.pinned[column].end(), values.begin(), values.end());
                c.indexable = l.indexable || r.indexable || satisfies(table, c);
                return c;
            }
            if (expr.op == FqlBinaryOp::Eq) {
                for (int side = 0; side < 2; ++side) {
                    const FqlExpr& col = *expr.args[side];
                    const FqlExpr& value = *expr.args[1 - side];
                    if (isIndexColumn(col) && isConstant(value)) {
                        c.pinned[col.column].push_back(constantUid(value));
                        break;
                    }
                }
            }
            break;
        }
        case FqlExprKind::InList: {
            const FqlExpr& col = *expr.args[0];
            if (expr.negated || !isIndexColumn(col)) break;
            auto& values = c.pinned[col.column];
            for (std::size_t i = 1; i < expr.args.size(); ++i) {
                if (!isConstant(*expr.args[i])) {
                    c.pinned.erase(col.column);
                    return c;
                }
                values.push_back(constantUid(*expr.args[i]));
            }
            break;
        }
        case FqlExprKind::InSubquery: {
            const FqlExpr& col = *expr.args[0];
            if (!expr.negated && isIndexColumn(col)) c.pinned[col.column].push_back(std::nullopt);
            break;
        }
        default: break;
    }
    c.indexable = satisfies(table, c);
    return c;
}

bool FqlChecker::allViewer(const Constraints& c, const FqlTable& table, const char* column) const {
    const auto found = c.pinned.find(table.column(column));
    if (found == c.pinned.end() || found->second.empty()) return false;
    for (const auto& v : found->second)
        if (!v || *v != viewer_) return false;
    return true;
}

bool FqlChecker::satisfies(const FqlTable& table, const Constraints& c) const {
    if (table.name == "friend") {
        return allViewer(c, table, "uid1") || allViewer(c, table, "uid2") ||
               (c.pinned.count(table.column("uid1")) && c.pinned.count(table.column("uid2")));
    }
    if (table.name == "friend_request") return allViewer(c, table, "uid_to");
    return !c.pinned.empty();
}

}  // namespace emu
