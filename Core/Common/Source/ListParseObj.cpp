#include "trelm/ListParseObj.h"

namespace trelm {

ListParseObj::ListParseObj(String root) : root_(std::move(root)) {}

ListParseObj::~ListParseObj() = default;

uError ListParseObj::parse(String const& xml, Vector<String>& out) {
    out_ = &out;
    text_ = String();
    leafOpen_ = false;
    uError e = runParser(xml);
    out_ = nullptr;
    return e;
}

uError ListParseObj::start(String const& name, Vector<String> const& attributes) {
    if (depth() == 1 && name != root_) {
        return TRELM_ERROR_MSG(kFailure, "unexpected root element <" + name + ">, expected <" + root_ + ">");
    }
    text_ = String();
    leafOpen_ = true;
    nil_ = XMLParser::isNil(attributes);
    return TRELM_OK();
}

uError ListParseObj::end(String const&) {
    bool leaf = leafOpen_;
    leafOpen_ = false;
    if (depth() != 1) return TRELM_OK();
    if (leaf && nil_) return TRELM_OK();
    return out_->pushBack(leaf ? text_ : String());
}

uError ListParseObj::chars(String const& text) {
    if (leafOpen_) text_ += text;
    return TRELM_OK();
}

}  // namespace trelm
