#include "trelm/uError.h"

#include <cstdio>
#include <ostream>

#include "trelm/String.h"

namespace trelm {

uError::uError(char const* file, int line) noexcept : line_(line), file_(file) {}

uError::uError(unsigned code, char const* message, char const* file, int line)
    : code_(code), line_(line), file_(file), message_(message ? message : "") {}

uError::uError(unsigned code, uError const& cause, char const* message, char const* file, int line)
    : code_(code),
      line_(line),
      file_(file),
      message_(message ? message : ""),
      cause_(std::make_shared<uError const>(cause)) {}

uError::uError(unsigned code, String const& message, char const* file, int line)
    : code_(code), line_(line), file_(file), message_(message.str()) {}

uError::uError(unsigned code, uError const& cause, String const& message, char const* file, int line)
    : code_(code), line_(line), file_(file), message_(message.str()), cause_(std::make_shared<uError const>(cause)) {}

String uError::message() const { return String(message_); }

void uError::format(String& out) const {
    bool first = true;
    for (uError const* level = this; level != nullptr; level = level->cause()) {
        char code[16];
        std::snprintf(code, sizeof code, "0x%08x", level->code_);
        if (!first) out += "\n  caused by ";
        out += code;
        if (level->file_ != nullptr && level->file_[0] != '\0') {
            out += " at ";
            out += level->file_;
            out += ':';
            out += String::from(level->line_);
        }
        if (!level->message_.empty()) {
            out += ": ";
            out += level->message_.c_str();
        }
        first = false;
    }
}

std::string uError::toText() const {
    String text;
    format(text);
    return text.str();
}

std::ostream& operator<<(std::ostream& os, uError const& e) { return os << e.toText(); }

}  // namespace trelm
