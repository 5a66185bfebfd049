#include "trelm/Configuration.h"

namespace trelm {
namespace Configuration {

Variant Group::get(String const& key) const {
    Variant const* value = values_.search(key);
    return value ? *value : Variant();
}

uError Group::get(String const& key, bool& out, bool def) const {
    Variant const* value = values_.search(key);
    if (value == nullptr) {
        out = def;
        return TRELM_OK();
    }
    bool converted = false;
    uError e = value->as(converted);
    if (e.failed()) return TRELM_WRAP(kInvalid, e);
    out = converted;
    return TRELM_OK();
}

uError Group::get(String const& key, Vector<String>& out, Vector<String> const& def) const {
    Variant const* value = values_.search(key);
    if (value == nullptr) {
        out = def;
        return TRELM_OK();
    }
    if (value->type() == Variant::String) {
        Vector<String> single;
        TRELM_RETURN_IF_ERROR(single.pushBack(value->asString()));
        out = std::move(single);
        return TRELM_OK();
    }
    Vector<String> converted;
    uError e = value->as(converted);
    if (e.failed()) return TRELM_WRAP(kInvalid, e);
    out = std::move(converted);
    return TRELM_OK();
}

uError Group::set(String const& key, Variant const& value) { return values_.insert(key, value); }

}  // namespace Configuration
}  // namespace trelm
