#pragma once

#include "IMessage.h"
#include "trelm/Configuration.h"
#include "trelm/Export.h"
#include "trelm/Set.h"
#include "trelm/String.h"

namespace trelm {

// Asks the runtime-configuration store to keep `values` under `tag`.
class TRELM_API RuntimeConfigurationMessage : public IMessage {
public:
    static constexpr char const* kType = "RuntimeConfigurationMessage";

    RuntimeConfigurationMessage() : IMessage(kType) {}
    RuntimeConfigurationMessage(String tag, Set<Configuration::Value> values)
        : IMessage(kType), tag(std::move(tag)), values(std::move(values)) {}
    ~RuntimeConfigurationMessage() override;

    String tag;
    Set<Configuration::Value> values;
};

}  // namespace trelm
