#include "trelm/ListHashParseObj.h"

#include <new>
#include <utility>

namespace trelm {

ListHashParseObj::ListHashParseObj(String root) : ListHashParseObj(std::move(root), String(), 0) {}

ListHashParseObj::ListHashParseObj(String root, String rowElement, unsigned skip)
    : root_(std::move(root)), rowElement_(std::move(rowElement)), skip_(skip) {
    useViews();
}

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
    fieldPath_.clear();
    row_.clear();
    uError e = runParser(xml);
    rows_ = nullptr;
    row_.clear();
    count = count_;
    return e;
}

uError ListHashParseObj::startView(std::string_view name, char const* const* attributes) {
    unsigned const d = depth();
    if (d == 1) {
        if (name != root_.view()) {
            return TRELM_ERROR_MSG(kFailure,
                                   "unexpected root element <" + String(name) + ">, expected <" + root_ + ">");
        }
        return TRELM_OK();
    }
    if (d == 2) {
        inRow_ = rowElement_.empty() || name == rowElement_.view();
        if (inRow_) {
            row_.clear();
            fieldPath_.clear();
        }
        leafOpen_ = false;
        return TRELM_OK();
    }
    if (!inRow_ || nilDepth_ != 0) return TRELM_OK();
    if (attributes[0] != nullptr && XMLParser::isNil(attributes)) {
        nilDepth_ = d;
        leafOpen_ = false;
        return TRELM_OK();
    }
    try {
        fieldPath_.append(name);
        fieldPath_ += '.';
    } catch (std::bad_alloc const&) {
        return TRELM_ERROR(kOutOfMemory);
    }
    text_.clear();
    leafOpen_ = true;
    return TRELM_OK();
}

uError ListHashParseObj::endView(std::string_view name) {
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
    // fieldPath_ ends with this element's name and "."; the first of a repeated name is kept, and
    // text_ is started afresh by the next leaf.
    std::size_t const parentSize = fieldPath_.size() - name.size() - 1;
    uError e = TRELM_OK();
    if (leaf) {
        e = row_.insertIfAbsent(String(std::string_view(fieldPath_.data(), fieldPath_.size() - 1)),
                                String(std::move(text_)));
        text_.clear();
    }
    fieldPath_.resize(parentSize);
    return e;
}

uError ListHashParseObj::charsView(std::string_view text) {
    if (leafOpen_) {
        try {
            text_.append(text);
        } catch (std::bad_alloc const&) {
            return TRELM_ERROR(kOutOfMemory);
        }
    }
    return TRELM_OK();
}

}  // namespace trelm
