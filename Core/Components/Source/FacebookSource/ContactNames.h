#pragma once

#include "FacebookLibrary.h"
#include "trelm/Map.h"
#include "trelm/SmartPtr.h"
#include "trelm/String.h"
#include "trelm/Variant.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {

// The display names of the authors of event records (their "core_event_contactid"), looked up
// with one FQL statement per window of records and remembered for the life of the owner, so
// that each author is asked for once:
//
//   select uid,name from user where uid in (12,34,34)
//
// The ids are listed as the records give them, unknown ones only, without removing repeats.
//
// Ownership: a value owned by one cursor; the client is the cursor's and is passed per call.
// Thread safety: none; used from its cursor's thread.
class ContactNames {
public:
    using RecordPtr = SmartPtr<Map<String, Variant>>;

    // Looks up the authors of `records` that are not known yet, then sets "core_event_contactname"
    // (and "core_event_contactfullname" too when `withFullName`) on every record whose author is
    // known. A failed lookup is returned and no record is changed.
    uError annotate(FacebookLibrary& library, Vector<RecordPtr>& records, bool withFullName);

    // One statement for `uids`; an empty list asks nothing. Answer rows lacking "uid" or "name"
    // are passed over. kNoData (not a failure) when a name could not be stored.
    uError lookUp(FacebookLibrary& library, Vector<String> const& uids);

    // The name of `uid`, or null when it is not known.
    String const* find(String const& uid) const { return names_.search(uid); }

private:
    Map<String, String> names_;  // service user id to display name; only grows
};

}  // namespace trelm
