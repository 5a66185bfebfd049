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

// Escapes &, <, >, " and ' for element text and attribute values.
inline void appendEscaped(std::string& out, const std::string& text) {
    for (char c : text) {
        switch (c) {
            case '&': out += "&amp;"; break;
            case '<': out += "&lt;"; break;
            case '>': out += "&gt;"; break;
            case '"': out += "&quot;"; break;
            case '\'': out += "&apos;"; break;
            default: out += c;
        }
    }
}

inline void renderNode(std::string& out, const XmlNode& node, bool root) {
    out += '<';
    out += node.name;
    if (root)
        out += " xmlns=\"http://api.facebook.com/1.0/\""
               " xmlns:xsi=\"http://www.w3.org/2001/XMLSchema-instance\"";
    if (node.list) out += " list=\"true\"";
    if (node.nil) {
        out += " xsi:nil=\"true\"/>";
        return;
    }
    if (node.children.empty() && node.text.empty()) {
        out += "/>";
        return;
    }
    out += '>';
    for (const XmlNode& c : node.children) renderNode(out, c, false);
    appendEscaped(out, node.text);
    out += "</";
    out += node.name;
    out += '>';
}

// The whole document: XML declaration, then the root with the service's namespaces.
inline std::string renderDocument(const XmlNode& root) {
    std::string out = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n";
    renderNode(out, root, true);
    out += '\n';
    return out;
}

}  // namespace emu
