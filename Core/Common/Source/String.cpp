#include "trelm/String.h"

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

String& String::erase(unsigned pos, unsigned n) {
    if (pos < s_.size()) s_.erase(pos, n == npos ? std::string::npos : n);
    return *this;
}

unsigned String::find(char c, unsigned pos) const noexcept {
    auto at = s_.find(c, pos);
    return at == std::string::npos ? npos : static_cast<unsigned>(at);
}

unsigned String::find(String const& text, unsigned pos) const noexcept {
    auto at = s_.find(text.s_, pos);
    return at == std::string::npos ? npos : static_cast<unsigned>(at);
}

String String::substr(unsigned pos, unsigned n) const {
    if (pos >= s_.size()) return String();
    return String(s_.substr(pos, n == npos ? std::string::npos : n));
}

String String::from(int value) { return String(std::to_string(value)); }
String String::from(long value) { return String(std::to_string(value)); }
String String::from(long long value) { return String(std::to_string(value)); }
String String::from(unsigned value) { return String(std::to_string(value)); }
String String::from(unsigned long value) { return String(std::to_string(value)); }
String String::from(unsigned long long value) { return String(std::to_string(value)); }

uError String::to(int& out) const { return parseDecimal(s_, out); }
uError String::to(unsigned& out) const { return parseDecimal(s_, out); }
uError String::to(long long& out) const { return parseDecimal(s_, out); }

std::ostream& operator<<(std::ostream& os, String const& s) { return os << s.str(); }

}  // namespace trelm
