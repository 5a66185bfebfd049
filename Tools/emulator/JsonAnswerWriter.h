// An answer as the JSON value the service gave for format=JSON.
#pragma once

#include <string>
#include <vector>

#include "AnswerWriter.h"

namespace emu {

// The root's name is dropped: the document is the root's value. A list element is an array of
// its children's values (their names dropped); any other element with children is an object keyed
// by the children's names; a leaf is a string, a number leaf a number, a nil leaf null. Texts are
// cleaned by Utf8Text, so the value is valid JSON whatever they hold.
class JsonAnswerWriter final : public AnswerWriter {
public:
    explicit JsonAnswerWriter(std::size_t sizeHint = 0);

    void open(std::string_view name, bool list) override;
    void close() override;
    void leaf(std::string_view name, std::string_view text) override;
    void number(std::string_view name, std::int64_t value) override;
    void nil(std::string_view name) override;

    // The value. REQUIRES: the root is closed.
    std::string take() { return std::move(out_); }

private:
    // Writes the separator and, inside an object, the key of the next value.
    void member(std::string_view name);

    struct Frame {
        bool list;
        bool empty;
    };
    std::string out_;
    std::vector<Frame> frames_;  // the open elements, root first
};

}  // namespace emu
