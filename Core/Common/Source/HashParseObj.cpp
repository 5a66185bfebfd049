#include "trelm/HashParseObj.h"

namespace trelm {

HashParseObj::HashParseObj(String root) : root_(std::move(root)) {}

HashParseObj::~HashParseObj() = default;

uError HashParseObj::parse(String const& xml, Map<String, String>& out) {
    values_.clear();
    text_ = String();
    leafOpen_ = false;
    TRELM_RETURN_IF_ERROR(runParser(xml));
    for (auto const& [key, value] : values_) {
        TRELM_RETURN_IF_ERROR(out.insert(key, value));
    }
    values_.clear();
    return TRELM_OK();
}

uError HashParseObj::start(String const& name, Vector<String> const& attributes) {
    if (depth() == 1 && name != root_) {
        return TRELM_ERROR_MSG(kFailure, "unexpected root element <" + name + ">, expected <" + root_ + ">");
    }
    text_ = String();
    leafOpen_ = true;
    nil_ = XMLParser::isNil(attributes);
    return TRELM_OK();
}

uError HashParseObj::end(String const& name) {
    bool leaf = leafOpen_;
    leafOpen_ = false;
    // depth() is already the parent's: 1 means a child of the root just closed.
    if (depth() != 1) return TRELM_OK();
    if (leaf && nil_) return TRELM_OK();
    return values_.insert(name, leaf ? text_ : String());
}

uError HashParseObj::chars(String const& text) {
    if (leafOpen_) text_ += text;
    return TRELM_OK();
}

}  // namespace trelm
