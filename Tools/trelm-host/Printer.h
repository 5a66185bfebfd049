#pragma once

#include <cstddef>
#include <optional>
#include <ostream>
#include <string>
#include <vector>

#include "Component.h"
#include "ComponentHost.h"
#include "PluginLoader.h"
#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/Variant.h"
#include "trelm/Vector.h"

namespace trelm {
namespace host {

// Writes `rows` as a table: each column as wide as its widest cell, two spaces between columns,
// rows of fewer cells allowed; cells as terminalText makes them.
void writeTable(std::ostream& out, std::vector<std::vector<std::string>> const& rows);

// Writes what the host did to standard output, either for a person (aligned tables) or for
// programs (JSON lines: one object per line, each with a "type" field).
//
// JSON lines written:
//   {"type":"plugin","path":P,"components":[ID,...]}                (ids in the table's order)
//   {"type":"endpoint","emulator":B,"connect_to":[...],"ca_file":F}
//   {"type":"component","name":N,"id":ID,"state":S,"restored":[KEY,...],"error":null|TEXT}
//   {"type":"state","tag":T,"action":"set"|"reset","keys":[KEY,...]}
//   {"type":"login","tag":T,"code":"0x00000000","user":U,"session":"new"|"stored"}
//   {"type":"step","step":N,"action":TEXT}                          (a step of the demo tour)
//   {"type":"record","index":N,"fields":{KEY:VALUE,...}}            (N counts from 1)
//   {"type":"listed","object_type":T,"rows":N,"total":N|null}
//   {"type":"inserted","object_type":T,"core_service_id":ID|null}
//   {"type":"retrieved","guid":G,"fields":{KEY:VALUE,...}}
//   {"type":"check","what":TEXT,"ok":B}
// States: "not created", "created", "configured", "started", "stopped", "shut down". In JSON
// lines an error is the uError chain as uError::format renders it; the table shows states only
// (the host writes errors to standard error). Values kept in the runtime store are never
// printed, only their keys. Record values keep their kind in JSON: GUIDs as their text,
// integers as numbers, booleans as booleans, lists as arrays, an empty value as null. Tables
// show a record as one "key  value" line per field, in key order.
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
    // A data source's sign-in: `stored` when it reuses a session kept from an earlier run.
    void login(String const& tag, unsigned code, String const& userId, bool stored);
    void step(int number, std::string const& action);
    void record(unsigned index, Map<String, Variant> const& fields);
    // The end of a listing; `total` when the source counted its rows.
    void listed(int objectType, std::size_t rows, std::optional<unsigned> total);
    void inserted(int objectType, std::optional<String> const& serviceId);
    void retrieved(String const& guid, Map<String, Variant> const& fields);
    void check(std::string const& what, bool ok);
    // Writes whatever is gathered; call once at the end.
    void finish();

    Format format() const noexcept { return format_; }
    // Hands what is written so far to the output (records shown as they arrive).
    void flush() { out_.flush(); }

private:
    Format const format_;
    std::ostream& out_;
    std::vector<ComponentHost::Instance> pending_;  // table rows waiting for finish()
};

}  // namespace host
}  // namespace trelm
