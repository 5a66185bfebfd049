// Splits an FQL statement into tokens.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "Store.h"

namespace emu {

enum class FqlTokenKind {
    Identifier, Integer, String,
    Comma, LParen, RParen, Dot, Star, Plus, Minus, Slash,
    Eq, Ne, Lt, Le, Gt, Ge,
    Junk,          // anything the language has no use for: ';', '#', comment openers, stray bytes
    Unterminated,  // a string literal that runs to the end of the statement
    End,
};

struct FqlToken {
    FqlTokenKind kind = FqlTokenKind::End;
    std::string text;   // the token as written
    std::string value;  // a string literal's value
    std::size_t position = 0;
};

// Stateless.
class FqlLexer {
public:
    // Fills `tokens`, always ending with an End token. Nothing fails here: oddities become Junk
    // or Unterminated tokens that the parser rejects where they stand, so that the first fault
    // in the text is the one reported.
    static void tokenize(const std::string& query, std::vector<FqlToken>& tokens);
};

// The service's parser error texts.
ServiceError fqlUnexpected(const FqlToken& token);
ServiceError fqlUnexpectedEnd();

}  // namespace emu
