#include "JsonAnswerWriter.h"

#include "Utf8Text.h"

namespace emu {

JsonAnswerWriter::JsonAnswerWriter(std::size_t sizeHint) { out_.reserve(sizeHint); }

void JsonAnswerWriter::member(std::string_view name) {
    if (frames_.empty()) return;
    Frame& frame = frames_.back();
    if (!frame.empty) out_ += ',';
    frame.empty = false;
    if (frame.list) return;
    out_ += '"';
    Utf8Text::appendJson(out_, name);
    out_ += "\":";
}

void JsonAnswerWriter::open(std::string_view name, bool list) {
    member(name);
    out_ += list ? '[' : '{';
    frames_.push_back(Frame{list, true});
}

void JsonAnswerWriter::close() {
    out_ += frames_.back().list ? ']' : '}';
    frames_.pop_back();
}

void JsonAnswerWriter::leaf(std::string_view name, std::string_view text) {
    member(name);
    out_ += '"';
    Utf8Text::appendJson(out_, text);
    out_ += '"';
}

void JsonAnswerWriter::number(std::string_view name, std::int64_t value) {
    member(name);
    out_ += std::to_string(value);
}

void JsonAnswerWriter::nil(std::string_view name) {
    member(name);
    out_ += "null";
}

}  // namespace emu
