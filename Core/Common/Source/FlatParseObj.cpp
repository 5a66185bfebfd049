#include "trelm/FlatParseObj.h"

namespace trelm {

FlatParseObj::FlatParseObj(String root) : root_(std::move(root)) {}

FlatParseObj::~FlatParseObj() = default;

uError FlatParseObj::parse(String const& xml, String& out) {
    text_ = String();
    TRELM_RETURN_IF_ERROR(runParser(xml));
    out = text_;
    return TRELM_OK();
}

uError FlatParseObj::start(String const& name, Vector<String> const&) {
    if (depth() == 1 && name != root_) {
        return TRELM_ERROR_MSG(kFailure, "unexpected root element <" + name + ">, expected <" + root_ + ">");
    }
    return TRELM_OK();
}

uError FlatParseObj::chars(String const& text) {
    if (depth() == 1) text_ += text;
    return TRELM_OK();
}

}  // namespace trelm
