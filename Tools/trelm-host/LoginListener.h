#pragma once

#include <cstddef>
#include <mutex>
#include <vector>

#include "Component.h"
#include "IMessage.h"
#include "trelm/String.h"
#include "trelm/uError.h"

namespace trelm {
namespace host {

// A component of the host's own that records every "ILoginStatus::LoginStatusMessage" it
// receives. Sources broadcast the message (empty target) after each sign-in, each session they
// are handed and each account reset, so once registered the listener sees all of them, in the
// order they were sent. Other messages are accepted and ignored.
//
// Lifetime: registered with the host's registry by its owner, which keeps it alive until the
// registry has forgotten it.
// Thread safety: messages may arrive on any thread; the accessors may be called concurrently
// with them.
class LoginListener : public Component {
public:
    static constexpr char const* kName = "trelm-host.login-status";

    // One broadcast as it arrived.
    struct Status {
        String tag;      // the configuration tag (component name) of the account
        unsigned code = 0;  // the uError code of the operation; kSuccess when signed in
        String userId;   // empty after a reset
    };

    LoginListener();
    ~LoginListener() override;

    // How many broadcasts have arrived so far.
    std::size_t count() const;
    // The broadcasts for `tag` that arrived after the first `from` of all broadcasts, oldest first.
    std::vector<Status> since(std::size_t from, String const& tag) const;

protected:
    uError handleMessage(IMessage& msg) override;

private:
    // Guards statuses_.
    mutable std::mutex mutex_;
    std::vector<Status> statuses_;  // every broadcast, in arrival order
};

}  // namespace host
}  // namespace trelm
