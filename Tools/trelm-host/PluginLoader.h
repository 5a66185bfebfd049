#pragma once

#include <string>
#include <vector>

#include "Component.h"
#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {
namespace host {

// Opens plug-in modules and collects the components they offer into one table.
//
// A plug-in is a module exporting, with C linkage,
//   uError getComponents(Map<String, Component* (*)(String)>& components);
// which puts one factory per component identifier into the table. Later plug-ins replace the
// factories of identifiers that earlier ones offered.
//
// Lifetime: the modules stay open until the loader is destroyed. Every component made through a
// factory of the table, and every error such a component or plug-in returned, must be gone
// before that (their code and stamped file names live in the module).
// Thread safety: none; one thread loads, then the table may be read from any thread.
class PluginLoader {
public:
    using Factory = Component* (*)(String name);
    using Table = Map<String, Factory>;
    using GetComponents = uError (*)(Table& components);

    // What one plug-in offered, in the order of its table.
    struct Plugin {
        std::string path;
        Vector<String> ids;
    };

    PluginLoader() = default;
    ~PluginLoader();
    PluginLoader(PluginLoader const&) = delete;
    PluginLoader& operator=(PluginLoader const&) = delete;

    // Opens the module at `path` (RTLD_NOW | RTLD_LOCAL), calls its getComponents into a table of
    // its own and merges that into table(). Failures, each with the path and the reason in the
    // message: kNotFound when the module cannot be opened or has no getComponents; kFailure
    // wrapping the plug-in's error when getComponents fails. A plug-in that fails adds nothing
    // to the table (unless memory runs out halfway through merging). One whose getComponents
    // ran stays open even when it failed, because its error refers to text inside the module:
    // use such an error only while the loader lives.
    uError load(std::string const& path);

    Table const& table() const noexcept { return table_; }
    // The loaded plug-ins, in load order.
    std::vector<Plugin> const& plugins() const noexcept { return plugins_; }

    // libtrelmfacebook.so in the installed plug-in folder (<prefix>/bin/trelm-host ->
    // <prefix>/lib/trelm/plugins/libtrelmfacebook.so) when it is there; otherwise the one in the
    // library folder beside the running program's folder, as in the build tree
    // (<build>/bin/trelm-host -> <build>/lib/libtrelmfacebook.so).
    static std::string defaultPluginPath();

private:
    std::vector<void*> handles_;  // dlopen handles, closed in reverse order
    std::vector<Plugin> plugins_;
    Table table_;
};

}  // namespace host
}  // namespace trelm
