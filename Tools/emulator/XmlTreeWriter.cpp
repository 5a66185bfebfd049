#include "XmlTreeWriter.h"

#include <string>

namespace emu {

void XmlTreeWriter::open(std::string_view name, bool list) {
    XmlNode& child = path_.back()->add(std::string(name));
    child.list = list;
    path_.push_back(&child);
}

void XmlTreeWriter::leaf(std::string_view name, std::string_view text) {
    path_.back()->add(std::string(name), std::string(text));
}

void XmlTreeWriter::nil(std::string_view name) { path_.back()->addNil(std::string(name)); }

}  // namespace emu
