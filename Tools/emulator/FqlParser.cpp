#include "FqlParser.h"

#include <charconv>

#include "FqlCatalog.h"

namespace emu {

namespace {

const char* const kKeywords[] = {"select", "from", "where", "and", "or", "not", "in",
                                 "order", "by", "asc", "desc", "limit", "offset"};

// Leaves one nesting level when it goes out of scope.
struct DepthGuard {
    int& depth;
    ~DepthGuard() { --depth; }
};

std::unique_ptr<FqlExpr> makeExpr(FqlExprKind kind, std::size_t position) {
    auto e = std::make_unique<FqlExpr>();
    e->kind = kind;
    e->position = position;
    return e;
}

std::unique_ptr<FqlExpr> makeBinary(FqlBinaryOp op, std::unique_ptr<FqlExpr> left, std::unique_ptr<FqlExpr> right) {
    auto e = makeExpr(FqlExprKind::Binary, left->position);
    e->op = op;
    e->args.push_back(std::move(left));
    e->args.push_back(std::move(right));
    return e;
}

}  // namespace

Status FqlParser::parse(const std::string& query, std::unique_ptr<FqlSelect>& select) {
    std::vector<FqlToken> tokens;
    FqlLexer::tokenize(query, tokens);
    FqlParser parser(std::move(tokens));
    std::unique_ptr<FqlSelect> result;
    if (Status s = parser.parseSelect(result, false)) return s;
    if (parser.peek().kind != FqlTokenKind::End) return fqlUnexpected(parser.peek());
    select = std::move(result);
    return std::nullopt;
}

const FqlToken& FqlParser::peek(std::size_t ahead) const {
    const std::size_t i = at_ + ahead;
    return i < tokens_.size() ? tokens_[i] : tokens_.back();
}

bool FqlParser::atKeyword(const char* keyword, std::size_t ahead) const {
    const FqlToken& t = peek(ahead);
    return t.kind == FqlTokenKind::Identifier && equalsIgnoreCase(t.text, keyword);
}

bool FqlParser::isKeyword(const FqlToken& token) const {
    if (token.kind != FqlTokenKind::Identifier) return false;
    for (const char* k : kKeywords)
        if (equalsIgnoreCase(token.text, k)) return true;
    return false;
}

Status FqlParser::expect(FqlTokenKind kind) {
    if (peek().kind != kind) return fqlUnexpected(peek());
    ++at_;
    return std::nullopt;
}

Status FqlParser::expectKeyword(const char* keyword) {
    if (!atKeyword(keyword)) return fqlUnexpected(peek());
    ++at_;
    return std::nullopt;
}

Status FqlParser::enter() {
    if (++depth_ > kMaxDepth) return fqlUnexpected(peek());
    return std::nullopt;
}

Status FqlParser::countOperator() {
    if (++operators_ > kMaxOperators) return fqlUnexpected(peek());
    return std::nullopt;
}

Status FqlParser::parseSelect(std::unique_ptr<FqlSelect>& out, bool subquery) {
    auto select = std::make_unique<FqlSelect>();
    if (Status s = expectKeyword("select")) return s;
    for (;;) {
        if (peek().kind == FqlTokenKind::Star)
            return ServiceError{601, "Parser error: SELECT * is not supported.  Please manually list the columns "
                                     "you are interested in."};
        std::unique_ptr<FqlExpr> item;
        if (Status s = parseExpr(item)) return s;
        select->items.push_back(std::move(item));
        if (subquery || peek().kind != FqlTokenKind::Comma) break;
        ++at_;
    }
    if (Status s = expectKeyword("from")) return s;
    if (peek().kind != FqlTokenKind::Identifier || isKeyword(peek())) return fqlUnexpected(peek());
    select->tableName = peek().text;
    select->tablePosition = peek().position;
    ++at_;
    if (Status s = expectKeyword("where")) return s;
    if (Status s = parseExpr(select->where)) return s;
    if (atKeyword("order")) {
        ++at_;
        if (Status s = expectKeyword("by")) return s;
        if (Status s = parseExpr(select->orderBy)) return s;
        if (atKeyword("asc")) {
            ++at_;
        } else if (atKeyword("desc")) {
            select->descending = true;
            ++at_;
        }
    }
    if (atKeyword("limit")) {
        ++at_;
        std::int64_t first = 0;
        if (Status s = parseCount(first)) return s;
        if (peek().kind == FqlTokenKind::Comma) {
            ++at_;
            std::int64_t second = 0;
            if (Status s = parseCount(second)) return s;
            select->offset = first;
            select->limit = second;
        } else {
            select->limit = first;
            if (atKeyword("offset")) {
                ++at_;
                std::int64_t offset = 0;
                if (Status s = parseCount(offset)) return s;
                select->offset = offset;
            }
        }
    }
    out = std::move(select);
    return std::nullopt;
}

Status FqlParser::parseCount(std::int64_t& out) {
    const FqlToken& t = peek();
    if (t.kind != FqlTokenKind::Integer) return fqlUnexpected(t);
    auto [end, ec] = std::from_chars(t.text.data(), t.text.data() + t.text.size(), out);
    if (ec != std::errc() || end != t.text.data() + t.text.size()) return fqlUnexpected(t);
    ++at_;
    return std::nullopt;
}

Status FqlParser::parseExpr(std::unique_ptr<FqlExpr>& out) {
    if (Status s = enter()) return s;
    DepthGuard guard{depth_};
    if (Status s = parseAnd(out)) return s;
    while (atKeyword("or")) {
        if (Status s = countOperator()) return s;
        ++at_;
        std::unique_ptr<FqlExpr> right;
        if (Status s = parseAnd(right)) return s;
        out = makeBinary(FqlBinaryOp::Or, std::move(out), std::move(right));
    }
    return std::nullopt;
}

Status FqlParser::parseAnd(std::unique_ptr<FqlExpr>& out) {
    if (Status s = parseNot(out)) return s;
    while (atKeyword("and")) {
        if (Status s = countOperator()) return s;
        ++at_;
        std::unique_ptr<FqlExpr> right;
        if (Status s = parseNot(right)) return s;
        out = makeBinary(FqlBinaryOp::And, std::move(out), std::move(right));
    }
    return std::nullopt;
}

Status FqlParser::parseNot(std::unique_ptr<FqlExpr>& out) {
    if (atKeyword("not")) {
        if (Status s = enter()) return s;
        DepthGuard guard{depth_};
        auto e = makeExpr(FqlExprKind::Not, peek().position);
        ++at_;
        std::unique_ptr<FqlExpr> operand;
        if (Status s = parseNot(operand)) return s;
        e->args.push_back(std::move(operand));
        out = std::move(e);
        return std::nullopt;
    }
    return parseCompare(out);
}

Status FqlParser::parseCompare(std::unique_ptr<FqlExpr>& out) {
    if (Status s = parseSum(out)) return s;
    FqlBinaryOp op;
    switch (peek().kind) {
        case FqlTokenKind::Eq: op = FqlBinaryOp::Eq; break;
        case FqlTokenKind::Ne: op = FqlBinaryOp::Ne; break;
        case FqlTokenKind::Lt: op = FqlBinaryOp::Lt; break;
        case FqlTokenKind::Le: op = FqlBinaryOp::Le; break;
        case FqlTokenKind::Gt: op = FqlBinaryOp::Gt; break;
        case FqlTokenKind::Ge: op = FqlBinaryOp::Ge; break;
        default: {
            bool negated = false;
            if (atKeyword("not") && atKeyword("in", 1)) {
                negated = true;
                ++at_;
            }
            if (!atKeyword("in")) return std::nullopt;
            ++at_;
            if (Status s = expect(FqlTokenKind::LParen)) return s;
            std::unique_ptr<FqlExpr> in;
            if (atKeyword("select")) {
                in = makeExpr(FqlExprKind::InSubquery, out->position);
                if (Status s = parseSelect(in->subquery, true)) return s;
                in->args.push_back(std::move(out));
            } else {
                in = makeExpr(FqlExprKind::InList, out->position);
                in->args.push_back(std::move(out));
                for (;;) {
                    std::unique_ptr<FqlExpr> item;
                    if (Status s = parseExpr(item)) return s;
                    in->args.push_back(std::move(item));
                    if (peek().kind != FqlTokenKind::Comma) break;
                    ++at_;
                }
            }
            if (Status s = expect(FqlTokenKind::RParen)) return s;
            in->negated = negated;
            out = std::move(in);
            return std::nullopt;
        }
    }
    ++at_;
    std::unique_ptr<FqlExpr> right;
    if (Status s = parseSum(right)) return s;
    out = makeBinary(op, std::move(out), std::move(right));
    return std::nullopt;
}

Status FqlParser::parseSum(std::unique_ptr<FqlExpr>& out) {
    if (Status s = parseProduct(out)) return s;
    while (peek().kind == FqlTokenKind::Plus || peek().kind == FqlTokenKind::Minus) {
        if (Status s = countOperator()) return s;
        const FqlBinaryOp op = peek().kind == FqlTokenKind::Plus ? FqlBinaryOp::Add : FqlBinaryOp::Sub;
        ++at_;
        std::unique_ptr<FqlExpr> right;
        if (Status s = parseProduct(right)) return s;
        out = makeBinary(op, std::move(out), std::move(right));
    }
    return std::nullopt;
}

Status FqlParser::parseProduct(std::unique_ptr<FqlExpr>& out) {
    if (Status s = parseUnary(out)) return s;
    while (peek().kind == FqlTokenKind::Star || peek().kind == FqlTokenKind::Slash) {
        if (Status s = countOperator()) return s;
        const FqlBinaryOp op = peek().kind == FqlTokenKind::Star ? FqlBinaryOp::Mul : FqlBinaryOp::Div;
        ++at_;
        std::unique_ptr<FqlExpr> right;
        if (Status s = parseUnary(right)) return s;
        out = makeBinary(op, std::move(out), std::move(right));
    }
    return std::nullopt;
}

Status FqlParser::parseUnary(std::unique_ptr<FqlExpr>& out) {
    if (peek().kind == FqlTokenKind::Minus) {
        if (Status s = enter()) return s;
        DepthGuard guard{depth_};
        auto e = makeExpr(FqlExprKind::Negate, peek().position);
        ++at_;
        std::unique_ptr<FqlExpr> operand;
        if (Status s = parseUnary(operand)) return s;
        e->args.push_back(std::move(operand));
        out = std::move(e);
        return std::nullopt;
    }
    return parsePrimary(out);
}

Status FqlParser::parsePrimary(std::unique_ptr<FqlExpr>& out) {
    const FqlToken& t = peek();
    switch (t.kind) {
        case FqlTokenKind::Integer: {
            auto e = makeExpr(FqlExprKind::Integer, t.position);
            auto [end, ec] = std::from_chars(t.text.data(), t.text.data() + t.text.size(), e->integer);
            if (ec != std::errc() || end != t.text.data() + t.text.size()) return fqlUnexpected(t);
            ++at_;
            out = std::move(e);
            return std::nullopt;
        }
        case FqlTokenKind::String: {
            auto e = makeExpr(FqlExprKind::String, t.position);
            e->text = t.value;
            ++at_;
            out = std::move(e);
            return std::nullopt;
        }
        case FqlTokenKind::LParen: {
            ++at_;
            if (Status s = parseExpr(out)) return s;
            return expect(FqlTokenKind::RParen);
        }
        case FqlTokenKind::Identifier: {
            if (isKeyword(t)) return fqlUnexpected(t);
            if (peek(1).kind == FqlTokenKind::LParen) {
                auto e = makeExpr(FqlExprKind::Call, t.position);
                e->text = t.text;
                at_ += 2;
                if (peek().kind != FqlTokenKind::RParen) {
                    for (;;) {
                        std::unique_ptr<FqlExpr> arg;
                        if (Status s = parseExpr(arg)) return s;
                        e->args.push_back(std::move(arg));
                        if (peek().kind != FqlTokenKind::Comma) break;
                        ++at_;
                    }
                }
                if (Status s = expect(FqlTokenKind::RParen)) return s;
                out = std::move(e);
                return std::nullopt;
            }
            auto e = makeExpr(FqlExprKind::Column, t.position);
            e->text = t.text;
            ++at_;
            while (peek().kind == FqlTokenKind::Dot) {
                const FqlToken& part = peek(1);
                if (part.kind != FqlTokenKind::Identifier || isKeyword(part)) return fqlUnexpected(part);
                e->text += '.';
                e->text += part.text;
                at_ += 2;
            }
            out = std::move(e);
            return std::nullopt;
        }
        default: return fqlUnexpected(t);
    }
}

}  // namespace emu
