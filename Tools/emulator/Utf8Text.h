// What the service did with text that is not valid UTF-8 or that XML cannot carry.
#pragma once

#include <string>
#include <string_view>

namespace emu {

// The service kept text as UTF-8 and answered it in XML 1.0. A byte that does not start a valid
// UTF-8 sequence, and a character XML 1.0 cannot carry at all (control characters other than tab,
// line feed and carriage return; U+FFFE, U+FFFF), become U+FFFD, one per offending byte or
// character. The same rule serves arguments before a method uses them (so that what is stored is
// what any later answer shows) and every answer text (so that an answer is well-formed whatever
// a request carried).
//
// Stateless; every member may be called from any thread.
class Utf8Text {
public:
    // True when `text` needs no replacement.
    static bool isClean(std::string_view text);
    // `text` with the replacements made.
    static std::string clean(std::string_view text);

    // Appends `text` with the replacements made and &, <, >, " and ' escaped for XML.
    static void appendXml(std::string& out, std::string_view text);
    // Appends `text` with the replacements made, escaped for a JSON string (without the quotes).
    static void appendJson(std::string& out, std::string_view text);
};

}  // namespace emu
