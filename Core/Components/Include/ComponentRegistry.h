#pragma once

#include <atomic>
#include <mutex>
#include <utility>
#include <vector>

#include "trelm/Export.h"
#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {

class Component;
class IMessage;

// The host's table of component instances by name, through which messages are delivered.
//
// Ownership: the registry does not own the components. A component must stay alive while it is
// registered and while a message may be on its way to it: remove() does not wait for deliveries
// already under way.
// Activation: at most one registry is active in the process; IMessage::send delivers through it.
// activate() replaces the previously active registry; the destructor deactivates this one if it
// is still active. The host keeps the active registry alive while messages may be sent.
// Thread safety: every operation may be called from any thread. The lock is never held while a
// component handles a message, so a handler may send further messages (even to itself) and may
// add or remove components.
class TRELM_API ComponentRegistry {
public:
    ComponentRegistry() = default;
    ~ComponentRegistry();
    ComponentRegistry(ComponentRegistry const&) = delete;
    ComponentRegistry& operator=(ComponentRegistry const&) = delete;

    // kInvalid for an empty name, a null component or a name already registered.
    uError add(String const& name, Component* component);
    // kNotFound when nothing is registered under name.
    uError remove(String const& name);
    // The component registered under name, or null.
    Component* find(String const& name) const;
    // The registered names in registration order.
    Vector<String> names() const;

    // Makes this the registry that IMessage::send delivers through.
    void activate();
    // Stops delivering through this registry if it is the active one.
    void deactivate();
    static ComponentRegistry* active() noexcept;

    // Delivers msg to target (empty: to every component); see IMessage::send.
    uError deliver(IMessage& msg, String const& target);

private:
    // Guards entries_.
    mutable std::mutex mutex_;
    std::vector<std::pair<String, Component*>> entries_;  // in registration order

    static std::atomic<ComponentRegistry*> active_;
};

}  // namespace trelm
