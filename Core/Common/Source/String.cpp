#include "trelm/String.h"

#include <algorithm>
#include <charconv>
#include <ostream>

namespace trelm {

namespace {

template <class T>
uError parseDecimal(std::string const& text, T& out) {
    T value{};
    char const* begin = text.data();
    char const* end = begin + text.size();
    auto [ptr, ec] = std::from_chars(begin, end, value, 10);
    // from_chars accepts no '+', no spaces and (for unsigned targets) no '-'; what it leaves
    // unread is trailing junk.
    if (text.empty() || ec != std::errc() || ptr != end) return TRELM_ERROR(kInvalid);
    out = value;
    return TRELM_OK();
}

}  // namespace

String::String(std::string&& text) {
    if (text.size() <= kInlineSize) {
        inline_.assign(text);
    } else {
        block_ = new Block(std::move(text));
    }
}

String& String::replaceWith(std::string&& text) {
    Block* made = text.size() <= kInlineSize ? nullptr : new Block(std::move(text));
    Block* old = block_;
    block_ = made;
    if (made != nullptr) {
        inline_.clear();
    } else {
        inline_.assign(text);
    }
    release(old);
    return *this;
}

String String::concat(std::string_view a, std::string_view b) {
    String r;
    std::size_t const total = a.size() + b.size();
    if (total <= kInlineSize) {
        r.inline_.append(a).append(b);
    } else {
        std::string joined;
        joined.reserve(total);
        joined.append(a).append(b);
        r.block_ = new Block(std::move(joined));
    }
    return r;
}

String& String::appendShared(std::string_view piece) {
    // The old text stays as it is (another String may hold it, `piece` may lie in it) until the
    // new one is made.
    std::string const& current = text();
    std::string joined;
    joined.reserve(current.size() + piece.size());
    joined.append(current).append(piece);
    return replaceWith(std::move(joined));
}

String& String::eraseShared(unsigned pos, unsigned n) {
    std::string const& current = text();
    std::size_t const count = n == npos ? current.size() - pos : std::min<std::size_t>(n, current.size() - pos);
    std::string rest;
    rest.reserve(current.size() - count);
    rest.append(current, 0, pos).append(current, pos + count, std::string::npos);
    return replaceWith(std::move(rest));
}

unsigned String::find(char c, unsigned pos) const noexcept {
    auto at = view().find(c, pos);
    return at == std::string_view::npos ? npos : static_cast<unsigned>(at);
}

unsigned String::find(String const& text, unsigned pos) const noexcept {
    auto at = view().find(text.view(), pos);
    return at == std::string_view::npos ? npos : static_cast<unsigned>(at);
}

String String::substr(unsigned pos, unsigned n) const {
    std::string_view const all = view();
    if (pos >= all.size()) return String();
    return String(all.substr(pos, n == npos ? std::string_view::npos : n));
}

String String::from(int value) { return String(std::to_string(value)); }
String String::from(long value) { return String(std::to_string(value)); }
String String::from(long long value) { return String(std::to_string(value)); }
String String::from(unsigned value) { return String(std::to_string(value)); }
String String::from(unsigned long value) { return String(std::to_string(value)); }
String String::from(unsigned long long value) { return String(std::to_string(value)); }

uError String::to(int& out) const { return parseDecimal(text(), out); }
uError String::to(unsigned& out) const { return parseDecimal(text(), out); }
uError String::to(long long& out) const { return parseDecimal(text(), out); }

std::ostream& operator<<(std::ostream& os, String const& s) { return os << s.view(); }

}  // namespace trelm
