#include "Component.h"

namespace trelm {

Component::Component(String name, String componentId) : name_(std::move(name)), componentId_(std::move(componentId)) {}

Component::~Component() = default;

uError Component::sendConfig(Configuration::Group const& group) {
    uError e = sendConfigImpl(group);
    if (e.ok() && state_.load() == State::Created) state_.store(State::Configured);
    return e;
}

uError Component::startup() {
    uError e = startupImpl();
    if (e.ok()) state_.store(State::Started);
    return e;
}

uError Component::stop() {
    state_.store(State::Stopped);
    return TRELM_OK();
}

uError Component::shutdown() {
    uError e = shutdownImpl();
    if (e.ok()) state_.store(State::ShutDown);
    return e;
}

uError Component::onMessage(IMessage& msg) {
    TRELM_RETURN_IF_ERROR(preMessageImpl(msg));
    uError result = handleMessage(msg);
    // The hook observes the outcome; the message's own result is what the sender learns.
    postMessageImpl(msg, result).ignore();
    return result;
}

uError Component::sendConfigImpl(Configuration::Group const&) { return TRELM_OK(); }
uError Component::startupImpl() { return TRELM_OK(); }
uError Component::shutdownImpl() { return TRELM_OK(); }
uError Component::preMessageImpl(IMessage&) { return TRELM_OK(); }
uError Component::postMessageImpl(IMessage&, uError const&) { return TRELM_OK(); }
uError Component::handleMessage(IMessage&) { return TRELM_OK(); }

}  // namespace trelm
