#pragma once

#include "IMessage.h"
#include "trelm/Export.h"
#include "trelm/Set.h"
#include "trelm/String.h"

namespace trelm {

// Tells a component that keys of its configuration group changed.
class TRELM_API ConfigurationChangedMessage : public IMessage {
public:
    static constexpr char const* kType = "ConfigurationChangedMessage";

    ConfigurationChangedMessage() : IMessage(kType) {}
    explicit ConfigurationChangedMessage(Set<String> keys) : IMessage(kType), keys(std::move(keys)) {}
    ~ConfigurationChangedMessage() override;

    // The names of the keys that changed.
    Set<String> keys;
};

}  // namespace trelm
