#pragma once

#include <cstddef>
#include <functional>
#include <iosfwd>
#include <string>
#include <string_view>
#include <utility>

#include "trelm/Export.h"
#include "trelm/uError.h"

namespace trelm {

// A byte string (no encoding is assumed) over std::string. Sizes and positions are `unsigned`;
// `npos` (all ones) means "not found" or "to the end".
//
// Comparison is byte-wise on unsigned bytes; a proper prefix sorts before the longer string.
// Thread safety: as std::string (const use from several threads is safe).
class TRELM_API String {
public:
    static constexpr unsigned npos = ~0u;

    String() = default;
    String(char const* text) : s_(text ? text : "") {}  // NOLINT: implicit by design
    String(char const* text, unsigned length) : s_(text, length) {}
    String(std::string const& text) : s_(text) {}                 // NOLINT
    String(std::string&& text) noexcept : s_(std::move(text)) {}  // NOLINT
    explicit String(std::string_view text) : s_(text) {}

    char const* cStr() const noexcept { return s_.c_str(); }
    std::string const& str() const noexcept { return s_; }
    std::string_view view() const noexcept { return s_; }
    bool empty() const noexcept { return s_.empty(); }
    unsigned size() const noexcept { return static_cast<unsigned>(s_.size()); }
    // REQUIRES: i < size().
    char operator[](unsigned i) const { return s_[i]; }

    // Replaces the bytes with `length` bytes from `text`, keeping the allocation when they fit.
    String& assign(char const* text, unsigned length) {
        s_.assign(text, length);
        return *this;
    }

    // Removes up to n bytes from pos; a pos past the end removes nothing.
    String& erase(unsigned pos, unsigned n = npos);
    // First position >= pos of c / of text, or npos. An empty text is found at pos (if pos <= size).
    unsigned find(char c, unsigned pos = 0) const noexcept;
    unsigned find(String const& text, unsigned pos = 0) const noexcept;
    // Up to n bytes from pos; a pos past the end gives the empty string.
    String substr(unsigned pos, unsigned n = npos) const;

    String& operator+=(String const& other) {
        s_ += other.s_;
        return *this;
    }
    String& operator+=(char const* other) {
        if (other) s_ += other;
        return *this;
    }
    String& operator+=(char c) {
        s_ += c;
        return *this;
    }

    friend String operator+(String const& a, String const& b) {
        String r(a);
        r += b;
        return r;
    }
    friend String operator+(String const& a, char const* b) {
        String r(a);
        r += b;
        return r;
    }
    friend String operator+(char const* a, String const& b) {
        String r(a);
        r += b;
        return r;
    }
    friend String operator+(String const& a, char b) {
        String r(a);
        r += b;
        return r;
    }

    friend bool operator==(String const& a, String const& b) noexcept { return a.s_ == b.s_; }
    friend bool operator!=(String const& a, String const& b) noexcept { return a.s_ != b.s_; }
    friend bool operator<(String const& a, String const& b) noexcept { return a.s_ < b.s_; }
    friend bool operator==(String const& a, char const* b) noexcept { return a.s_ == (b ? b : ""); }
    friend bool operator!=(String const& a, char const* b) noexcept { return !(a == b); }

    // Decimal text of a number.
    static String from(int value);
    static String from(long value);
    static String from(long long value);
    static String from(unsigned value);
    static String from(unsigned long value);
    static String from(unsigned long long value);

    // Parses the whole text as a decimal number in the target's range: an optional '-' (signed
    // targets only) followed by at least one digit, nothing else (no spaces, no '+'). Anything
    // else, or a value out of range, gives kInvalid and leaves `out` untouched.
    uError to(int& out) const;
    uError to(unsigned& out) const;
    uError to(long long& out) const;

private:
    std::string s_;
};

TRELM_API std::ostream& operator<<(std::ostream& os, String const& s);

}  // namespace trelm

template <>
struct std::hash<trelm::String> {
    std::size_t operator()(trelm::String const& s) const noexcept { return std::hash<std::string>()(s.str()); }
};
