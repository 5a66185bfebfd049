#include "XmlNode.h"

#include "XmlAnswerWriter.h"

namespace emu {
namespace {

// About the size of `node` rendered (before escaping), to size the output once.
std::size_t renderedSizeHint(XmlNode const& node) {
    std::size_t size = 2 * node.name.size() + node.text.size() + 24;
    for (XmlNode const& c : node.children) size += renderedSizeHint(c);
    return size;
}

}  // namespace

std::string renderDocument(XmlNode const& root) {
    XmlAnswerWriter writer(renderedSizeHint(root));
    writer.write(root);
    return writer.take();
}

}  // namespace emu
