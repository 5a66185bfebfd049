#pragma once

#include <map>
#include <set>

#include "trelm/Mutex.h"

#include "FacebookSource.h"
#include "trelm/GUID.h"
#include "trelm/Map.h"
#include "trelm/Metadata.h"
#include "trelm/Set.h"
#include "trelm/SmartPtr.h"
#include "trelm/String.h"
#include "trelm/Variant.h"
#include "trelm/uError.h"

namespace trelm {

// Gives every service object a GUID that stays the same while some open cursor refers to it, and
// keeps the converted record of each item so that the host can fetch it again by GUID.
//
// Users work under tags handed out by getTag, one per cursor. A cursor registers the service ids
// (getGuid) and records (setItem) it produces under its tag and releases them with clearMapping
// and clearItems when it refills its window or goes away. A mapping or record lives as long as at
// least one tag holds it; there is no other eviction and nothing is persisted.
//
//   cache.getTag(tag);
//   cache.getGuid(tag, SidMapKey(contactIdKey, "1234"), true, guid);
//   record->insert("core_object_id", guid);
//   cache.setItem(tag, contactIdKey, record);
//   ...
//   cache.clearMapping(tag);
//   cache.clearItems(tag);
//
// Invariants, holding whenever the mutex is free (checkInvariants verifies them):
//   - every sidMap_ entry's refCount equals the number of tagSids_ sets holding its key, and is >= 1;
//   - every objMap_ entry's refCount equals the number of tagObjs_ sets holding its GUID, and is >= 1;
//   - every key in a tagSids_ set is in sidMap_, every GUID in a tagObjs_ set is in objMap_;
//   - no tag has an empty set.
// sidMap_ and objMap_ are independent: a GUID may be mapped without a stored record and a record
// stored without a mapping.
//
// Ownership: shared by SmartPtr between the source and its cursors. Stored records are shared with
// their producer, never copied.
// Thread safety: setup() must run once before anything else; after that every operation may be
// called from any thread and reads and changes the cache's maps only under the one mutex. What
// an operation allocates (a new key's map and set entries, its GUID) is made before it takes the
// mutex, and what it releases (entries, records) is freed after it lets go, so that the time
// under the mutex is searching and linking only.
class FacebookSource::MappingCache {
public:
    // A service id together with the record key it belongs to (which kind of id it is).
    // Ordered by key name, then sid; the key's type code is deliberately ignored, so two keys with
    // the same name and different type codes are the same key.
    class SidMapKey {
    public:
        SidMapKey() = default;
        SidMapKey(Metadata::Key const& key, String const& sid) : key(key), sid(sid) {}

        friend bool operator<(SidMapKey const& a, SidMapKey const& b) {
            // One pass over the names (usually equal: one kind of id per cursor), the same
            // byte order as String's operator<.
            int const byName = a.key.name().view().compare(b.key.name().view());
            if (byName != 0) return byName < 0;
            return a.sid < b.sid;
        }
        friend bool operator==(SidMapKey const& a, SidMapKey const& b) {
            return a.key.name() == b.key.name() && a.sid == b.sid;
        }
        friend bool operator!=(SidMapKey const& a, SidMapKey const& b) { return !(a == b); }

        Metadata::Key key;
        String sid;
    };

    struct SidMapValue {
        GUID guid;
        unsigned refCount = 0;  // tags whose key set holds this key
    };

    struct ObjMapValue {
        SmartPtr<Map<String, Variant>> item;  // shared with its producer
        unsigned refCount = 0;                // tags whose GUID set holds this GUID
    };

    // Sizes, for tests and benchmarks.
    struct Snapshot {
        unsigned sidEntries = 0;
        unsigned objEntries = 0;
        unsigned sidTags = 0;  // tags holding at least one service-id key
        unsigned objTags = 0;  // tags holding at least one record
    };

    // Empty maps, tag counter 0. The mutex is made by setup().
    MappingCache();
    ~MappingCache();
    MappingCache(MappingCache const&) = delete;
    MappingCache& operator=(MappingCache const&) = delete;

    // Makes the mutex. kResource when it can't be made; kInvalid when called a second time.
    // Every other operation fails with kNotSet before a successful setup.
    uError setup();

    // A tag never handed out before by this cache: "0", "1", "2", ...
    uError getTag(String& tag);

    // The GUID of `key`, registered under `tag`. An unknown key gets a fresh GUID when `create`
    // is true and fails with kNotFound (nothing changed) when it is false. Asking again under the
    // same tag returns the same GUID without counting the tag twice.
    uError getGuid(String const& tag, SidMapKey const& key, bool create, GUID& guid);

    // Stores `item` under the GUID of its "core_object_id" field, registered under `tag`; a record
    // already stored under that GUID is replaced. `key` is not used: a record's identity is always
    // its "core_object_id". kInvalid for a null item or one without "core_object_id"; the
    // conversion's error when that field holds no GUID.
    uError setItem(String const& tag, Metadata::Key const& key, SmartPtr<Map<String, Variant>> const& item);

    // Makes `item` share the record stored under `guid`; kNotFound (item untouched) when none is.
    uError getItem(GUID const& guid, SmartPtr<Map<String, Variant>>& item);

    // Releases the service-id keys, or the records, that `tag` holds. An unknown tag is success.
    uError clearMapping(String const& tag);
    uError clearItems(String const& tag);

    // Verifies the invariants above; kInvalid with a message naming the first broken one.
    // `snapshot` (optional) receives the sizes.
    uError checkInvariants(Snapshot* snapshot = nullptr);

private:
    // The standard containers themselves, for their node handles: an entry is made in a node
    // outside the mutex and linked in under it, and unlinked under it and freed outside.
    using SidMap = std::map<SidMapKey, SidMapValue>;
    using ObjMap = std::map<GUID, ObjMapValue>;
    using SidSet = std::set<SidMapKey>;
    using GuidSet = std::set<GUID>;
    using TagSids = std::map<String, SidSet>;
    using TagObjs = std::map<String, GuidSet>;

    // Made by setup (made() is constant afterwards); guards the five members below.
    Mutex mutex_;
    SidMap sidMap_ TRELM_GUARDED_BY(mutex_);
    ObjMap objMap_ TRELM_GUARDED_BY(mutex_);
    TagSids tagSids_ TRELM_GUARDED_BY(mutex_);
    TagObjs tagObjs_ TRELM_GUARDED_BY(mutex_);
    unsigned tagCounter_ TRELM_GUARDED_BY(mutex_) = 0;
};

}  // namespace trelm
