#pragma once

#include "IMessage.h"
#include "trelm/Export.h"
#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/Variant.h"

namespace trelm {

// Asks the runtime-configuration store for values under `tag`. The caller puts the wanted keys,
// each with an empty Variant, into its own map; the receiver fills the values it holds and
// leaves the others empty.
// Lifetime: `values` refers to the caller's map, which must outlive the message.
class TRELM_API GetRuntimeConfigurationMessage : public IMessage {
public:
    static constexpr char const* kType = "GetRuntimeConfigurationMessage";

    GetRuntimeConfigurationMessage(String tag, Map<String, Variant>& values, int flags = 0)
        : IMessage(kType), flags(flags), tag(std::move(tag)), values(values) {}
    ~GetRuntimeConfigurationMessage() override;

    int flags = 0;  // unused; 0
    String tag;
    Map<String, Variant>& values;
};

}  // namespace trelm
