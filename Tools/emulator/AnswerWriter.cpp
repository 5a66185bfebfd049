#include "AnswerWriter.h"

#include <string>

namespace emu {

void AnswerWriter::number(std::string_view name, std::int64_t value) { leaf(name, std::to_string(value)); }

void AnswerWriter::write(XmlNode const& node) {
    if (node.nil) {
        nil(node.name);
    } else if (node.children.empty() && !node.list) {
        leaf(node.name, node.text);
    } else {
        open(node.name, node.list);
        for (XmlNode const& child : node.children) write(child);
        close();
    }
}

}  // namespace emu
