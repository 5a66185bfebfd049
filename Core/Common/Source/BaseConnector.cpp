#include "BaseConnector.h"

namespace trelm {

BaseConnector::BaseConnector(String name, String componentId) : Component(std::move(name), std::move(componentId)) {}

BaseConnector::~BaseConnector() = default;

uError BaseConnector::walk() { return walkImpl(); }

uError BaseConnector::handleMessage(IMessage& msg) {
    if (msg.type() == WakeupMessage::kType) {
        auto* wakeup = dynamic_cast<WakeupMessage*>(&msg);
        if (wakeup == nullptr) return TRELM_ERROR_MSG(kInvalid, "message of another class");
        return wakeupImpl(wakeup);
    }
    return Component::handleMessage(msg);
}

uError BaseConnector::walkImpl() { return TRELM_OK(); }
uError BaseConnector::wakeupImpl(WakeupMessage*) { return TRELM_OK(); }

uError BaseConnector::makeConnection(Map<String, String>&, bool) { return TRELM_ERROR(kNotSupported); }
uError BaseConnector::closeConnection() { return TRELM_ERROR(kNotSupported); }
uError BaseConnector::getPeers(Vector<String>&) { return TRELM_ERROR(kNotSupported); }
uError BaseConnector::getPeerInfo(String, NetworkMetadata::tRELMNetworkPeer&) { return TRELM_ERROR(kNotSupported); }
uError BaseConnector::getPeerInfoBatch(Vector<String>&, Vector<NetworkMetadata::tRELMNetworkPeer>&) {
    return TRELM_ERROR(kNotSupported);
}
uError BaseConnector::getPeerStatus(String const&, NetworkMetadata::tRELMNetworkEvent&) {
    return TRELM_ERROR(kNotSupported);
}
uError BaseConnector::getPeerStatusBatch(Vector<String>&, Vector<NetworkMetadata::tRELMNetworkEvent>&) {
    return TRELM_ERROR(kNotSupported);
}
uError BaseConnector::setStatus(String const&) { return TRELM_ERROR(kNotSupported); }
uError BaseConnector::getPhotoAlbums(Vector<String>&) { return TRELM_ERROR(kNotSupported); }
uError BaseConnector::publishPhoto(String const&, String const&) { return TRELM_ERROR(kNotSupported); }
uError BaseConnector::publishPhotoTo(String const&, String const&, String const&) { return TRELM_ERROR(kNotSupported); }

}  // namespace trelm
