#pragma once

#include <atomic>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <functional>
#include <iosfwd>
#include <string>
#include <string_view>
#include <utility>

#include "trelm/Export.h"
#include "trelm/uError.h"

namespace trelm {

// A byte string (no encoding is assumed). Sizes and positions are `unsigned`; `npos` (all ones)
// means "not found" or "to the end".
//
// Comparison is byte-wise on unsigned bytes; a proper prefix sorts before the longer string.
//
// Storage: text of up to kInlineSize bytes is kept in the object itself. Longer text lives in a
// heap block (a reference count and a std::string) that copies of the String share, so copying a
// long String allocates nothing. A shared block's text never changes: a String that changes its
// text while it shares the block first takes a copy of its own; a String that holds its block
// alone changes it in place and keeps its allocation. Each String owns one reference to its
// block; the last String to let go of a block frees it.
//
// Thread safety: const use of one String from several threads is safe, and so is any use of
// different Strings from different threads, copies of one another included (the count is
// atomic, a shared text is never written). A String being changed must not be used by another
// thread at the same time, as for any object.
//
// `str()`, `cStr()` and `view()` stay valid until this String is changed or destroyed.
class TRELM_API String {
public:
    static constexpr unsigned npos = ~0u;
    // The longest text kept in the object: what std::string holds without allocating.
    static constexpr unsigned kInlineSize = 15;

    String() noexcept = default;
    // NOLINTNEXTLINE(google-explicit-constructor): implicit by design
    String(char const* text) : String(text ? std::string_view(text) : std::string_view()) {}
    String(char const* text, unsigned length) : String(std::string_view(text, length)) {}
    String(std::string const& text) : String(std::string_view(text)) {}  // NOLINT
    // Takes over the buffer of a long text: its block is the only new allocation.
    String(std::string&& text);  // NOLINT
    explicit String(std::string_view text) {
        if (text.size() <= kInlineSize) {
            inline_.assign(text.data(), text.size());
        } else {
            block_ = new Block(std::string(text));
        }
    }

    String(String const& other) : block_(other.block_), inline_(other.inline_) {
        if (block_ != nullptr) block_->refs.fetch_add(1, std::memory_order_relaxed);
    }
    // Leaves `other` empty.
    String(String&& other) noexcept : block_(other.block_), inline_(std::move(other.inline_)) {
        other.block_ = nullptr;
        other.inline_.clear();
    }
    String& operator=(String const& other) {
        // Counted before the old block is let go: self-assignment and a shared block stay alive.
        if (other.block_ != nullptr) other.block_->refs.fetch_add(1, std::memory_order_relaxed);
        Block* old = block_;
        block_ = other.block_;
        inline_ = other.inline_;
        release(old);
        return *this;
    }
    // Leaves `other` empty (unless it is this String).
    String& operator=(String&& other) noexcept {
        if (this == &other) return *this;
        Block* old = block_;
        block_ = other.block_;
        other.block_ = nullptr;
        inline_ = std::move(other.inline_);
        other.inline_.clear();
        release(old);
        return *this;
    }
    ~String() { release(block_); }

    char const* cStr() const noexcept { return text().c_str(); }
    std::string const& str() const noexcept { return text(); }
    std::string_view view() const noexcept { return text(); }
    bool empty() const noexcept { return text().empty(); }
    unsigned size() const noexcept { return static_cast<unsigned>(text().size()); }
    // REQUIRES: i < size().
    char operator[](unsigned i) const { return text()[i]; }

    // Replaces the bytes with `length` bytes from `text`, keeping the allocation when they fit
    // and this String holds it alone. `text` may point into this String.
    String& assign(char const* text, unsigned length) {
        if (std::string* t = inPlace(length)) {
            t->assign(text, length);
            return *this;
        }
        return replaceWith(std::string(text, length));
    }

    // Removes up to n bytes from pos; a pos past the end removes nothing.
    String& erase(unsigned pos, unsigned n = npos) {
        if (pos >= size()) return *this;
        if (std::string* t = inPlace(size())) {
            t->erase(pos, n == npos ? std::string::npos : n);
            return *this;
        }
        return eraseShared(pos, n);
    }
    // First position >= pos of c / of text, or npos. An empty text is found at pos (if pos <= size).
    unsigned find(char c, unsigned pos = 0) const noexcept;
    unsigned find(String const& text, unsigned pos = 0) const noexcept;
    // Up to n bytes from pos; a pos past the end gives the empty string.
    String substr(unsigned pos, unsigned n = npos) const;

