#pragma once

#include "trelm/Map.h"
#include "trelm/SmartPtr.h"
#include "trelm/String.h"
#include "trelm/Variant.h"

namespace trelm {

// Text dumps of item records, for tracing.
//
// One line per entry, in ascending key order: the key, ":", padding, the value, "\n". The padding
// fills the key to 30 columns; a key longer than 30 gets (length - 30) spaces, capped at 30.
// Values are rendered by the key's registered metadata type: GUID text, the string itself,
// unsigned, signed 32-bit and 64-bit decimals; other or unregistered keys by Variant::toString.
// An empty (or null) record gives no text.
//
// Thread safety: reentrant; the record must not change while it is dumped.

// Appends the dump of `record` to `out`.
void sprintTags(String& out, Map<String, Variant> const& record);
void sprintTags(String& out, SmartPtr<Map<String, Variant>> const& record);

// Writes the dump to standard output.
void printTags(Map<String, Variant> record);
void printTags(SmartPtr<Map<String, Variant>> const& record);

}  // namespace trelm
