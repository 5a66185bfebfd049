#include "XmlAnswerWriter.h"

#include "Utf8Text.h"

namespace emu {

XmlAnswerWriter::XmlAnswerWriter(std::size_t sizeHint) {
    out_.reserve(sizeHint + 160);
    out_ += "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n";
}

void XmlAnswerWriter::endPendingTag() {
    if (pending_) {
        out_ += '>';
        pending_ = false;
    }
}

void XmlAnswerWriter::startTag(std::string_view name) {
    endPendingTag();
    out_ += '<';
    out_ += name;
    if (!rootWritten_) {
        out_ += " xmlns=\"http://api.facebook.com/1.0/\" xmlns:xsi=\"http://www.w3.org/2001/XMLSchema-instance\"";
        rootWritten_ = true;
    }
}

void XmlAnswerWriter::open(std::string_view name, bool list) {
    startTag(name);
    if (list) out_ += " list=\"true\"";
    pending_ = true;
    if (depth_ == open_.size()) open_.emplace_back();
    open_[depth_++].assign(name);
}

void XmlAnswerWriter::close() {
    std::string const& name = open_[--depth_];
    if (pending_) {
        out_ += "/>";
        pending_ = false;
    } else {
        out_ += "</";
        out_ += name;
        out_ += '>';
    }
    if (depth_ == 0) out_ += '\n';
}

void XmlAnswerWriter::leaf(std::string_view name, std::string_view text) {
    startTag(name);
    if (text.empty()) {
        out_ += "/>";
    } else {
        out_ += '>';
        Utf8Text::appendXml(out_, text);
        out_ += "</";
        out_ += name;
        out_ += '>';
    }
    if (depth_ == 0) out_ += '\n';
}

void XmlAnswerWriter::nil(std::string_view name) {
    startTag(name);
    out_ += " xsi:nil=\"true\"/>";
    if (depth_ == 0) out_ += '\n';
}

std::string XmlAnswerWriter::take() {
    std::string out = std::move(out_);
    out_.clear();
    depth_ = 0;
    pending_ = false;
    rootWritten_ = false;
    return out;
}

}  // namespace emu
