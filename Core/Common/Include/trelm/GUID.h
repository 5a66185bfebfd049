#pragma once

#include <array>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <functional>
#include <iosfwd>

#include "trelm/Export.h"
#include "trelm/String.h"
#include "trelm/uError.h"

namespace trelm {

// A 128-bit identifier. Default-constructed it is the null GUID (all zero bytes).
// Ordered and compared byte by byte. Thread safety: a plain value; generate() may be called from
// any thread.
class TRELM_API GUID {
public:
    using Bytes = std::array<unsigned char, 16>;

    GUID() noexcept = default;
    explicit GUID(Bytes const& bytes) noexcept : bytes_(bytes) {}

    // A new GUID in the version 4 (random) layout, distinct from every other this process makes.
    // The randomness comes from libuuid, one draw per block of identifiers per thread; the
    // identifiers are unique, not unpredictable (one can be guessed from its neighbours).
    static GUID generate();
    // Parses the 8-4-4-4-12 hexadecimal form (either case). Anything else gives kInvalid and
    // leaves `out` untouched.
    static uError fromString(String const& text, GUID& out);

    // Lowercase 8-4-4-4-12 form, e.g. "0f1e2d3c-4b5a-4978-8695-a4b3c2d1e0f9".
    String toString() const;
    bool isNull() const noexcept;
    Bytes const& bytes() const noexcept { return bytes_; }

    friend bool operator==(GUID const& a, GUID const& b) noexcept { return a.bytes_ == b.bytes_; }
    friend bool operator!=(GUID const& a, GUID const& b) noexcept { return a.bytes_ != b.bytes_; }
    // The bytes' lexicographic order, compared as two big-endian words inline (the mapping
    // cache's searches are mostly these comparisons).
    friend bool operator<(GUID const& a, GUID const& b) noexcept {
        std::uint64_t const aHigh = a.word(0);
        std::uint64_t const bHigh = b.word(0);
        return aHigh != bHigh ? aHigh < bHigh : a.word(8) < b.word(8);
    }

private:
    // The bytes [at, at + 8) as a number whose order is theirs.
    std::uint64_t word(std::size_t at) const noexcept {
        std::uint64_t w;
        std::memcpy(&w, bytes_.data() + at, sizeof w);
        if constexpr (std::endian::native == std::endian::little) w = __builtin_bswap64(w);
        return w;
    }

    Bytes bytes_{};
};

TRELM_API std::ostream& operator<<(std::ostream& os, GUID const& g);

}  // namespace trelm

template <>
struct std::hash<trelm::GUID> {
    std::size_t operator()(trelm::GUID const& g) const noexcept {
        std::size_t a = 0;
        std::size_t b = 0;
        std::memcpy(&a, g.bytes().data(), sizeof a);
        std::memcpy(&b, g.bytes().data() + 8, sizeof b);
        return a ^ (b * 0x9e3779b97f4a7c15ull);
    }
};
