#include "FqlTranslator.h"

#include <algorithm>

#include "FqlChecker.h"
#include "SqlNumber.h"

namespace emu {

namespace {

void flatten(const FqlExpr& expr, std::vector<const FqlExpr*>& out) {
    if (expr.kind == FqlExprKind::Binary && expr.op == FqlBinaryOp::And) {
        flatten(*expr.args[0], out);
        flatten(*expr.args[1], out);
    } else {
        out.push_back(&expr);
    }
}

void flattenOr(const FqlExpr& expr, std::vector<const FqlExpr*>& out) {
    if (expr.kind == FqlExprKind::Binary && expr.op == FqlBinaryOp::Or) {
        flattenOr(*expr.args[0], out);
        flattenOr(*expr.args[1], out);
    } else {
        out.push_back(&expr);
    }
}

// A comparison of a plain column with a constant, seen from the column's side.
struct Bound {
    const FqlExpr* column;
    const FqlExpr* value;
    bool upper;
};

void collectBounds(const FqlExpr& branch, std::vector<Bound>& out) {
    std::vector<const FqlExpr*> conjuncts;
    flatten(branch, conjuncts);
    for (const FqlExpr* c : conjuncts) {
        if (!c->isComparison() || c->op == FqlBinaryOp::Ne) continue;
        for (int side = 0; side < 2; ++side) {
            const FqlExpr& col = *c->args[side];
            const FqlExpr& value = *c->args[1 - side];
            if (col.kind != FqlExprKind::Column || col.field || !FqlChecker::isConstant(value)) continue;
            FqlBinaryOp op = c->op;
            if (side == 1) {  // constant on the left: turn the comparison around
                if (op == FqlBinaryOp::Lt) op = FqlBinaryOp::Gt;
                else if (op == FqlBinaryOp::Le) op = FqlBinaryOp::Ge;
                else if (op == FqlBinaryOp::Gt) op = FqlBinaryOp::Lt;
                else if (op == FqlBinaryOp::Ge) op = FqlBinaryOp::Le;
            }
            const bool eq = op == FqlBinaryOp::Eq;
            if (eq || op == FqlBinaryOp::Lt || op == FqlBinaryOp::Le) out.push_back(Bound{&col, &value, true});
            if (eq || op == FqlBinaryOp::Gt || op == FqlBinaryOp::Ge) out.push_back(Bound{&col, &value, false});
            break;
        }
    }
}

bool sameConstant(const FqlExpr& a, const FqlExpr& b) {
    if (a.kind != b.kind || !a.args.empty() || !b.args.empty()) return false;
    switch (a.kind) {
        case FqlExprKind::Integer: return a.integer == b.integer;
        case FqlExprKind::String: return a.text == b.text;
        case FqlExprKind::Call: return a.function == b.function;
        default: return false;
    }
}

std::unique_ptr<FqlExpr> cloneLeaf(const FqlExpr& e) {
    auto c = std::make_unique<FqlExpr>();
    c->kind = e.kind;
    c->position = e.position;
    c->text = e.text;
    c->integer = e.integer;
    c->column = e.column;
    c->field = e.field;
    c->function = e.function;
    return c;
}

// Whether rendered SQL is one stored column of `alias` ("t1.key2"). Only an ordering by such a
// column can run along an index; any other is sorted anyway, and SQLite's own plan is best.
bool isStoredColumn(const std::string& sql, const std::string& alias) {
    if (sql.size() <= alias.size() + 1 || sql.compare(0, alias.size(), alias) != 0 || sql[alias.size()] != '.')
        return false;
    return sql.find_first_not_of("abcdefghijklmnopqrstuvwxyz_0123456789", alias.size() + 1) == std::string::npos;
}

const char* operatorSql(FqlBinaryOp op) {
    switch (op) {
        case FqlBinaryOp::Or: return " OR ";
        case FqlBinaryOp::And: return " AND ";
        case FqlBinaryOp::Eq: return " = ";
        case FqlBinaryOp::Ne: return " <> ";
        case FqlBinaryOp::Lt: return " < ";
        case FqlBinaryOp::Le: return " <= ";
        case FqlBinaryOp::Gt: return " > ";
        case FqlBinaryOp::Ge: return " >= ";
        case FqlBinaryOp::Add: return " + ";
        case FqlBinaryOp::Sub: return " - ";
        case FqlBinaryOp::Mul: return " * ";
        case FqlBinaryOp::Div: return " / ";
    }
    return " ";
}

// A user's private values are shown to the user and to their friends only.
std::string hiddenTemplate(int bit, const std::string& inner) {
    return "CASE WHEN ($.hidden & " + std::to_string(bit) +
           ") = 0 OR $.uid = @ OR EXISTS (SELECT 1 FROM friend v WHERE v.uid1 = @ AND v.uid2 = $.uid) THEN " + inner +
           " END";
}

}  // namespace

FqlPlan FqlTranslator::translate(const FqlSelect& select) {
    FqlPlan plan;
    // Rows are named after their table, except those of "friend_request", which the service
    // answered as "friend_info".
    plan.rowElement = select.table->name == "friend_request" ? "friend_info" : select.table->name;
    Fragment out;
    buildSelect(select, &plan, false, out);
    plan.sql = std::move(out.sql);
    plan.params = std::move(out.params);
    bool literals = true;
    for (const auto& item : select.items)
        literals = literals && (item->kind == FqlExprKind::String || item->kind == FqlExprKind::Integer);
    if (literals) {
        for (const auto& item : select.items)
            plan.constantRow.push_back(item->kind == FqlExprKind::String ? item->text : std::to_string(item->integer));
        plan.countSql = "SELECT count(*) FROM (" + plan.sql + ")";
    }
    return plan;
}

int FqlTranslator::newInstance(const FqlTable* table) {
    std::string alias = "t";
    alias += std::to_string(instances_.size());
    instances_.push_back(Instance{table, std::move(alias)});
    return static_cast<int>(instances_.size()) - 1;
}

bool FqlTranslator::isPlainColumn(const FqlExpr& expr) {
    return expr.kind == FqlExprKind::Column && !expr.field && !expr.column->physical.empty() &&
           expr.column->hiddenBit == 0;
}

bool FqlTranslator::isDistinct(const FqlSelect& sub, const FqlColumn& column) {
    std::vector<const FqlExpr*> conjuncts;
    flatten(*sub.where, conjuncts);
    auto fixed = [&](const std::string& name) {
        for (const FqlExpr* c : conjuncts) {
            if (c->kind != FqlExprKind::Binary || c->op != FqlBinaryOp::Eq) continue;
            for (int side = 0; side < 2; ++side) {
                const FqlExpr& col = *c->args[side];
                if (col.kind == FqlExprKind::Column && !col.field && col.column->name == name &&
                    FqlChecker::isConstant(*c->args[1 - side]))
                    return true;
            }
        }
        return false;
    };
    for (const auto& key : sub.table->uniqueKeys) {
        if (std::find(key.begin(), key.end(), column.name) == key.end()) continue;
        bool all = true;
        for (const std::string& part : key)
            if (part != column.name && !fixed(part)) all = false;
        if (all) return true;
    }
    return false;
}

bool FqlTranslator::canJoin(const FqlExpr& c, int instance) const {
    if (c.kind != FqlExprKind::InSubquery || c.negated) return false;
    const FqlSelect& sub = *c.subquery;
    const FqlExpr& left = *c.args[0];
    const FqlExpr& item = *sub.items[0];
    if (!isPlainColumn(left) || !isPlainColumn(item)) return false;
    if (sub.orderBy || sub.limit || sub.offset) return false;
    if (left.column->type != item.column->type) return false;
    if (sameAs_.count({instance, left.column})) return false;
    return isDistinct(sub, *item.column);
}

void FqlTranslator::absorb(Scope& scope, int instance, const FqlExpr& where) {
    std::vector<const FqlExpr*> conjuncts;
    flatten(where, conjuncts);
    for (const FqlExpr* c : conjuncts) {
        if (!canJoin(*c, instance)) {
            scope.conjuncts.emplace_back(instance, c);
            continue;
        }
        const FqlSelect& sub = *c->subquery;
        const int inner = newInstance(sub.table);
        scope.instances.push_back(inner);
        const FqlColumn* outerColumn = c->args[0]->column;
        const FqlColumn* innerColumn = sub.items[0]->column;
        scope.joins.push_back(Join{instance, outerColumn, inner, innerColumn});
        sameAs_[{instance, outerColumn}] = {inner, innerColumn};
        absorb(scope, inner, *sub.where);
    }
}

std::vector<std::unique_ptr<FqlExpr>> FqlTranslator::impliedBounds(const FqlExpr& disjunction) {
    std::vector<std::unique_ptr<FqlExpr>> implied;
    std::vector<const FqlExpr*> branches;
    flattenOr(disjunction, branches);
    std::vector<std::vector<Bound>> bounds(branches.size());
    for (std::size_t i = 0; i < branches.size(); ++i) collectBounds(*branches[i], bounds[i]);
    for (const Bound& candidate : bounds[0]) {
        bool everywhere = true;
        for (std::size_t i = 1; i < branches.size() && everywhere; ++i) {
            bool found = false;
            for (const Bound& b : bounds[i])
                if (b.column->column == candidate.column->column && b.upper == candidate.upper &&
                    sameConstant(*b.value, *candidate.value))
                    found = true;
            everywhere = found;
        }
        if (!everywhere) continue;
        auto e = std::make_unique<FqlExpr>();
        e->kind = FqlExprKind::Binary;
        e->op = candidate.upper ? FqlBinaryOp::Le : FqlBinaryOp::Ge;
        e->args.push_back(cloneLeaf(*candidate.column));
        e->args.push_back(cloneLeaf(*candidate.value));
        implied.push_back(std::move(e));
    }
    return implied;
}

bool FqlTranslator::orderDeterminesKey(const FqlExpr& order, const FqlTable& table) {
    if (table.orderKey.size() != 1) return false;
    const std::string& key = table.orderKey[0];
    const FqlExpr* column = &order;
    if (order.kind == FqlExprKind::Call && order.function == FqlFunction::Concat && order.args.size() == 2 &&
        order.args[1]->kind == FqlExprKind::String)
        column = order.args[0].get();
    return column->kind == FqlExprKind::Column && !column->field && column->column->name == key;
}

void FqlTranslator::buildSelect(const FqlSelect& select, FqlPlan* plan, bool itemAsNumber, Fragment& out) {
    Scope scope;
    const int root = newInstance(select.table);
    scope.instances.push_back(root);
    absorb(scope, root, *select.where);

    Fragment items;
    if (plan) {
        addOutputs(select, root, *plan, items);
    } else if (itemAsNumber) {
        renderNumber(*select.items[0], root, items);
    } else {
        render(*select.items[0], root, items);
    }

    std::vector<Fragment> conditions;
    for (const auto& [instance, conjunct] : scope.conjuncts) {
        Fragment f;
        render(*conjunct, instance, f);
        conditions.push_back(std::move(f));
        if (conjunct->kind != FqlExprKind::Binary || conjunct->op != FqlBinaryOp::Or) continue;
        for (const auto& bound : impliedBounds(*conjunct)) {
            Fragment b;
            render(*bound, instance, b);
            conditions.push_back(std::move(b));
        }
    }
    for (int instance : scope.instances) {
        Instance& in = instances_[instance];
        if (in.table->visibility.empty()) continue;
        Fragment f;
        expand(in.table->visibility, in.alias, f);
        ++in.references;
        conditions.push_back(std::move(f));
    }

    Fragment order;
    std::vector<int> ordering;
    std::string orderSql;
    if (select.orderBy) {
        const char* direction = select.descending ? " DESC" : " ASC";
        Fragment first;
        touched_ = &ordering;
        render(*select.orderBy, root, first);
        touched_ = nullptr;
        orderSql = first.sql;
        order.sql = " ORDER BY ";
        order.append(first);
        order.sql += direction;
        if (!orderDeterminesKey(*select.orderBy, *select.table)) {
            for (const std::string& name : select.table->orderKey) {
                Fragment key;
                renderColumn(root, *select.table->column(name), nullptr, key);
                if (key.sql == first.sql) continue;
                order.sql += ", ";
                order.append(key);
                order.sql += direction;
            }
        }
    }

    // A table that was only joined to be named by its key, and that the inner table's column
    // always names a row of, adds nothing: drop it.
    std::vector<bool> omitted(instances_.size(), false);
    for (const Join& j : scope.joins) {
        const Instance& o = instances_[j.outer];
        bool innerSide = false;
        for (const Join& k : scope.joins)
            if (k.inner == j.outer) innerSide = true;
        const auto& keys = o.table->uniqueKeys;
        const bool soleKey = keys.size() == 1 && keys[0].size() == 1 && keys[0][0] == j.outerColumn->name;
        if (o.references == 0 && !innerSide && o.table->visibility.empty() && soleKey &&
            j.innerColumn->references == o.table->name)
            omitted[j.outer] = true;
    }

    // A page read along the ordering's index goes first; CROSS JOIN keeps SQLite to that order.
    std::vector<int> tables;
    std::sort(ordering.begin(), ordering.end());
    ordering.erase(std::unique(ordering.begin(), ordering.end()), ordering.end());
    const bool leadByOrder = select.limit && ordering.size() == 1 && scope.instances.size() > 1 &&
                             isStoredColumn(orderSql, instances_[ordering[0]].alias);
    if (leadByOrder) tables.push_back(ordering[0]);
    for (int instance : scope.instances)
        if (!omitted[instance] && !(leadByOrder && instance == ordering[0])) tables.push_back(instance);
    out.sql += "SELECT ";
    out.append(items);
    out.sql += " FROM ";
    for (std::size_t i = 0; i < tables.size(); ++i) {
        if (i > 0) out.sql += leadByOrder ? " CROSS JOIN " : ", ";
        out.sql += instances_[tables[i]].table->name + " " + instances_[tables[i]].alias;
    }
    std::vector<std::string> joinConditions;
    for (const Join& j : scope.joins) {
        if (omitted[j.outer]) continue;
        joinConditions.push_back(instances_[j.outer].alias + "." + j.outerColumn->physical + " = " +
                                 instances_[j.inner].alias + "." + j.innerColumn->physical);
    }
    bool firstCondition = true;
    auto andSeparator = [&] {
        out.sql += firstCondition ? " WHERE " : " AND ";
        firstCondition = false;
    };
    for (const std::string& j : joinConditions) {
        andSeparator();
        out.sql += j;
    }
    for (const Fragment& c : conditions) {
        andSeparator();
        out.append(c);
    }
    out.append(order);
    if (select.limit || select.offset) {
        out.sql += " LIMIT ?";
        out.params.push_back(SqlValue::ofInt(select.limit.value_or(-1)));
        if (select.offset) {
            out.sql += " OFFSET ?";
            out.params.push_back(SqlValue::ofInt(*select.offset));
        }
    }
}

void FqlTranslator::addOutputs(const FqlSelect& select, int root, FqlPlan& plan, Fragment& items) {
    int column = 0;
    auto separate = [&] {
        if (column > 0) items.sql += ", ";
        ++column;
    };
    for (const auto& item : select.items) {
        FqlOutput output;
        output.column = column;
        const FqlExpr& e = *item;
        if (e.kind != FqlExprKind::Column) {
            output.element = "anon";
            separate();
            render(e, root, items);
        } else {
            const FqlColumn& c = *e.column;
            output.element = c.name;
            if (e.field) {
                output.kind = FqlOutput::Kind::Struct;
                output.fields.push_back(e.field->name);
                separate();
                renderColumn(root, c, e.field, items);
            } else if (c.shape == FqlShape::Struct || c.shape == FqlShape::StreamAttachment) {
                const bool attachment = c.shape == FqlShape::StreamAttachment;
                output.kind = attachment ? FqlOutput::Kind::Attachment : FqlOutput::Kind::Struct;
                for (std::size_t i = 0; i < c.fields.size(); ++i) {
                    if (!attachment || i > 0) output.fields.push_back(c.fields[i].name);
                    separate();
                    renderColumn(root, c, &c.fields[i], items);
                }
            } else {
                output.kind = c.shape == FqlShape::UidList ? FqlOutput::Kind::UidList : FqlOutput::Kind::Scalar;
                separate();
                renderColumn(root, c, nullptr, items);
            }
        }
        plan.outputs.push_back(std::move(output));
    }
}

FqlTranslator::ColumnRef FqlTranslator::resolve(ColumnRef ref) const {
    for (auto found = sameAs_.find(ref); found != sameAs_.end(); found = sameAs_.find(ref)) ref = found->second;
    return ref;
}

void FqlTranslator::expand(const std::string& sqlTemplate, const std::string& alias, Fragment& out) const {
    for (char c : sqlTemplate) {
        if (c == '$') {
            out.sql += alias;
        } else if (c == '@') {
            out.sql += '?';
            out.params.push_back(SqlValue::ofInt(viewer_));
        } else {
            out.sql += c;
        }
    }
}

void FqlTranslator::renderColumn(int instance, const FqlColumn& column, const FqlField* field, Fragment& out) {
    std::string sqlTemplate;
    if (field) {
        sqlTemplate = field->sql;
    } else if (column.shape == FqlShape::Scalar || column.shape == FqlShape::UidList) {
        sqlTemplate = column.sql;
    } else {
        out.sql += "NULL";  // a whole structured value has no scalar meaning in an expression
        return;
    }
    if (!field && !column.physical.empty() && column.hiddenBit == 0) {
        const ColumnRef same = resolve({instance, &column});
        instance = same.first;
        sqlTemplate = same.second->sql;
    }
    if (column.hiddenBit) sqlTemplate = hiddenTemplate(column.hiddenBit, sqlTemplate);
    ++instances_[instance].references;
    if (touched_) touched_->push_back(instance);
    expand(sqlTemplate, instances_[instance].alias, out);
}

FqlType FqlTranslator::typeOf(const FqlExpr& e) const {
    switch (e.kind) {
        case FqlExprKind::Column:
            if (e.field) return e.field->type;
            if (e.column->shape == FqlShape::Scalar || e.column->shape == FqlShape::UidList) return e.column->type;
            return FqlType::Text;
        case FqlExprKind::String: return FqlType::Text;
        case FqlExprKind::Call:
            switch (e.function) {
                case FqlFunction::Concat:
                case FqlFunction::Substr:
                case FqlFunction::Lower:
                case FqlFunction::Upper: return FqlType::Text;
                default: return FqlType::Integer;
            }
        default: return FqlType::Integer;
    }
}

void FqlTranslator::renderNumber(const FqlExpr& e, int instance, Fragment& out) {
    if (typeOf(e) != FqlType::Text) {
        render(e, instance, out);
    } else if (e.kind == FqlExprKind::String) {
        out.sql += '?';
        out.params.push_back(SqlNumber::fromText(e.text));
    } else {
        out.sql += "CAST(";
        render(e, instance, out);
        out.sql += " AS NUMERIC)";
    }
}

void FqlTranslator::render(const FqlExpr& e, int instance, Fragment& out) {
    switch (e.kind) {
        case FqlExprKind::Column: renderColumn(instance, *e.column, e.field, out); return;
        case FqlExprKind::Integer:
            out.sql += '?';
            out.params.push_back(SqlValue::ofInt(e.integer));
            return;
        case FqlExprKind::String:
            out.sql += '?';
            out.params.push_back(SqlValue::ofText(e.text));
            return;
        case FqlExprKind::Call: renderCall(e, instance, out); return;
        case FqlExprKind::Negate:
            out.sql += "(- ";
            render(*e.args[0], instance, out);
            out.sql += ')';
            return;
        case FqlExprKind::Not:
            out.sql += "(NOT ";
            render(*e.args[0], instance, out);
            out.sql += ')';
            return;
        case FqlExprKind::Binary: {
            out.sql += '(';
            const bool numeric = e.isComparison() &&
                                 (typeOf(*e.args[0]) != FqlType::Text || typeOf(*e.args[1]) != FqlType::Text);
            for (int side = 0; side < 2; ++side) {
                if (side == 1) out.sql += operatorSql(e.op);
                if (numeric) renderNumber(*e.args[side], instance, out);
                else render(*e.args[side], instance, out);
            }
            out.sql += ')';
            return;
        }
        case FqlExprKind::InList: {
            bool numeric = typeOf(*e.args[0]) != FqlType::Text;
            for (std::size_t i = 1; i < e.args.size(); ++i)
                if (typeOf(*e.args[i]) != FqlType::Text) numeric = true;
            out.sql += '(';
            for (std::size_t i = 0; i < e.args.size(); ++i) {
                if (i == 1) out.sql += e.negated ? " NOT IN (" : " IN (";
                if (i > 1) out.sql += ", ";
                if (numeric) renderNumber(*e.args[i], instance, out);
                else render(*e.args[i], instance, out);
            }
            out.sql += "))";
            return;
        }
        case FqlExprKind::InSubquery: {
            const FqlSelect& sub = *e.subquery;
            const bool numeric =
                typeOf(*e.args[0]) != FqlType::Text || typeOf(*sub.items[0]) != FqlType::Text;
            out.sql += '(';
            if (numeric) renderNumber(*e.args[0], instance, out);
            else render(*e.args[0], instance, out);
            out.sql += e.negated ? " NOT IN (" : " IN (";
            buildSelect(sub, nullptr, numeric, out);
            out.sql += "))";
            return;
        }
    }
}

void FqlTranslator::renderCall(const FqlExpr& e, int instance, Fragment& out) {
    auto text = [&](const FqlExpr& arg) {
        if (arg.kind == FqlExprKind::String) {
            render(arg, instance, out);
            return;
        }
        out.sql += "CAST(";
        render(arg, instance, out);
        out.sql += " AS TEXT)";
    };
    switch (e.function) {
        case FqlFunction::Now:
            out.sql += '?';
            out.params.push_back(SqlValue::ofInt(now_));
            return;
        case FqlFunction::Me:
            out.sql += '?';
            out.params.push_back(SqlValue::ofInt(viewer_));
            return;
        case FqlFunction::Rand: out.sql += "(random() & 2147483647)"; return;
        case FqlFunction::Strlen:
            out.sql += "length(CAST(";
            render(*e.args[0], instance, out);
            out.sql += " AS BLOB))";
            return;
        case FqlFunction::Lower:
        case FqlFunction::Upper:
            out.sql += e.function == FqlFunction::Lower ? "lower(" : "upper(";
            text(*e.args[0]);
            out.sql += ')';
            return;
        case FqlFunction::Strpos:
            out.sql += "(instr(";
            text(*e.args[0]);
            out.sql += ", ";
            text(*e.args[1]);
            out.sql += ") - 1)";
            return;
        case FqlFunction::Substr:
            // FQL counts from 0, SQLite from 1; a negative start counts from the end in both.
            out.sql += "substr(";
            text(*e.args[0]);
            out.sql += ", (CASE WHEN ";
            renderNumber(*e.args[1], instance, out);
            out.sql += " >= 0 THEN ";
            renderNumber(*e.args[1], instance, out);
            out.sql += " + 1 ELSE ";
            renderNumber(*e.args[1], instance, out);
            out.sql += " END), ";
            renderNumber(*e.args[2], instance, out);
            out.sql += ')';
            return;
        case FqlFunction::Concat: {
            // concat(id, ' ') over a column whose "<id> " key is stored reads the stored key, so
            // that orderings and key ranges on it run along the key's index.
            if (e.args.size() == 2 && isPlainColumn(*e.args[0]) && e.args[1]->kind == FqlExprKind::String &&
                e.args[1]->text == " ") {
                const ColumnRef same = resolve({instance, e.args[0]->column});
                if (!same.second->textKey.empty()) {
                    ++instances_[same.first].references;
                    if (touched_) touched_->push_back(same.first);
                    out.sql += instances_[same.first].alias + "." + same.second->textKey;
                    return;
                }
            }
            out.sql += '(';
            for (std::size_t i = 0; i < e.args.size(); ++i) {
                if (i > 0) out.sql += " || ";
                text(*e.args[i]);
            }
            out.sql += ')';
            return;
        }
        case FqlFunction::None: out.sql += "NULL"; return;
    }
}

}  // namespace emu
