#pragma once

#include "Component.h"
#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/uError.h"

// The module's entry points. The host opens the module, looks these names up with dlsym and calls
// getComponents once per table it wants filled; the factories are then called through the table.
// They are the only symbols the module exports, under their plain C names.

namespace trelm {

// Makes one component instance named `name`. Ownership of the result passes to the caller.
using ComponentFactory = Component* (*)(String name);
// The host's table of component identifiers to factories. Owned by the host.
using ComponentTable = Map<String, ComponentFactory>;

}  // namespace trelm

#define TRELM_PLUGIN_ENTRY extern "C" __attribute__((visibility("default")))

// Puts the plug-in's two components into `components`, the data source first, then the
// connector. An identifier already in the table gets this plug-in's factory; other entries are
// left alone. May be called any number of times. Failure (kFailure wrapping the table's error)
// stops at the failing insert; entries inserted before it stay.
// Thread safety: may be called from several threads with distinct tables.
TRELM_PLUGIN_ENTRY trelm::uError getComponents(trelm::ComponentTable& components);

// Each makes one new, unconfigured component; the module keeps no reference to it.
TRELM_PLUGIN_ENTRY trelm::Component* FacebookSource_component(trelm::String name);
TRELM_PLUGIN_ENTRY trelm::Component* FacebookConnector_component(trelm::String name);
