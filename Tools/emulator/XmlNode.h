// An answer document of the emulated service, built as a tree and rendered as the service did.
#pragma once

#include <string>
#include <string_view>
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

// Escapes &, <, >, " and ' for element text and attribute values. Runs of plain text are copied
// whole: most answer text has nothing to escape.
inline void appendEscaped(std::string& out, std::string_view text) {
    std::size_t start = 0;
    while (start < text.size()) {
        const std::size_t special = text.find_first_of("&<>\"'", start);
        if (special == std::string_view::npos) {
            out.append(text.data() + start, text.size() - start);
            return;
        }
        out.append(text.data() + start, special - start);
        switch (text[special]) {
            case '&': out += "&amp;"; break;
            case '<': out += "&lt;"; break;
            case '>': out += "&gt;"; break;
            case '"': out += "&quot;"; break;
            default: out += "&apos;"; break;
        }
        start = special + 1;
    }
}

// About the size of `node` rendered (before escaping), to size the output once.
inline std::size_t renderedSizeHint(const XmlNode& node) {
    std::size_t size = 2 * node.name.size() + node.text.size() + 24;
    for (const XmlNode& c : node.children) size += renderedSizeHint(c);
    return size;
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
    std::string out;
    out.reserve(renderedSizeHint(root) + 160);
    out += "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n";
    renderNode(out, root, true);
    out += '\n';
    return out;
}

}  // namespace emu
