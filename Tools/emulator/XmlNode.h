// An answer document of the emulated service, built as a tree and rendered as the service did.
#pragma once

#include <string>
#include <utility>
#include <vector>

namespace emu {

// One element. A list element renders list="true"; a nil element renders xsi:nil="true" and no
// text. Children render in insertion order, then the text (an element has one or the other).
struct XmlNode {
    std::string name;
    std::string text;
    bool list = false;
    bool nil = false;
    std::vector<XmlNode> children;

    XmlNode() = default;
    explicit XmlNode(std::string n, std::string t = {}) : name(std::move(n)), text(std::move(t)) {}

    // Appends a child and returns it. The reference is valid until the next append to this node.
    XmlNode& add(std::string childName, std::string childText = {}) {
        children.emplace_back(std::move(childName), std::move(childText));
        return children.back();
    }
    XmlNode& addList(std::string childName) {
        XmlNode& c = add(std::move(childName));
        c.list = true;
        return c;
    }
    XmlNode& addNil(std::string childName) {
        XmlNode& c = add(std::move(childName));
        c.nil = true;
        return c;
    }
};

// The whole document as the service wrote it (see XmlAnswerWriter).
std::string renderDocument(const XmlNode& root);

}  // namespace emu
