#include "trelm/Variant.h"

#include <climits>
#include <ostream>

namespace trelm {

namespace {

// The held integer, whatever its width; false when the Variant holds no integer.
template <class V>
bool heldInteger(V const& v, long long& out) {
    if (auto p = std::get_if<std::int32_t>(&v)) {
        out = *p;
    } else if (auto p = std::get_if<std::int64_t>(&v)) {
        out = *p;
    } else if (auto p = std::get_if<std::uint32_t>(&v)) {
        out = *p;
    } else {
        return false;
    }
    return true;
}

}  // namespace

uError Variant::as(int& out) const {
    long long value = 0;
    if (heldInteger(v_, value)) {
        if (value < INT_MIN || value > INT_MAX) return TRELM_ERROR(kInvalid);
        out = static_cast<int>(value);
        return TRELM_OK();
    }
    if (auto s = std::get_if<trelm::String>(&v_)) {
        if (s->to(out).ok()) return TRELM_OK();
    }
    return TRELM_ERROR(kInvalid);
}

uError Variant::as(long long& out) const {
    if (heldInteger(v_, out)) return TRELM_OK();
    if (auto s = std::get_if<trelm::String>(&v_)) {
        if (s->to(out).ok()) return TRELM_OK();
    }
    return TRELM_ERROR(kInvalid);
}

uError Variant::as(unsigned& out) const {
    long long value = 0;
    if (heldInteger(v_, value)) {
        if (value < 0 || value > static_cast<long long>(UINT_MAX)) return TRELM_ERROR(kInvalid);
        out = static_cast<unsigned>(value);
        return TRELM_OK();
    }
    if (auto s = std::get_if<trelm::String>(&v_)) {
        if (s->to(out).ok()) return TRELM_OK();
    }
    return TRELM_ERROR(kInvalid);
}

uError Variant::as(bool& out) const {
    if (auto b = std::get_if<bool>(&v_)) {
        out = *b;
        return TRELM_OK();
    }
    long long value = 0;
    if (heldInteger(v_, value)) {
        if (value != 0 && value != 1) return TRELM_ERROR(kInvalid);
        out = value == 1;
        return TRELM_OK();
    }
    if (auto s = std::get_if<trelm::String>(&v_)) {
        if (*s == "true" || *s == "1") {
            out = true;
            return TRELM_OK();
        }
        if (*s == "false" || *s == "0") {
            out = false;
            return TRELM_OK();
        }
    }
    return TRELM_ERROR(kInvalid);
}

uError Variant::as(GUID& out) const {
    if (auto g = std::get_if<GUID>(&v_)) {
        out = *g;
        return TRELM_OK();
    }
    if (auto s = std::get_if<trelm::String>(&v_)) {
        if (GUID::fromString(*s, out).ok()) return TRELM_OK();
    }
    return TRELM_ERROR(kInvalid);
}

uError Variant::as(trelm::String& out) const {
    long long value = 0;
    if (auto s = std::get_if<trelm::String>(&v_)) {
        out = *s;
    } else if (auto b = std::get_if<bool>(&v_)) {
        out = *b ? "true" : "false";
    } else if (auto g = std::get_if<GUID>(&v_)) {
        out = g->toString();
    } else if (heldInteger(v_, value)) {
        out = trelm::String::from(value);
    } else {
        return TRELM_ERROR(kInvalid);
    }
    return TRELM_OK();
}

uError Variant::as(Vector<int>& out) const {
    if (auto list = std::get_if<Vector<int>>(&v_)) {
        out = *list;
        return TRELM_OK();
    }
    int single = 0;
    long long value = 0;
    if (heldInteger(v_, value)) {
        if (value < INT_MIN || value > INT_MAX) return TRELM_ERROR(kInvalid);
        Vector<int> result;
        TRELM_RETURN_IF_ERROR(result.pushBack(static_cast<int>(value)));
        out = std::move(result);
        return TRELM_OK();
    }
    if (auto texts = std::get_if<Vector<trelm::String>>(&v_)) {
        Vector<int> result;
        TRELM_RETURN_IF_ERROR(result.reserve(texts->size()));
        for (auto const& text : *texts) {
            if (text.to(single).failed()) return TRELM_ERROR(kInvalid);
            TRELM_RETURN_IF_ERROR(result.pushBack(single));
        }
        out = std::move(result);
        return TRELM_OK();
    }
    return TRELM_ERROR(kInvalid);
}

uError Variant::as(Vector<trelm::String>& out) const {
    if (auto list = std::get_if<Vector<trelm::String>>(&v_)) {
        out = *list;
        return TRELM_OK();
    }
    if (auto numbers = std::get_if<Vector<int>>(&v_)) {
        Vector<trelm::String> result;
        TRELM_RETURN_IF_ERROR(result.reserve(numbers->size()));
        for (int n : *numbers) TRELM_RETURN_IF_ERROR(result.pushBack(trelm::String::from(n)));
        out = std::move(result);
        return TRELM_OK();
    }
    return TRELM_ERROR(kInvalid);
}

GUID Variant::asGUID() const {
    GUID g;
    as(g).ignore();  // a value that does not convert reads as the default
    return g;
}

int Variant::asInt32() const {
    int n = 0;
    as(n).ignore();  // a value that does not convert reads as the default
    return n;
}

long long Variant::asInt64() const {
    long long n = 0;
    as(n).ignore();  // a value that does not convert reads as the default
    return n;
}

unsigned Variant::asUInt32() const {
    unsigned n = 0;
    as(n).ignore();  // a value that does not convert reads as the default
    return n;
}

trelm::String Variant::asString() const {
    trelm::String s;
    as(s).ignore();  // a value that does not convert reads as the default
    return s;
}

trelm::String Variant::toString() const {
    trelm::String text;
    if (as(text).ok()) return text;
    Vector<trelm::String> items;
    if (as(items).ok()) {
        text = "[";
        bool first = true;
        for (auto const& item : items) {
            if (!first) text += ", ";
            text += item;
            first = false;
        }
        text += "]";
    }
    return text;
}

std::ostream& operator<<(std::ostream& os, Variant const& v) {
    static char const* const names[] = {"empty",   "bool",  "string", "guid",  "intlist",
                                        "strlist", "int32", "int64",  "uint32"};
    return os << names[v.type()] << "(" << v.toString() << ")";
}

}  // namespace trelm
