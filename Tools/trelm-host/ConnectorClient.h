#pragma once

#include <vector>

#include "BaseConnector.h"
#include "HostSession.h"
#include "NetworkMetadata.h"
#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {
namespace host {

// The host's side of one network connector: connects it with the login of its configuration
// entry and asks it for peers, their status, and to set the user's status, through
// BaseConnector's public operations.
//
// Connection: the connector's "config" entry in the configuration file holds the connection
// parameters besides its own settings: "FacebookAppKey", "FacebookAppSecret", "FacebookLogin",
// "FacebookPassword" and optionally "FacebookID". They are handed to makeConnection as the
// connector's parameters; the connector writes the user it acts for back under "FacebookID".
//
// Lifetime: `session` must outlive the client; the connector belongs to the session's host.
// Thread safety: used by the host's controlling thread.
class ConnectorClient {
public:
    using Peer = NetworkMetadata::tRELMNetworkPeer;
    using Event = NetworkMetadata::tRELMNetworkEvent;

    // The parameter names taken from the configuration entry.
    static Vector<String> connectionKeys();

    explicit ConnectorClient(HostSession& session);
    ConnectorClient(ConnectorClient const&) = delete;
    ConnectorClient& operator=(ConnectorClient const&) = delete;

    // Takes the first configured component that is a network connector and has started and makes
    // its connection. kNotFound when no connector started; kNotSet when its entry names no
    // "FacebookLogin" or "FacebookPassword"; the connector's error when the connection fails.
    uError open();

    // REQUIRES: open() succeeded (for all below).
    String const& name() const noexcept { return name_; }
    // The "FacebookID" the connector wrote back.
    String const& userId() const noexcept { return userId_; }

    // The friends with their profiles: the ids (getPeers), then every profile in one request
    // (getPeerInfoBatch), in the order of the ids.
    uError peers(Vector<Peer>& out);
    // The status of each id in one request; `events[i]` belongs to `ids[i]`.
    uError peerStatus(Vector<String>& ids, Vector<Event>& events);
    uError setStatus(String const& text);

private:
    HostSession& session_;
    BaseConnector* connector_ = nullptr;  // owned by the session's host
    String name_;
    String userId_;
};

}  // namespace host
}  // namespace trelm
