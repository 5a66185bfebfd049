// Checks the fuzz targets share: an emulator answer must be a well-formed XML document or a valid
// JSON value, whatever the input was.
#pragma once

#include <expat.h>
#include <nlohmann/json.hpp>

#include <cstdio>
#include <cstdlib>
#include <string>

namespace fuzz {

// Stops the run (a finding) when `document` is not well-formed XML.
inline void requireXml(std::string const& document) {
    XML_Parser p = XML_ParserCreate(nullptr);
    bool const ok = XML_Parse(p, document.data(), static_cast<int>(document.size()), 1) == XML_STATUS_OK;
    if (!ok) {
        std::fprintf(stderr, "not well-formed (%s at %lu): %s\n", XML_ErrorString(XML_GetErrorCode(p)),
                     static_cast<unsigned long>(XML_GetCurrentByteIndex(p)), document.c_str());
        std::abort();
    }
    XML_ParserFree(p);
}

// Stops the run when `value` is not valid JSON.
inline void requireJson(std::string const& value) {
    if (!nlohmann::json::accept(value)) {
        std::fprintf(stderr, "not valid JSON: %s\n", value.c_str());
        std::abort();
    }
}

}  // namespace fuzz
