// A value bound to a statement parameter.
#pragma once

#include <cstdint>
#include <string>
#include <utility>

namespace emu {

// Plain value type; copyable, no shared state.
struct SqlValue {
    enum class Kind { Null, Integer, Real, Text };
    Kind kind = Kind::Null;
    std::int64_t integer = 0;
    double real = 0;
    std::string text;

    static SqlValue ofInt(std::int64_t v) {
        SqlValue s;
        s.kind = Kind::Integer;
        s.integer = v;
        return s;
    }
    static SqlValue ofReal(double v) {
        SqlValue s;
        s.kind = Kind::Real;
        s.real = v;
        return s;
    }
    static SqlValue ofText(std::string v) {
        SqlValue s;
        s.kind = Kind::Text;
        s.text = std::move(v);
        return s;
    }
};

}  // namespace emu
