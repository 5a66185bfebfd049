#include "TerminalText.h"

namespace trelm {
namespace host {

namespace {

// The length of the well-formed UTF-8 character at the start of `text` (no overlong forms, no
// surrogates, nothing above U+10FFFF), or 0.
std::size_t utf8Length(std::string_view text) {
    auto const at = [&](std::size_t i) { return static_cast<unsigned char>(text[i]); };
    unsigned char const lead = at(0);
    std::size_t length = 0;
    unsigned char low = 0x80, high = 0xbf;  // the range of the second byte
    if (lead >= 0xc2 && lead <= 0xdf) {
        length = 2;
    } else if (lead >= 0xe0 && lead <= 0xef) {
        length = 3;
        if (lead == 0xe0) low = 0xa0;
        if (lead == 0xed) high = 0x9f;
    } else if (lead >= 0xf0 && lead <= 0xf4) {
        length = 4;
        if (lead == 0xf0) low = 0x90;
        if (lead == 0xf4) high = 0x8f;
    } else {
        return 0;
    }
    if (text.size() < length || at(1) < low || at(1) > high) return 0;
    for (std::size_t i = 2; i < length; ++i) {
        if (at(i) < 0x80 || at(i) > 0xbf) return 0;
    }
    return length;
}

}  // namespace

std::string terminalText(std::string_view text) {
    static char const digits[] = "0123456789abcdef";
    std::string out;
    out.reserve(text.size());
    for (std::size_t i = 0; i < text.size();) {
        auto const byte = static_cast<unsigned char>(text[i]);
        if (byte >= 0x20 && byte < 0x7f) {
            out += static_cast<char>(byte);
            ++i;
            continue;
        }
        std::size_t const length = byte >= 0x80 ? utf8Length(text.substr(i)) : 0;
        // U+0080 to U+009F are the C1 controls (0x9b, say, starts an escape sequence).
        bool const c1 = length == 2 && byte == 0xc2 && static_cast<unsigned char>(text[i + 1]) < 0xa0;
        if (length != 0 && !c1) {
            out.append(text.substr(i, length));
            i += length;
            continue;
        }
        switch (byte) {
            case '\n': out += "\\n"; break;
            case '\r': out += "\\r"; break;
            case '\t': out += "\\t"; break;
            default: out += {'\\', 'x', digits[byte >> 4], digits[byte & 15]};
        }
        ++i;
    }
    return out;
}

}  // namespace host
}  // namespace trelm
