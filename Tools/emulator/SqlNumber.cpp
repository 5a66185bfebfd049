#include "SqlNumber.h"

#include <charconv>
#include <cstdlib>

namespace emu {

SqlValue SqlNumber::fromText(const std::string& text) {
    std::size_t i = 0;
    const std::size_t n = text.size();
    while (i < n && (text[i] == ' ' || text[i] == '\t' || text[i] == '\n' || text[i] == '\r')) ++i;
    const std::size_t start = i;
    if (i < n && (text[i] == '+' || text[i] == '-')) ++i;
    const std::size_t digitsStart = i;
    while (i < n && text[i] >= '0' && text[i] <= '9') ++i;
    bool integral = true;
    std::size_t digits = i - digitsStart;
    if (i < n && text[i] == '.') {
        std::size_t j = i + 1;
        while (j < n && text[j] >= '0' && text[j] <= '9') ++j;
        if (j - i - 1 > 0 || digits > 0) {
            digits += j - i - 1;
            integral = false;
            i = j;
        }
    }
    if (digits == 0) return SqlValue::ofInt(0);
    if (i < n && (text[i] == 'e' || text[i] == 'E')) {
        std::size_t j = i + 1;
        if (j < n && (text[j] == '+' || text[j] == '-')) ++j;
        const std::size_t expStart = j;
        while (j < n && text[j] >= '0' && text[j] <= '9') ++j;
        if (j > expStart) {
            integral = false;
            i = j;
        }
    }
    const std::string number = text.substr(start, i - start);
    if (integral) {
        std::int64_t value = 0;
        const char* first = number.data() + (number[0] == '+' ? 1 : 0);
        auto [end, ec] = std::from_chars(first, number.data() + number.size(), value);
        if (ec == std::errc() && end == number.data() + number.size()) return SqlValue::ofInt(value);
    }
    const double real = std::strtod(number.c_str(), nullptr);
    // A real with an integral value is an integer, as in SQLite.
    // The range is checked first: converting a double outside it to an integer is undefined.
    if (!integral && real > -9.2e18 && real < 9.2e18 && real == static_cast<double>(static_cast<std::int64_t>(real)))
        return SqlValue::ofInt(static_cast<std::int64_t>(real));
    return SqlValue::ofReal(real);
}

}  // namespace emu
