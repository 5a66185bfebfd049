#pragma once

#include <string>

#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/Variant.h"
#include "trelm/uError.h"

namespace trelm {
namespace host {

// The keys the host knows for each section of its configuration file, with their types and
// ranges: the "http" and "runtime" sections and the configuration of the plug-in's two
// components. A file is checked as it is read, so that a misspelt key, a value of the wrong type
// or a number out of range is refused by name (with the nearest known key for a misspelling)
// instead of being ignored. Components of other plug-ins are not checked.
class ConfigSchema {
public:
    // Checks `values` of the section `section` ("http", "runtime" or a component id). kInvalid
    // naming `origin` (the file), `where` (the section's place in it), the key and what is wrong.
    static uError check(std::string const& section, Map<String, Variant> const& values, std::string const& origin,
                        std::string const& where);

    // The known key nearest to `key` (a misspelling of it), or "" when none is near.
    static std::string nearest(std::string const& section, std::string const& key);
};

}  // namespace host
}  // namespace trelm
