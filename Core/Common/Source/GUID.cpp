#include "trelm/GUID.h"

#include <uuid/uuid.h>

#include <ostream>

namespace trelm {

GUID GUID::generate() {
    Bytes bytes;
    uuid_generate_random(bytes.data());
    return GUID(bytes);
}

uError GUID::fromString(String const& text, GUID& out) {
    // uuid_parse alone would also accept other lengths on some versions; check the shape first.
    if (text.size() != 36) return TRELM_ERROR(kInvalid);
    for (unsigned i = 0; i < 36; ++i) {
        char c = text[i];
        bool dash = i == 8 || i == 13 || i == 18 || i == 23;
        bool hex = (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f') || (c >= 'A' && c <= 'F');
        if (dash ? c != '-' : !hex) return TRELM_ERROR(kInvalid);
    }
    Bytes bytes;
    if (uuid_parse(text.cStr(), bytes.data()) != 0) return TRELM_ERROR(kInvalid);
    out = GUID(bytes);
    return TRELM_OK();
}

String GUID::toString() const {
    char text[37];
    uuid_unparse_lower(bytes_.data(), text);
    return String(text);
}

bool GUID::isNull() const noexcept {
    for (unsigned char b : bytes_) {
        if (b != 0) return false;
    }
    return true;
}

std::ostream& operator<<(std::ostream& os, GUID const& g) { return os << g.toString().str(); }

}  // namespace trelm
