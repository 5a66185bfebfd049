#pragma once

#include <atomic>

#include "IMessage.h"
#include "trelm/Configuration.h"
#include "trelm/Export.h"
#include "trelm/String.h"
#include "trelm/uError.h"

namespace trelm {

// The root of every host component. The host calls the public entry points; each calls the
// matching hook, which subclasses override:
//   sendConfig(group)  -> sendConfigImpl(group)            state Configured on success
//   startup()          -> startupImpl()                    state Started on success
//   stop()             -> (no hook)                        state Stopped
//   shutdown()         -> shutdownImpl()                   state ShutDown on success
//   onMessage(msg)     -> preMessageImpl(msg); if that fails its error is returned at once;
//                         otherwise result = handleMessage(msg); then
//                         postMessageImpl(msg, result); returns result.
// Every hook defaults to success. The state only records the last entry point that succeeded;
// the base does not refuse calls out of order (configuring again while started keeps Started).
//
// Lifetime: owned by the host (or by whoever made it through a factory).
// Thread safety: the base keeps no state besides the atomic state; the host may call entry points
// from several threads, and subclasses guard their own state.
class TRELM_API Component {
public:
    enum class State { Created, Configured, Started, Stopped, ShutDown };

    Component(String name, String componentId);
    virtual ~Component();
    Component(Component const&) = delete;
    Component& operator=(Component const&) = delete;

    // The instance name (also the name of the component's configuration group).
    String const& name() const noexcept { return name_; }
    String const& componentId() const noexcept { return componentId_; }
    State state() const noexcept { return state_.load(); }

    virtual uError sendConfig(Configuration::Group const& group);
    virtual uError startup();
    virtual uError stop();
    virtual uError shutdown();
    virtual uError onMessage(IMessage& msg);

protected:
    virtual uError sendConfigImpl(Configuration::Group const& group);
    virtual uError startupImpl();
    virtual uError shutdownImpl();
    virtual uError preMessageImpl(IMessage& msg);
    virtual uError postMessageImpl(IMessage& msg, uError const& result);
    // The class's own handling of a message; the base accepts every message with success.
    virtual uError handleMessage(IMessage& msg);

private:
    // Constant after construction.
    String const name_;
    String const componentId_;
    // Does its own locking.
    std::atomic<State> state_{State::Created};
};

}  // namespace trelm
