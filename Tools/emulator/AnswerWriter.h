// Writes an answer document element by element, in the format the client asked for.
#pragma once

#include <cstdint>
#include <string_view>

#include "XmlNode.h"

namespace emu {

// The calls describe the answer as the XML document has it: elements with a name, list elements
// (list="true") whose children repeat, leaves with text, nil leaves. Each writer turns them into
// its own format; the first element written is the document's root.
//
// REQUIRES: open and close pair up; nothing is written after the root is closed. Not thread
// safe: one writer per answer.
class AnswerWriter {
public:
    virtual ~AnswerWriter() = default;

    // Opens an element whose children follow; `list` marks one whose children repeat.
    virtual void open(std::string_view name, bool list) = 0;
    virtual void close() = 0;
    // A leaf element with `text` (empty: an empty element).
    virtual void leaf(std::string_view name, std::string_view text) = 0;
    // A leaf holding a number (a JSON writer writes it bare).
    virtual void number(std::string_view name, std::int64_t value);
    // A hidden value: xsi:nil="true".
    virtual void nil(std::string_view name) = 0;

    // Writes `node` and everything under it: a nil node as nil, a node without children that is
    // not a list as a leaf, any other as an element with its children (its text, which such a node
    // does not have, is left out).
    void write(XmlNode const& node);
};

}  // namespace emu
