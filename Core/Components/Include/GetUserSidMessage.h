#pragma once

#include "IMessage.h"
#include "trelm/Export.h"
#include "trelm/String.h"

namespace trelm {
namespace IServiceSource {

// Asks a service source for the service's id of its signed-in user.
class TRELM_API GetUserSidMessage : public IMessage {
public:
    static constexpr char const* kType = "IServiceSource::GetUserSidMessage";

    GetUserSidMessage() : IMessage(kType) {}
    ~GetUserSidMessage() override;

    // Result: the user id, filled by the source.
    String result;
};

}  // namespace IServiceSource
}  // namespace trelm
