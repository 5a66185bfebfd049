#include "FqlLexer.h"

namespace emu {

ServiceError fqlUnexpectedEnd() { return ServiceError{601, "Parser error: unexpected end of query."}; }

ServiceError fqlUnexpected(const FqlToken& token) {
    if (token.kind == FqlTokenKind::End || token.kind == FqlTokenKind::Unterminated) return fqlUnexpectedEnd();
    return ServiceError{601, "Parser error: unexpected '" + token.text + "' at position " +
                                 std::to_string(token.position) + "."};
}

namespace {

bool isIdentStart(char c) { return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '_'; }
bool isDigit(char c) { return c >= '0' && c <= '9'; }
bool isSpace(char c) { return c == ' ' || c == '\t' || c == '\n' || c == '\r' || c == '\f' || c == '\v'; }

}  // namespace

void FqlLexer::tokenize(const std::string& query, std::vector<FqlToken>& tokens) {
    tokens.clear();
    const std::size_t n = query.size();
    std::size_t i = 0;
    auto push = [&](FqlTokenKind kind, std::size_t start, std::size_t end) {
        tokens.push_back(FqlToken{kind, query.substr(start, end - start), {}, start});
    };
    while (i < n) {
        const char c = query[i];
        if (isSpace(c)) {
            ++i;
            continue;
        }
        const std::size_t start = i;
        if (isIdentStart(c)) {
            while (i < n && (isIdentStart(query[i]) || isDigit(query[i]))) ++i;
            push(FqlTokenKind::Identifier, start, i);
        } else if (isDigit(c)) {
            while (i < n && isDigit(query[i])) ++i;
            push(FqlTokenKind::Integer, start, i);
        } else if (c == '\'' || c == '"') {
            std::string value;
            ++i;
            bool closed = false;
            while (i < n) {
                if (query[i] == c) {
                    if (i + 1 < n && query[i + 1] == c) {  // a doubled quote stands for one
                        value += c;
                        i += 2;
                        continue;
                    }
                    ++i;
                    closed = true;
                    break;
                }
                value += query[i++];
            }
            push(closed ? FqlTokenKind::String : FqlTokenKind::Unterminated, start, i);
            tokens.back().value = std::move(value);
        } else {
            FqlTokenKind kind = FqlTokenKind::Junk;
            std::size_t length = 1;
            const char next = i + 1 < n ? query[i + 1] : '\0';
            switch (c) {
                case ',': kind = FqlTokenKind::Comma; break;
                case '(': kind = FqlTokenKind::LParen; break;
                case ')': kind = FqlTokenKind::RParen; break;
                case '.': kind = FqlTokenKind::Dot; break;
                case '*': kind = FqlTokenKind::Star; break;
                case '+': kind = FqlTokenKind::Plus; break;
                case '=': kind = FqlTokenKind::Eq; break;
                // Comment openers are kept whole so that a comment is reported as such rather
                // than being read as arithmetic.
                case '-':
                    if (next == '-') length = 2;
                    else kind = FqlTokenKind::Minus;
                    break;
                case '/':
                    if (next == '*') length = 2;
                    else kind = FqlTokenKind::Slash;
                    break;
                case '!':
                    if (next == '=') {
                        kind = FqlTokenKind::Ne;
                        length = 2;
                    }
                    break;
                case '<':
                    if (next == '=') {
                        kind = FqlTokenKind::Le;
                        length = 2;
                    } else if (next == '>') {
                        kind = FqlTokenKind::Ne;
                        length = 2;
                    } else {
                        kind = FqlTokenKind::Lt;
                    }
                    break;
                case '>':
                    if (next == '=') {
                        kind = FqlTokenKind::Ge;
                        length = 2;
                    } else {
                        kind = FqlTokenKind::Gt;
                    }
                    break;
                default: break;
            }
            i += length;
            push(kind, start, i);
        }
    }
    tokens.push_back(FqlToken{FqlTokenKind::End, {}, {}, n});
}

}  // namespace emu
