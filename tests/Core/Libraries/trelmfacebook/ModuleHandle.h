#pragma once

#include <string>
#include <vector>

#include "Component.h"
#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/uError.h"

// The plug-in module opened the way trelm-host opens it (RTLD_NOW | RTLD_LOCAL), with its three
// entry points looked up by name. Closed on destruction.
class ModuleHandle {
public:
    using Factory = trelm::Component* (*)(trelm::String);
    using Table = trelm::Map<trelm::String, Factory>;
    using GetComponents = trelm::uError (*)(Table&);

    explicit ModuleHandle(std::string const& path);
    ~ModuleHandle();
    ModuleHandle(ModuleHandle const&) = delete;
    ModuleHandle& operator=(ModuleHandle const&) = delete;

    // Empty when the module opened and all three names were found.
    std::string const& error() const { return error_; }

    GetComponents getComponents = nullptr;
    Factory sourceFactory = nullptr;
    Factory connectorFactory = nullptr;

private:
    void* handle_ = nullptr;
    std::string error_;
};

// The identifiers in `table`, in its order.
inline std::vector<std::string> idsOf(ModuleHandle::Table const& table) {
    std::vector<std::string> ids;
    for (auto const& [id, factory] : table) ids.push_back(id.str());
    return ids;
}

inline constexpr char const* kSourceId = "@trelm.example:/facebooksource";
inline constexpr char const* kConnectorId = "@trelm.example:/facebookconnector";
