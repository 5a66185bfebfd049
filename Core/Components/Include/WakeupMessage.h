#pragma once

#include "IMessage.h"
#include "trelm/Export.h"
#include "trelm/Map.h"
#include "trelm/String.h"

namespace trelm {

// Asks a component to wake up (refresh) for the accounts named in `params`.
class TRELM_API WakeupMessage : public IMessage {
public:
    static constexpr char const* kType = "WakeupMessage";

    WakeupMessage() : IMessage(kType) {}
    explicit WakeupMessage(Map<String, String> params) : IMessage(kType), params(std::move(params)) {}
    ~WakeupMessage() override;

    Map<String, String> params;
};

}  // namespace trelm
