#include "RecordDump.h"

#include <cstdio>

#include "trelm/GUID.h"
#include "trelm/Metadata.h"

namespace trelm {

namespace {

constexpr int kKeyColumn = 30;

String renderValue(String const& key, Variant const& value) {
    TRELM_TYPES::TYPES type = TRELM_TYPES::NONE;
    if (Metadata::getType(key, type).failed()) return value.toString();
    switch (type) {
        case TRELM_TYPES::GUID_TYPE:
            return value.asGUID().toString();
        case TRELM_TYPES::STRING:
            return value.asString();
        case TRELM_TYPES::UINT32:
            return String::from(value.asUInt32());
        case TRELM_TYPES::INT32:
            return String::from(value.asInt32());
        case TRELM_TYPES::INT64:
            return String::from(value.asInt64());
        default:
            return value.toString();
    }
}

}  // namespace

void sprintTags(String& out, Map<String, Variant> const& record) {
    for (auto const& [key, value] : record) {
        out += key;
        out += ":";
        // A negative width pads on the left, so an overlong key still gets (length - 30) spaces;
        // the buffer caps the padding at 30.
        char padding[kKeyColumn + 1];
        std::snprintf(padding, sizeof padding, "%*s", kKeyColumn - static_cast<int>(key.size()), "");
        out += padding;
        out += renderValue(key, value);
        out += "\n";
    }
}

void sprintTags(String& out, SmartPtr<Map<String, Variant>> const& record) {
    if (record) sprintTags(out, *record);
}

void printTags(Map<String, Variant> record) {
    String text;
    sprintTags(text, record);
    std::printf("%s", text.cStr());
}

void printTags(SmartPtr<Map<String, Variant>> const& record) {
    String text;
    sprintTags(text, record);
    std::printf("%s", text.cStr());
}

}  // namespace trelm
