#pragma once

#include "BaseConnector.h"
#include "trelm/String.h"

namespace trelm {

// The plug-in's network connector: signs in to the service and reports the user's friends as
// peers with their profiles and status. For now it has the connector base's behaviour only.
//
// Lifetime: made by the plug-in's component factory and owned by the host.
// Thread safety: as BaseConnector.
class FacebookConnector : public BaseConnector {
public:
    explicit FacebookConnector(String name);
    ~FacebookConnector() override;

    // The identifier under which the host's component table offers the connector. The table and
    // the connector itself both take it from here, so they cannot disagree.
    static String id();
};

// The profile fields asked for a peer, and the status fields (none beyond the defaults). Set when
// the module is loaded, destroyed when it is unloaded.
extern String const facebookPeerInfoFields;
extern String const facebookStatusFields;

}  // namespace trelm
