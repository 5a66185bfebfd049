#include "ConnectorClient.h"

namespace trelm {
namespace host {

Vector<String> ConnectorClient::connectionKeys() {
    return Vector<String>{"FacebookAppKey", "FacebookAppSecret", "FacebookLogin", "FacebookPassword", "FacebookID"};
}

ConnectorClient::ConnectorClient(HostSession& session) : session_(session) {}

uError ConnectorClient::open() {
    for (ComponentHost::Instance const& instance : session_.host().instances()) {
        if (instance.component == nullptr || instance.component->state() != Component::State::Started) continue;
        connector_ = dynamic_cast<BaseConnector*>(instance.component);
        if (connector_ != nullptr) {
            name_ = instance.name;
            break;
        }
    }
    if (connector_ == nullptr) return TRELM_ERROR_MSG(kNotFound, "no network connector has started");

    Map<String, String> params;
    if (HostConfig::ComponentEntry const* entry = session_.entry(name_)) {
        for (String const& key : connectionKeys()) {
            Variant const* value = entry->config.search(key);
            if (value == nullptr) continue;
            String text;
            if (value->as(text).failed()) return TRELM_ERROR_MSG(kInvalid, name_ + ": " + key + " is not a text");
            TRELM_RETURN_IF_ERROR(params.insert(key, text));
        }
    }
    for (char const* key : {"FacebookLogin", "FacebookPassword"}) {
        if (!params.contains(key)) return TRELM_ERROR_MSG(kNotSet, "the configuration of " + name_ + " has no " + key);
    }
    uError e = connector_->makeConnection(params, false);
    if (e.failed()) return TRELM_WRAP_MSG(kFailure, e, name_ + " could not connect");
    if (String const* id = params.search("FacebookID")) userId_ = *id;
    return TRELM_OK();
}

uError ConnectorClient::peers(Vector<Peer>& out) {
    Vector<String> ids;
    uError e = connector_->getPeers(ids);
    if (e.failed()) return TRELM_WRAP_MSG(kFailure, e, name_ + " cannot list its peers");
    e = connector_->getPeerInfoBatch(ids, out);
    if (e.failed()) return TRELM_WRAP_MSG(kFailure, e, name_ + " cannot read its peers' profiles");
    return TRELM_OK();
}

uError ConnectorClient::peerStatus(Vector<String>& ids, Vector<Event>& events) {
    uError e = connector_->getPeerStatusBatch(ids, events);
    if (e.failed()) return TRELM_WRAP_MSG(kFailure, e, name_ + " cannot read the peers' status");
    return TRELM_OK();
}

uError ConnectorClient::setStatus(String const& text) {
    uError e = connector_->setStatus(text);
    if (e.failed()) return TRELM_WRAP_MSG(kFailure, e, name_ + " cannot set the status");
    return TRELM_OK();
}

}  // namespace host
}  // namespace trelm
