#include "trelm/FqlParseObj.h"

namespace trelm {

FqlParseObj::FqlParseObj(String root, String rowElement, unsigned skip)
    : ListHashParseObj(std::move(root), std::move(rowElement), skip) {}

FqlParseObj::~FqlParseObj() = default;

uError FqlParseObj::parse(String const& xml, Vector<Map<String, String>>& rows, unsigned& count) {
    return parseRows(xml, rows, count);
}

}  // namespace trelm
