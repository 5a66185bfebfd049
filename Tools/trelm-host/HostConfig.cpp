#include "HostConfig.h"

#include "ConfigSchema.h"

#include <cstdint>
#include <filesystem>
#include <fstream>
#include <limits>
#include <set>
#include <sstream>

#include <nlohmann/json.hpp>

namespace trelm {
namespace host {

namespace {

using nlohmann::json;

uError invalid(std::string const& origin, std::string const& where, std::string const& reason) {
    return TRELM_ERROR_MSG(kInvalid, origin + ": " + where + ": " + reason);
}

uError toVariant(json const& value, std::string const& origin, std::string const& where,
                 Variant& out) {
    switch (value.type()) {
        case json::value_t::string:
            out = String(value.get<std::string>());
            return TRELM_OK();
        case json::value_t::boolean:
            out = value.get<bool>();
            return TRELM_OK();
        case json::value_t::number_integer: {
            auto n = value.get<std::int64_t>();
            if (n >= std::numeric_limits<int>::min() && n <= std::numeric_limits<int>::max()) {
                out = static_cast<int>(n);
            } else {
                out = static_cast<long long>(n);
            }
            return TRELM_OK();
        }
        case json::value_t::number_unsigned: {
            auto n = value.get<std::uint64_t>();
            if (n > static_cast<std::uint64_t>(std::numeric_limits<long long>::max())) {
                return invalid(origin, where, "integer out of range");
            }
            if (n <= static_cast<std::uint64_t>(std::numeric_limits<int>::max())) {
                out = static_cast<int>(n);
            } else {
                out = static_cast<long long>(n);
            }
            return TRELM_OK();
        }
        case json::value_t::array: {
            Vector<String> list;
            for (json const& item : value) {
                if (!item.is_string()) return invalid(origin, where, "lists may hold strings only");
                TRELM_RETURN_IF_ERROR(list.pushBack(String(item.get<std::string>())));
            }
            out = list;
            return TRELM_OK();
        }
        case json::value_t::number_float:
            return invalid(origin, where, "numbers must be integers");
        default:
            return invalid(origin, where,
                           std::string("unsupported value of type ") + value.type_name());
    }
}

// A JSON object of configuration values into a map.
uError toValues(json const& object, std::string const& origin, std::string const& where,
                Map<String, Variant>& out) {
    if (!object.is_object()) return invalid(origin, where, "must be an object");
    for (auto const& [key, value] : object.items()) {
        Variant v;
        uError e = toVariant(value, origin, where + "." + key, v);
        if (e.ok()) e = out.insert(String(key), v);
        if (e.failed()) return e;
    }
    return TRELM_OK();
}

uError requiredString(json const& entry, char const* key, std::string const& origin,
                      std::string const& where, String& out) {
    auto it = entry.find(key);
    if (it == entry.end() || !it->is_string() || it->get<std::string>().empty()) {
        return invalid(origin, where, std::string("needs a non-empty string \"") + key + "\"");
    }
    out = String(it->get<std::string>());
    return TRELM_OK();
}

uError toComponent(json const& entry, std::string const& origin, std::string const& where,
                   HostConfig::ComponentEntry& out) {
    if (!entry.is_object()) return invalid(origin, where, "must be an object");
    for (auto const& [key, value] : entry.items()) {
        (void)value;
        if (key != "name" && key != "id" && key != "config" && key != "runtime_keys") {
            return invalid(origin, where, "unknown field \"" + key + "\"");
        }
    }
    uError e = requiredString(entry, "name", origin, where, out.name);
    if (e.ok()) e = requiredString(entry, "id", origin, where, out.id);
    if (e.failed()) return e;
    if (auto it = entry.find("config"); it != entry.end()) {
        TRELM_RETURN_IF_ERROR(toValues(*it, origin, where + ".config", out.config));
        TRELM_RETURN_IF_ERROR(ConfigSchema::check(out.id.str(), out.config, origin, where + ".config"));
    }
    out.runtimeKeys = HostConfig::defaultRuntimeKeys();
    if (auto it = entry.find("runtime_keys"); it != entry.end()) {
        Variant keys;
        e = toVariant(*it, origin, where + ".runtime_keys", keys);
        if (e.ok() && keys.type() != Variant::StringList) {
            e = invalid(origin, where + ".runtime_keys", "must be a list of strings");
        }
        if (e.ok()) e = keys.as(out.runtimeKeys);
        if (e.failed()) return e;
    }
    return TRELM_OK();
}

}  // namespace

uError HostConfig::load(std::string const& path, HostConfig& out) {
    // A configuration is a small file; a folder, a device or a huge file is a wrong path, and
    // reading /dev/zero would never end.
    std::error_code ec;
    std::filesystem::file_status const status = std::filesystem::status(path, ec);
    if (std::filesystem::is_directory(status)) {
        return TRELM_ERROR_MSG(kInvalid, "configuration file " + path + " is a folder; give the path of a JSON file");
    }
    if (std::filesystem::exists(status) && !std::filesystem::is_regular_file(status)) {
        return TRELM_ERROR_MSG(kInvalid, "configuration file " + path + " is not a regular file");
    }
    std::ifstream in(path, std::ios::binary);
    if (!in) return TRELM_ERROR_MSG(kNotFound, "cannot read configuration file " + path);
    std::string text(kMaxFileBytes + 1, '\0');
    in.read(text.data(), static_cast<std::streamsize>(text.size()));
    if (in.bad()) return TRELM_ERROR_MSG(kNotFound, "cannot read configuration file " + path);
    if (static_cast<std::size_t>(in.gcount()) > kMaxFileBytes) {
        return TRELM_ERROR_MSG(kInvalid, "configuration file " + path + " is larger than " +
                                             std::to_string(kMaxFileBytes / (1024 * 1024)) + " MiB");
    }
    text.resize(static_cast<std::size_t>(in.gcount()));
    return parse(text, path, out);
}

uError HostConfig::parse(std::string const& text, std::string const& origin, HostConfig& out) {
    json doc;
    try {
        doc = json::parse(text);
    } catch (json::parse_error const& e) {
        return invalid(origin, "JSON", e.what());
    }
    if (!doc.is_object()) return invalid(origin, "top level", "must be an object");

    HostConfig config;
    for (auto const& [key, value] : doc.items()) {
        uError e;
        if (key == "http") {
            e = toValues(value, origin, key, config.http_);
            if (e.ok()) e = ConfigSchema::check(key, config.http_, origin, key);
        } else if (key == "runtime") {
            e = toValues(value, origin, key, config.runtime_);
            if (e.ok()) e = ConfigSchema::check(key, config.runtime_, origin, key);
        } else if (key == "components") {
            if (!value.is_array()) return invalid(origin, key, "must be a list");
            std::set<String> names;
            for (std::size_t i = 0; i < value.size(); ++i) {
                std::string where = key + "[" + std::to_string(i) + "]";
                ComponentEntry entry;
                TRELM_RETURN_IF_ERROR(toComponent(value[i], origin, where, entry));
                if (!names.insert(entry.name).second) {
                    return invalid(origin, where,
                                   "a component named \"" + entry.name.str() + "\" already exists");
                }
                config.components_.push_back(std::move(entry));
            }
        } else {
            e = invalid(origin, key, "unknown section");
        }
        if (e.failed()) return e;
    }
    out = std::move(config);
    return TRELM_OK();
}

Vector<String> HostConfig::defaultRuntimeKeys() {
    // The session that the data source obtains at sign-in and keeps in the store.
    return Vector<String>{"facebook_source_session_id", "facebook_source_session_secret",
                          "facebook_source_session_user"};
}

}  // namespace host
}  // namespace trelm
