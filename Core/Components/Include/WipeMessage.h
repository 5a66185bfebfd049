#pragma once

#include "IMessage.h"
#include "trelm/Export.h"
#include "trelm/Map.h"
#include "trelm/String.h"

namespace trelm {

// Asks a component to wipe the data it holds for the accounts named in `params`.
class TRELM_API WipeMessage : public IMessage {
public:
    static constexpr char const* kType = "WipeMessage";

    WipeMessage() : IMessage(kType) {}
    explicit WipeMessage(Map<String, String> params) : IMessage(kType), params(std::move(params)) {}
    ~WipeMessage() override;

    Map<String, String> params;
};

}  // namespace trelm
