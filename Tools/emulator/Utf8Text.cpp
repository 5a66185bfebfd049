#include "Utf8Text.h"

#include <array>
#include <cstdint>

namespace emu {
namespace {

constexpr std::string_view kReplacement = "\xEF\xBF\xBD";

// Bytes a plain copy must stop at: controls, XML's and JSON's specials, and every non-ASCII byte.
constexpr std::array<bool, 256> kStop = [] {
    std::array<bool, 256> stop{};
    for (int c = 0; c < 0x20; ++c) stop[c] = true;
    for (int c = 0x80; c < 0x100; ++c) stop[c] = true;
    for (const char c : {'&', '<', '>', '"', '\'', '\\', '\x7f'}) stop[static_cast<unsigned char>(c)] = true;
    return stop;
}();

// The length of the allowed character at `at` (1 to 4), or 0 when the bytes there must be
// replaced. REQUIRES: at < text.size().
std::size_t allowedLength(std::string_view text, std::size_t at) {
    auto const byte = [&](std::size_t i) { return static_cast<unsigned char>(text[i]); };
    unsigned char const b = byte(at);
    if (b < 0x80) return b >= 0x20 || b == '\t' || b == '\n' || b == '\r' ? 1 : 0;
    std::size_t length = 0;
    unsigned char low = 0x80, high = 0xBF;  // the range of the second byte
    if (b >= 0xC2 && b <= 0xDF)
        length = 2;
    else if (b == 0xE0)
        length = 3, low = 0xA0;
    else if (b == 0xED)
        length = 3, high = 0x9F;  // no surrogates
    else if (b >= 0xE1 && b <= 0xEF)
        length = 3;
    else if (b == 0xF0)
        length = 4, low = 0x90;
    else if (b >= 0xF1 && b <= 0xF3)
        length = 4;
    else if (b == 0xF4)
        length = 4, high = 0x8F;
    else
        return 0;
    if (at + length > text.size()) return 0;
    if (byte(at + 1) < low || byte(at + 1) > high) return 0;
    for (std::size_t i = 2; i < length; ++i)
        if (byte(at + i) < 0x80 || byte(at + i) > 0xBF) return 0;
    // U+FFFE and U+FFFF are not characters XML may carry.
    if (b == 0xEF && byte(at + 1) == 0xBF && byte(at + 2) >= 0xBE) return 0;
    return length;
}

// Copies `text` to `out`, calling `special(out, c)` for an allowed ASCII character that is a stop
// byte and writing U+FFFD for whatever must be replaced.
template <typename Special>
void copyClean(std::string& out, std::string_view text, Special special) {
    std::size_t at = 0;
    while (at < text.size()) {
        std::size_t plain = at;
        while (plain < text.size() && !kStop[static_cast<unsigned char>(text[plain])]) ++plain;
        out.append(text.data() + at, plain - at);
        at = plain;
        if (at == text.size()) return;
        const std::size_t length = allowedLength(text, at);
        if (length == 0) {
            out += kReplacement;
            ++at;
        } else if (length == 1) {
            special(out, text[at]);
            ++at;
        } else {
            out.append(text.data() + at, length);
            at += length;
        }
    }
}

}  // namespace

bool Utf8Text::isClean(std::string_view text) {
    for (std::size_t at = 0; at < text.size();) {
        if (!kStop[static_cast<unsigned char>(text[at])]) {
            ++at;
            continue;
        }
        const std::size_t length = allowedLength(text, at);
        if (length == 0) return false;
        at += length;
    }
    return true;
}

std::string Utf8Text::clean(std::string_view text) {
    std::string out;
    out.reserve(text.size());
    copyClean(out, text, [](std::string& o, char c) { o += c; });
    return out;
}

void Utf8Text::appendXml(std::string& out, std::string_view text) {
    copyClean(out, text, [](std::string& o, char c) {
        switch (c) {
            case '&':
                o += "&amp;";
                break;
            case '<':
                o += "&lt;";
                break;
            case '>':
                o += "&gt;";
                break;
            case '"':
                o += "&quot;";
                break;
            case '\'':
                o += "&apos;";
                break;
            default:
                o += c;
                break;
        }
    });
}

void Utf8Text::appendJson(std::string& out, std::string_view text) {
    copyClean(out, text, [](std::string& o, char c) {
        switch (c) {
            case '"':
                o += "\\\"";
                break;
            case '\\':
                o += "\\\\";
                break;
            case '\t':
                o += "\\t";
                break;
            case '\n':
                o += "\\n";
                break;
            case '\r':
                o += "\\r";
                break;
            case '\x7f':
                o += "\\u007f";
                break;
            default:
                o += c;
                break;
        }
    });
}

}  // namespace emu
