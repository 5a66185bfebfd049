// A tiny host built against an installed trelm: includes the public headers the way an outside
// project does, links libtrelm, opens the plug-in from the plug-in folder the package names
// (TRELM_PLUGIN_DIR, from trelm_PLUGIN_DIR or pkg-config's plugindir),
// makes each component the plug-in offers and prints one line per component. Exit status 0 only
// when the plug-in offered at least one component and every factory made a component that the
// host recognises as a trelm::Component of the installed library.
#include <dlfcn.h>

#include <cstdio>
#include <memory>
#include <string>

#include <trelm/Component.h>
#include <trelm/GUID.h>
#include <trelm/Map.h>
#include <trelm/RuntimeConfiguration.h>
#include <trelm/String.h>
#include <trelm/uError.h>

using Factory = trelm::Component* (*)(trelm::String);
using Table = trelm::Map<trelm::String, Factory>;
using GetComponents = trelm::uError (*)(Table&);

int main() {
    std::string module = std::string(TRELM_PLUGIN_DIR) + "/libtrelmfacebook.so";
    void* handle = dlopen(module.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (handle == nullptr) {
        std::fprintf(stderr, "cannot open %s: %s\n", module.c_str(), dlerror());
        return 1;
    }
    auto getComponents = reinterpret_cast<GetComponents>(dlsym(handle, "getComponents"));
    if (getComponents == nullptr) {
        std::fprintf(stderr, "no getComponents in %s\n", module.c_str());
        return 1;
    }

    Table table;
    trelm::uError error = getComponents(table);
    if (error.failed() || table.empty()) {
        std::fprintf(stderr, "getComponents: %s\n", error.toText().c_str());
        return 1;
    }
    for (auto const& [id, factory] : table) {
        std::unique_ptr<trelm::Component> component(factory(trelm::String("consumer")));
        if (component == nullptr || component->state() != trelm::Component::State::Created) {
            std::fprintf(stderr, "factory for %s made no usable component\n", id.cStr());
            return 1;
        }
        std::printf("component %s\n", id.cStr());
    }

    // The built-in components come from libtrelm itself.
    trelm::RuntimeConfiguration store;
    std::printf("builtin %s\n", store.name().cStr());
    std::printf("guid %s\n", trelm::GUID::generate().toString().cStr());
    // The plug-in's components were destroyed above; the module may go.
    dlclose(handle);
    return 0;
}