    String& operator+=(String const& other) { return append(other.view()); }
    String& operator+=(char const* other) { return other ? append(std::string_view(other)) : *this; }
    String& operator+=(char c) { return append(std::string_view(&c, 1)); }

    friend String operator+(String const& a, String const& b) { return concat(a.view(), b.view()); }
    friend String operator+(String const& a, char const* b) {
        return concat(a.view(), b ? std::string_view(b) : std::string_view());
    }
    friend String operator+(char const* a, String const& b) {
        return concat(a ? std::string_view(a) : std::string_view(), b.view());
    }
    friend String operator+(String const& a, char b) { return concat(a.view(), std::string_view(&b, 1)); }

    friend bool operator==(String const& a, String const& b) noexcept {
        return (a.block_ != nullptr && a.block_ == b.block_) || equalBytes(a.view(), b.view());
    }
    friend bool operator!=(String const& a, String const& b) noexcept { return !(a == b); }
    friend bool operator<(String const& a, String const& b) noexcept {
        return !(a.block_ != nullptr && a.block_ == b.block_) && lessBytes(a.view(), b.view());
    }
    friend bool operator==(String const& a, char const* b) noexcept {
        return equalBytes(a.view(), b ? std::string_view(b) : std::string_view());
    }
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
    // A long text and the number of Strings holding it. `text` is written only while refs is 1.
    struct Block {
        explicit Block(std::string&& t) noexcept : text(std::move(t)) {}
        std::atomic<std::size_t> refs{1};
        std::string text;
    };

    std::string const& text() const noexcept { return block_ != nullptr ? block_->text : inline_; }
    // The text to change in place into one of `size` bytes, or null when the change needs a new
    // allocation: the inline text while the bytes fit in it, the block's text while this String
    // holds it alone.
    std::string* inPlace(std::size_t size) noexcept {
        if (block_ == nullptr) return size <= kInlineSize ? &inline_ : nullptr;
        // Acquire: a copy released in another thread has finished reading the text.
        return block_->refs.load(std::memory_order_acquire) == 1 ? &block_->text : nullptr;
    }
    static void release(Block* block) noexcept {
        if (block != nullptr && block->refs.fetch_sub(1, std::memory_order_acq_rel) == 1) delete block;
    }

    // Byte-wise order of n bytes at a and b, as unsigned bytes: negative, 0 or positive. Eight bytes
    // at a time and without a call: the texts compared most are map keys a few dozen bytes long.
    static int compareBytes(char const* a, char const* b, std::size_t n) noexcept {
        for (; n >= 8; a += 8, b += 8, n -= 8) {
            std::uint64_t x;
            std::uint64_t y;
            std::memcpy(&x, a, 8);
            std::memcpy(&y, b, 8);
            if (x != y) {
                // The first differing byte decides: make it the most significant one.
                if constexpr (std::endian::native == std::endian::little) {
                    x = __builtin_bswap64(x);
                    y = __builtin_bswap64(y);
                }
                return x < y ? -1 : 1;
            }
        }
        for (; n > 0; ++a, ++b, --n) {
            if (*a != *b) return static_cast<unsigned char>(*a) < static_cast<unsigned char>(*b) ? -1 : 1;
        }
        return 0;
    }
    static bool equalBytes(std::string_view a, std::string_view b) noexcept {
        return a.size() == b.size() && compareBytes(a.data(), b.data(), a.size()) == 0;
    }
    static bool lessBytes(std::string_view a, std::string_view b) noexcept {
        int const order = compareBytes(a.data(), b.data(), a.size() < b.size() ? a.size() : b.size());
        return order != 0 ? order < 0 : a.size() < b.size();
    }

    String& append(std::string_view piece) {
        if (std::string* t = inPlace(text().size() + piece.size())) {
            t->append(piece.data(), piece.size());
            return *this;
        }
        return appendShared(piece);
    }
    // The changes that need a new allocation. `piece` may lie in this String's text.
    String& appendShared(std::string_view piece);
    String& eraseShared(unsigned pos, unsigned n);
    String& replaceWith(std::string&& text);
    static String concat(std::string_view a, std::string_view b);

    // Invariant: block_ is null, or inline_ is empty. Without a block the text is inline_, of at
    // most kInlineSize bytes; with one, it is block_->text (of any size: a block held alone keeps
    // its allocation when its text shrinks).
    Block* block_ = nullptr;
    std::string inline_;
};

TRELM_API std::ostream& operator<<(std::ostream& os, String const& s);

}  // namespace trelm

template <>
struct std::hash<trelm::String> {
    std::size_t operator()(trelm::String const& s) const noexcept { return std::hash<std::string_view>()(s.view()); }
};
