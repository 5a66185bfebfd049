#include "trelm/ListHashParseObj.h"

namespace trelm {

ListHashParseObj::ListHashParseObj(String root) : ListHashParseObj(std::move(root), String(), 0) {}

ListHashParseObj::ListHashParseObj(String root, String rowElement, unsigned skip)
    : root_(std::move(root)), rowElement_(std::move(rowElement)), skip_(skip) {}

ListHashParseObj::~ListHashParseObj() = default;

uError ListHashParseObj::parse(String const& xml, Vector<Map<String, String>>& rows) {
    unsigned count = 0;
    return parseRows(xml, rows, count);
}

uError ListHashParseObj::parseRows(String const& xml, Vector<Map<String, String>>& rows, unsigned& count) {
    rows_ = &rows;
    count_ = 0;
    inRow_ = false;
    nilDepth_ = 0;
    leafOpen_ = false;
    row_.clear();
    uError e = runParser(xml);
    rows_ = nullptr;
    row_.clear();
    count = count_;
    return e;
}

uError ListHashParseObj::start(String const& name, Vector<String> const& attributes) {
    unsigned const d = depth();
    if (d == 1) {
        if (name != root_) {
            return TRELM_ERROR_MSG(kFailure, "unexpected root element <" + name + ">, expected <" + root_ + ">");
        }
        return TRELM_OK();
    }
    if (d == 2) {
        inRow_ = rowElement_.empty() || name == rowElement_;
        if (inRow_) {
            row_.clear();
            rowPathSize_ = path().size();
        }
        leafOpen_ = false;
        return TRELM_OK();
    }
    if (!inRow_ || nilDepth_ != 0) return TRELM_OK();
    if (XMLParser::isNil(attributes)) {
        nilDepth_ = d;
        leafOpen_ = false;
        return TRELM_OK();
    }
    text_.assign("", 0);
    leafOpen_ = true;
    return TRELM_OK();
}

uError ListHashParseObj::end(String const& name) {
    unsigned const d = depth() + 1;  // depth of the element that closed
    bool const leaf = leafOpen_;
    leafOpen_ = false;
    if (!inRow_ || d < 2) return TRELM_OK();
    if (d == 2) {
        inRow_ = false;
        ++count_;
        if (count_ <= skip_) return TRELM_OK();
        return rows_->pushBack(std::move(row_));
    }
    if (nilDepth_ != 0) {
        if (d == nilDepth_) nilDepth_ = 0;
        return TRELM_OK();
    }
    if (!leaf) return TRELM_OK();
    // path() is the parent's path; the field is named relative to the record element. The
    // first of a repeated name is kept; text_ is started afresh by the next leaf.
    if (path().size() <= rowPathSize_) return row_.insertIfAbsent(name, std::move(text_));
    return row_.insertIfAbsent(path().substr(rowPathSize_ + 1) + "." + name, std::move(text_));
}

uError ListHashParseObj::chars(String const& text) {
    if (leafOpen_) text_ += text;
    return TRELM_OK();
}

}  // namespace trelm
