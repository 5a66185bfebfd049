// Recursive-descent parser for the FQL statement language.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "FqlAst.h"
#include "FqlLexer.h"
#include "Store.h"

namespace emu {

// Grammar (keywords in any case):
//   statement  := SELECT item {, item} FROM name WHERE expr
//                 [ORDER BY expr [ASC|DESC]] [LIMIT n [OFFSET m] | LIMIT m, n]
//   expr       := and {OR and};   and := not {AND not};   not := NOT not | compare
//   compare    := sum [(= | != | <> | < | <= | > | >=) sum | [NOT] IN ( statement | expr {, expr} )]
//   sum        := product {(+|-) product};   product := unary {(*|/) unary}
//   unary      := - unary | primary
//   primary    := integer | 'text' | "text" | ( expr ) | name ( [expr {, expr}] ) | name {. name}
// A subquery selects exactly one item. Only one statement is accepted: anything after it is an
// error. Errors are 601 with the service's texts. Statements nested deeper than kMaxDepth or with
// more than kMaxOperators operators are refused where the limit is passed, which bounds the
// recursion of every later stage whatever a request holds.
//
// One parser parses one statement; not thread-safe, cheap to make.
class FqlParser {
public:
    // On success `select` holds the tree.
    static Status parse(const std::string& query, std::unique_ptr<FqlSelect>& select);

    static constexpr int kMaxDepth = 64;
    static constexpr int kMaxOperators = 400;

private:
    explicit FqlParser(std::vector<FqlToken> tokens) : tokens_(std::move(tokens)) {}

    Status parseSelect(std::unique_ptr<FqlSelect>& out, bool subquery);
    Status parseExpr(std::unique_ptr<FqlExpr>& out);
    Status parseAnd(std::unique_ptr<FqlExpr>& out);
    Status parseNot(std::unique_ptr<FqlExpr>& out);
    Status parseCompare(std::unique_ptr<FqlExpr>& out);
    Status parseSum(std::unique_ptr<FqlExpr>& out);
    Status parseProduct(std::unique_ptr<FqlExpr>& out);
    Status parseUnary(std::unique_ptr<FqlExpr>& out);
    Status parsePrimary(std::unique_ptr<FqlExpr>& out);
    Status parseCount(std::int64_t& out);

    const FqlToken& peek(std::size_t ahead = 0) const;
    bool atKeyword(const char* keyword, std::size_t ahead = 0) const;
    bool isKeyword(const FqlToken& token) const;
    Status expect(FqlTokenKind kind);
    Status expectKeyword(const char* keyword);
    // Count one more nesting level or operator at the current token; fail past the limit.
    Status enter();
    Status countOperator();

    std::vector<FqlToken> tokens_;
    std::size_t at_ = 0;
    int depth_ = 0;
    int operators_ = 0;
};

}  // namespace emu
