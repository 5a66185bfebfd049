#pragma once

#include "Component.h"
#include "IMessage.h"
#include "NetworkMetadata.h"
#include "WakeupMessage.h"
#include "trelm/Export.h"
#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {

// The base of a network connector: signs in to a social network and reports peers, their
// profiles and status. Besides the Component entry points:
//   walk()                    -> walkImpl()
//   "WakeupMessage" message   -> wakeupImpl(&msg)
// The connector operations are public and answer kNotSupported unless overridden; walkImpl and
// wakeupImpl succeed by default.
// Thread safety: as Component.
class TRELM_API BaseConnector : public Component {
public:
    BaseConnector(String name, String componentId);
    ~BaseConnector() override;

    uError walk();

    // Connects with the given parameters; a connector may write results back into params.
    virtual uError makeConnection(Map<String, String>& params, bool flag);
    virtual uError closeConnection();
    virtual uError getPeers(Vector<String>& ids);
    virtual uError getPeerInfo(String uid, NetworkMetadata::tRELMNetworkPeer& peer);
    virtual uError getPeerInfoBatch(Vector<String>& ids, Vector<NetworkMetadata::tRELMNetworkPeer>& peers);
    virtual uError getPeerStatus(String const& uid, NetworkMetadata::tRELMNetworkEvent& event);
    virtual uError getPeerStatusBatch(Vector<String>& ids, Vector<NetworkMetadata::tRELMNetworkEvent>& events);
    virtual uError setStatus(String const& text);
    virtual uError getPhotoAlbums(Vector<String>& albums);
    virtual uError publishPhoto(String const& uri, String const& caption);
    virtual uError publishPhotoTo(String const& albumId, String const& uri, String const& caption);

protected:
    uError handleMessage(IMessage& msg) override;

    virtual uError walkImpl();
    virtual uError wakeupImpl(WakeupMessage* msg);
};

}  // namespace trelm
