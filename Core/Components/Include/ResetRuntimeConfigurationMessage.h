#pragma once

#include "IMessage.h"
#include "trelm/Export.h"
#include "trelm/Set.h"
#include "trelm/String.h"

namespace trelm {

// Asks the runtime-configuration store to forget `keys` under `tag`.
class TRELM_API ResetRuntimeConfigurationMessage : public IMessage {
public:
    static constexpr char const* kType = "ResetRuntimeConfigurationMessage";

    ResetRuntimeConfigurationMessage() : IMessage(kType) {}
    ResetRuntimeConfigurationMessage(String tag, Set<String> keys)
        : IMessage(kType), tag(std::move(tag)), keys(std::move(keys)) {}
    ~ResetRuntimeConfigurationMessage() override;

    String tag;
    Set<String> keys;
};

}  // namespace trelm
