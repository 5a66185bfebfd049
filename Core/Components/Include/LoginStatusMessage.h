#pragma once

#include "IMessage.h"
#include "trelm/Export.h"
#include "trelm/String.h"

namespace trelm {
namespace ILoginStatus {

// Announces (normally to every component) a change of an account's sign-in state.
class TRELM_API LoginStatusMessage : public IMessage {
public:
    static constexpr char const* kType = "ILoginStatus::LoginStatusMessage";

    LoginStatusMessage() : IMessage(kType) {}
    LoginStatusMessage(String tag, unsigned status, String userId)
        : IMessage(kType), tag(std::move(tag)), status(status), userId(std::move(userId)) {}
    ~LoginStatusMessage() override;

    // The configuration tag of the account.
    String tag;
    // The uError code of the operation that changed the state (0 when signed in).
    unsigned status = 0;
    // The signed-in user's service id; empty when signed out.
    String userId;
};

}  // namespace ILoginStatus
}  // namespace trelm
