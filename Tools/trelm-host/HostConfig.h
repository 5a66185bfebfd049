#pragma once

#include <cstddef>

#include <string>
#include <vector>

#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/Variant.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {
namespace host {

// The host's configuration file, a JSON object:
//   {
//     "http":       { "connect_timeout_ms": 10000, "connect_to": ["h:p:h2:p2"], "ca_file": "..." },
//     "runtime":    { ... },
//     "components": [ { "name": "facebook", "id": "@trelm.example:/facebooksource",
//                       "config": { "key": value, ... },
//                       "runtime_keys": ["key", ...] } ]
//   }
// Every section is optional. "http" and "runtime" configure the built-in components
// "HttpRequestFactory" and "RuntimeConfiguration". Each component is created from the plug-in
// factory of "id" under "name" and configured from "config". Its "runtime_keys" name the values
// it keeps in the runtime-configuration store besides its "config" keys (default: the data
// source's session keys); stored values of these keys win over the file's.
//
// Values may be strings, booleans, integers and lists of strings; anything else is refused with
// the key's place in the file, so that a typing mistake does not silently configure nothing.
//
// A plain value; not guarded.
class HostConfig {
public:
    struct ComponentEntry {
        String name;
        String id;
        Map<String, Variant> config;
        Vector<String> runtimeKeys;
    };

    // The largest configuration file read.
    static constexpr std::size_t kMaxFileBytes = 1024 * 1024;

    // Reads and parses the file. kNotFound when it cannot be read; kInvalid when it is a folder,
    // not a regular file or larger than kMaxFileBytes; otherwise as parse().
    static uError load(std::string const& path, HostConfig& out);
    // Parses `text`; `origin` names it in error messages. kInvalid, with the place and the reason
    // in the message, for malformed JSON, an unknown section, a component without a name or id,
    // two components of one name, or a value of an unsupported kind. `out` is written only on
    // success.
    static uError parse(std::string const& text, std::string const& origin, HostConfig& out);

    Map<String, Variant> const& http() const noexcept { return http_; }
    Map<String, Variant> const& runtime() const noexcept { return runtime_; }
    std::vector<ComponentEntry> const& components() const noexcept { return components_; }

    // True when the file says where the service is ("http" holds "connect_to"); the host then
    // does not start its own emulator unless asked to.
    bool namesEndpoint() const { return http_.contains("connect_to"); }

    // The runtime keys of a component whose entry names none.
    static Vector<String> defaultRuntimeKeys();

private:
    Map<String, Variant> http_;
    Map<String, Variant> runtime_;
    std::vector<ComponentEntry> components_;
};

}  // namespace host
}  // namespace trelm
