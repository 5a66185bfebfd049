#pragma once

#include <cstdint>
#include <iosfwd>
#include <variant>

#include "trelm/Export.h"
#include "trelm/GUID.h"
#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {

// A tagged value: empty, bool, 32-bit signed, 64-bit signed, 32-bit unsigned, String, GUID,
// Vector<int> or Vector<String>.
//
// Conversions (`as`) succeed where the held value allows and otherwise return kInvalid with the
// out-parameter untouched:
//   integers   from any integer type whose value is in the target's range, and from a String
//              holding a whole decimal number in range (String::to rules); never from bool;
//   bool       from bool, from an integer 0 or 1, from the Strings "true", "false", "1", "0";
//   String     from any scalar: numbers as decimal text, bool as "true"/"false", GUID as text;
//   GUID       from a GUID, from a String holding GUID text;
//   Vector<int>     from an int list, from a single integer in int range (one element), from
//                   a String list whose every element is a decimal int;
//   Vector<String>  from a String list, from an int list (decimal texts).
// An empty Variant converts to nothing.
//
// Thread safety: a plain value.
class TRELM_API Variant {
public:
    // The numeric codes are relied on outside the framework (6 = 32-bit signed integer).
    // Inside this class `String` names the enumerator; the string class is trelm::String.
    enum Type {
        Empty = 0,
        Bool = 1,
        String = 2,
        Guid = 3,
        IntList = 4,
        StringList = 5,
        Int32 = 6,
        Int64 = 7,
        UInt32 = 8,
    };

    Variant() noexcept = default;
    Variant(bool v) : v_(v) {}                          // NOLINT: implicit by design
    Variant(char const* v) : v_(trelm::String(v)) {}    // NOLINT
    Variant(int v) : v_(std::int32_t(v)) {}             // NOLINT
    Variant(long v) : v_(std::int64_t(v)) {}            // NOLINT
    Variant(long long v) : v_(std::int64_t(v)) {}       // NOLINT
    Variant(unsigned v) : v_(std::uint32_t(v)) {}       // NOLINT
    Variant(GUID const& v) : v_(v) {}                   // NOLINT
    Variant(trelm::String const& v) : v_(v) {}          // NOLINT
    Variant(Vector<int> const& v) : v_(v) {}            // NOLINT
    Variant(Vector<trelm::String> const& v) : v_(v) {}  // NOLINT
    Variant(Variant const&) = default;
    Variant(Variant&&) noexcept = default;

    Variant& operator=(Variant const&) = default;
    Variant& operator=(Variant&&) noexcept = default;
    Variant& operator=(bool v) {
        v_ = v;
        return *this;
    }
    Variant& operator=(int v) {
        v_ = std::int32_t(v);
        return *this;
    }
    Variant& operator=(long v) {
        v_ = std::int64_t(v);
        return *this;
    }
    Variant& operator=(long long v) {
        v_ = std::int64_t(v);
        return *this;
    }
    Variant& operator=(unsigned v) {
        v_ = std::uint32_t(v);
        return *this;
    }
    Variant& operator=(char const* v) {
        v_ = trelm::String(v);
        return *this;
    }
    Variant& operator=(trelm::String const& v) {
        v_ = v;
        return *this;
    }
    Variant& operator=(GUID const& v) {
        v_ = v;
        return *this;
    }

    Type type() const noexcept { return static_cast<Type>(v_.index()); }
    bool empty() const noexcept { return v_.index() == Empty; }

    uError as(int& out) const;
    uError as(long long& out) const;
    uError as(unsigned& out) const;
    uError as(bool& out) const;
    uError as(GUID& out) const;
    uError as(trelm::String& out) const;
    uError as(Vector<int>& out) const;
    uError as(Vector<trelm::String>& out) const;

    // The converted value, or the null GUID / 0 / "" when the value does not convert.
    GUID asGUID() const;
    int asInt32() const;
    long long asInt64() const;
    unsigned asUInt32() const;
    trelm::String asString() const;

    // Printable text: "" for empty, the `as(String&)` text for scalars, "[a, b]" for lists.
    trelm::String toString() const;

    // Equal when of the same type and value (Int32 5 != Int64 5).
    friend bool operator==(Variant const& a, Variant const& b) { return a.v_ == b.v_; }
    friend bool operator!=(Variant const& a, Variant const& b) { return !(a.v_ == b.v_); }
    // Different types order by type code; the same type by value.
    friend bool operator<(Variant const& a, Variant const& b) { return a.v_ < b.v_; }

private:
    // The alternatives are in Type order, so index() is the type code.
    std::variant<std::monostate, bool, trelm::String, GUID, Vector<int>, Vector<trelm::String>, std::int32_t,
                 std::int64_t, std::uint32_t>
        v_;
};

TRELM_API std::ostream& operator<<(std::ostream& os, Variant const& v);

}  // namespace trelm
