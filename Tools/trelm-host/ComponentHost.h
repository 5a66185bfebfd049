#pragma once

#include <memory>
#include <vector>

#include "BaseSource.h"
#include "Component.h"
#include "ComponentRegistry.h"
#include "HostConfig.h"
#include "HttpRequestFactory.h"
#include "ItemStore.h"
#include "PluginLoader.h"
#include "RuntimeConfiguration.h"
#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/Variant.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {
namespace host {

// The host's component side: the registry through which components message each other, the
// built-in components "HttpRequestFactory" and "RuntimeConfiguration", and the component
// instances made from plug-in factories.
//
// Ownership: owns every component it makes. The destructor shuts the components down and
// destroys them, the plug-in instances (newest first) before the built-ins. Components made from
// a plug-in's factory run that plug-in's code, so the PluginLoader must outlive the host.
// Lifetime: the registry is the process's active one from startBuiltins() until destruction; at
// most one ComponentHost may be active at a time.
// Thread safety: the host's own operations are called from one controlling thread; components
// may message each other from any thread while it lives.
class ComponentHost {
public:
    // What became of one configured component.
    struct Instance {
        String name;
        String id;
        Component* component = nullptr;  // owned by the host; null when it could not be made
        uError error;                    // the first failure on the way to started, if any
        Vector<String> restored;         // keys whose values came from the runtime store
    };

    ComponentHost();
    ~ComponentHost();
    ComponentHost(ComponentHost const&) = delete;
    ComponentHost& operator=(ComponentHost const&) = delete;

    // Activates the registry and makes, registers, configures and starts the two built-ins:
    // "HttpRequestFactory" from `http`, "RuntimeConfiguration" from `runtime`, whose "path" is
    // `runtimeStorePath` unless `runtime` names one. Returns the first failure, wrapped with the
    // built-in's name; a failure leaves the host unusable for components.
    uError startBuiltins(Map<String, Variant> const& http, Map<String, Variant> const& runtime,
                         String const& runtimeStorePath);

    // Makes, registers, configures and starts the built-in "ItemStore" on the database `path`, so
    // that it is there for the wipes a source sends when another person signs in. Returns the
    // failure wrapped with the component's name.
    // REQUIRES: startBuiltins() succeeded.
    uError startItemStore(String const& path);

    // Makes the component of `entry` with the table's factory for its id, registers it under its
    // name, configures it with its "config" values overlaid by the values the runtime store holds
    // under its name (for its config keys and runtime keys), and starts it. The outcome,
    // including a failure at any step, is in the returned record; a component that was made stays
    // registered and owned by the host whatever its state.
    // REQUIRES: startBuiltins() succeeded.
    Instance addComponent(HostConfig::ComponentEntry const& entry, PluginLoader::Table const& table);

    // Registers a component of the host's own (a listener for broadcasts) under its name. The
    // host does not own it, configure it or start it, and does not list it in instances(); the
    // registry forgets it when the host is destroyed, and the caller keeps it alive until then.
    // kFailure wrapping the registry's kInvalid when the name is taken.
    // REQUIRES: startBuiltins() succeeded.
    uError attach(Component& component);

    // The configured component named `name` that is a data source and has started, or null.
    BaseSource* startedSource(String const& name) const;

    std::vector<Instance> const& instances() const noexcept { return instances_; }
    // REQUIRES: startBuiltins() succeeded.
    RuntimeConfiguration& runtimeConfiguration();
    HttpRequestFactory& httpRequestFactory();
    // REQUIRES: startItemStore() succeeded.
    ItemStore& itemStore();
    ComponentRegistry& registry() noexcept { return registry_; }

    // Shuts down every started component, plug-in instances first (newest first), then the
    // built-ins. A component already shut down is left alone, so calling this again does nothing.
    // Failures are appended to `errors` when given.
    void shutdownAll(Vector<uError>* errors = nullptr);

private:
    // A component the host made, and whether the registry knows it.
    struct Slot {
        std::unique_ptr<Component> component;
        bool registered = false;
    };

    uError addBuiltin(Component& component, Map<String, Variant> const& values);
    uError restore(HostConfig::ComponentEntry const& entry, Configuration::Group& group,
                   Vector<String>& restored);
    static void shutdownOne(Component& component, Vector<uError>* errors);
    void destroy(Slot& slot);

    // Used by the controlling thread only; the registry does its own locking.
    ComponentRegistry registry_;
    Slot http_;      // HttpRequestFactory
    Slot runtime_;   // RuntimeConfiguration
    Slot items_;     // ItemStore
    std::vector<Slot> slots_;          // plug-in components, in creation order
    std::vector<Instance> instances_;  // one per addComponent call, in call order
    std::vector<String> attached_;     // names of the components registered by attach()
};

}  // namespace host
}  // namespace trelm
