#pragma once

#include <ostream>
#include <string>
#include <vector>

#include "Component.h"
#include "ComponentHost.h"
#include "PluginLoader.h"
#include "trelm/String.h"
#include "trelm/Vector.h"

namespace trelm {
namespace host {

// Writes what the host did to standard output, either for a person (aligned tables) or for
// programs (JSON lines: one object per line, each with a "type" field).
//
// JSON lines written:
//   {"type":"plugin","path":P,"components":[ID,...]}                (ids in the table's order)
//   {"type":"endpoint","emulator":B,"connect_to":[...],"ca_file":F}
//   {"type":"component","name":N,"id":ID,"state":S,"restored":[KEY,...],"error":null|TEXT}
//   {"type":"state","tag":T,"action":"set"|"reset","keys":[KEY,...]}
// States: "not created", "created", "configured", "started", "stopped", "shut down". In JSON
// lines an error is the uError chain as uError::format renders it; the table shows states only
// (the host writes errors to standard error). Values kept in the runtime store are never
// printed, only their keys.
//
// Lifetime: `out` must outlive the printer. Table rows of components are gathered and written by
// finish(), so that the columns line up; the other kinds are written at once.
// Thread safety: none; used by the host's controlling thread.
class Printer {
public:
    enum class Format { Table, JsonLines };

    Printer(Format format, std::ostream& out);

    // "table" or "json"; false for anything else.
    static bool parseFormat(std::string const& text, Format& out);
    static char const* stateName(Component::State state);

    void plugin(PluginLoader::Plugin const& plugin);
    void endpoint(bool emulator, Vector<String> const& connectTo, String const& caFile);
    void component(ComponentHost::Instance const& instance);
    void state(String const& tag, char const* action, Vector<String> const& keys);
    // Writes whatever is gathered; call once at the end.
    void finish();

private:
    Format const format_;
    std::ostream& out_;
    std::vector<ComponentHost::Instance> pending_;  // table rows waiting for finish()
};

}  // namespace host
}  // namespace trelm
