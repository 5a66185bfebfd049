#pragma once

#include <cstdint>
#include <ostream>
#include <string>

#include <nlohmann/json.hpp>

#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/Variant.h"
#include "trelm/Vector.h"

namespace trelm {
namespace host {

// The JSON forms of what trelm-host prints and stores: one place for how a record, a value and a
// time look, so that `query`, `items`, the item store and the peer commands agree.
using Json = nlohmann::ordered_json;

// `object` as one line of text. Texts from plug-ins and the service are byte strings; invalid
// UTF-8 is replaced, so the text is always valid JSON.
std::string jsonText(Json const& object);
// `object` as one JSON line on `out`.
void writeJsonLine(std::ostream& out, Json const& object);

// A value by its kind: null, a boolean, a number, an array of numbers or texts, or a text (GUIDs
// and strings).
Json toJson(Variant const& value);
Json toJson(Vector<String> const& list);
// A record as an object, keys in the record's order.
Json toJson(Map<String, Variant> const& fields);

// "YYYY-MM-DD HH:MM:SS" in UTC; the number itself when it is no representable time.
std::string utcText(std::int64_t seconds);

}  // namespace host
}  // namespace trelm
