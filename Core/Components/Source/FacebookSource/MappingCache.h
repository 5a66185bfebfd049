#pragma once

#include <map>
#include <vector>

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
//   - every service-id entry's refCount equals the number of tags holding it (the tags listed
//     in its holders, each of which lists the entry once), and is >= 1; likewise for records;
//   - every entry a tag lists is in the cache;
//   - no tag holds an empty list.
// Service-id entries and records are independent: a GUID may be mapped without a stored record
// and a record stored without a mapping.
//
// Ownership: shared by SmartPtr between the source and its cursors. Stored records are shared with
// their producer, never copied.
// Thread safety: setup() must run once before anything else; after that every operation may be
// called from any thread and reads and changes the cache's maps only under the one mutex. What
// an operation allocates (a new key's entry, its GUID) is made before it takes the mutex, and
// what it releases (entries, records) is freed after it lets go, so that the time under the
// mutex is searching and linking only. (The first id of a key name or of a tag, a tag's list
// growing, and an entry gaining a second holder allocate under the mutex; each is rare against
// the entries.)
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
        unsigned refCount;  // tags holding this key
    };

    struct ObjMapValue {
        SmartPtr<Map<String, Variant>> item;  // shared with its producer
        unsigned refCount;                    // tags holding this record
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
    // The tags holding one entry: nearly always exactly one, kept inline; further ones in a
    // vector that stays unallocated until a second tag holds the entry. A tag is named by the
    // address of its list (stable while the tag holds anything).
    template <class List>
    class Holders {
    public:
        Holders() noexcept : first_(nullptr) {}

        bool contains(List const* tag) const noexcept {
            if (first_ == tag) return true;
            for (List const* other : more_) {
                if (other == tag) return true;
            }
            return false;
        }
        // REQUIRES: !contains(tag). Throws std::bad_alloc (nothing changed) when the vector
        // cannot grow.
        void add(List const* tag) {
            if (first_ == nullptr) {
                first_ = tag;
            } else {
                more_.push_back(tag);
            }
        }
        // REQUIRES: contains(tag). Never allocates.
        void remove(List const* tag) noexcept {
            if (first_ == tag) {
                if (more_.empty()) {
                    first_ = nullptr;
                    return;
                }
                first_ = more_.back();
                more_.pop_back();
                return;
            }
            for (auto& other : more_) {
                if (other == tag) {
                    other = more_.back();
                    more_.pop_back();
                    return;
                }
            }
        }
        unsigned count() const noexcept { return (first_ != nullptr ? 1u : 0u) + static_cast<unsigned>(more_.size()); }
        template <class F>
        void forEach(F&& f) const {
            if (first_ != nullptr) f(first_);
            for (List const* other : more_) f(other);
        }

    private:
        List const* first_;
        std::vector<List const*> more_;
    };

    struct SidList;
    struct ObjList;
    struct SidEntry {
        SidMapValue value;
        Holders<SidList> holders;
    };
    struct ObjEntry {
        ObjMapValue value;
        Holders<ObjList> holders;
    };

    // Service ids are kept by key name, then by sid: one small map of names, and per name a map
    // whose entries hold their sid once, without the key name. The standard containers
    // themselves, for their node handles: an entry is made in a node outside the mutex and linked
    // in under it, and unlinked under it and freed outside.
    using SidBucket = std::map<String, SidEntry>;
    using SidBuckets = std::map<String, SidBucket>;
    using ObjMap = std::map<GUID, ObjEntry>;

    // What a tag holds, in the order it took it. An entry released by clearing the tag is
    // unlinked into its reference's `released`, so that the list, taken out of the cache, frees
    // it after the mutex is let go.
    struct SidRef {
        SidBucket* bucket;
        SidBucket::iterator at;
        SidBucket::node_type released;
    };
    struct ObjRef {
        ObjMap::iterator at;
        ObjMap::node_type released;
    };
    struct SidList {
        std::vector<SidRef> refs;
    };
    struct ObjList {
        std::vector<ObjRef> refs;
    };
    using TagSids = std::map<String, SidList>;
    using TagObjs = std::map<String, ObjList>;

    // Made by setup (made() is constant afterwards); guards the five members below.
    Mutex mutex_;
    SidBuckets sidMap_ TRELM_GUARDED_BY(mutex_);
    ObjMap objMap_ TRELM_GUARDED_BY(mutex_);
    TagSids tagSids_ TRELM_GUARDED_BY(mutex_);
    TagObjs tagObjs_ TRELM_GUARDED_BY(mutex_);
    unsigned tagCounter_ TRELM_GUARDED_BY(mutex_) = 0;
};

}  // namespace trelm
