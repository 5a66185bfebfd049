// The number a text stands for when FQL compares it with a number.
#pragma once

#include <string>

#include "SqlValue.h"

namespace emu {

// Stateless.
class SqlNumber {
public:
    // Leading blanks are skipped and the longest numeric prefix is taken ("12 " -> 12,
    // "1.5x" -> 1.5); a text without one is 0. Integral values that fit 64 bits are integers,
    // the rest reals. This is also what SQLite's CAST(... AS NUMERIC) does, so a value converted
    // here and one converted in SQL compare alike.
    static SqlValue fromText(const std::string& text);
};

}  // namespace emu
