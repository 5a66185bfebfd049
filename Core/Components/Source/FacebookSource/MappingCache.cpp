#include "MappingCache.h"

#include "trelm/Mutex.h"

namespace trelm {

FacebookSource::MappingCache::MappingCache() = default;

FacebookSource::MappingCache::~MappingCache() = default;

uError FacebookSource::MappingCache::setup() {
    if (mutex_.made()) return TRELM_ERROR_MSG(kInvalid, "mapping cache set up twice");
    if (mutex_.init() != 0) return TRELM_ERROR(kResource);
    return TRELM_OK();
}

// Each operation below locks with a MutexLock; a failure to lock is reported, never ignored,
// because running unlocked would break the invariants for every other user of the cache.
#define TRELM_CACHE_LOCK(guard)                                                      \
    if (!mutex_.made()) return TRELM_ERROR_MSG(kNotSet, "mapping cache not set up"); \
    MutexLock guard(mutex_);                                                         \
    if (!guard.locked()) return TRELM_ERROR(kResource)

uError FacebookSource::MappingCache::getTag(String& tag) {
    TRELM_CACHE_LOCK(lock);
    tag = String::from(tagCounter_);
    ++tagCounter_;
    return TRELM_OK();
}

uError FacebookSource::MappingCache::getGuid(String const& tag, SidMapKey const& key, bool create, GUID& guid) {
    TRELM_CACHE_LOCK(lock);
    SidMapValue* found = sidMap_.search(key);
    if (found == nullptr && !create) return TRELM_ERROR(kNotFound);

    // The tag's set is updated first: if it cannot grow, sidMap_ is still as it was and the
    // counts stay consistent. A key that sidMap_ lacks is in no tag's set, so for a new key the
    // insertion always adds it; for a known one the set's size tells whether the tag held it.
    Set<SidMapKey>* tagSet = tagSids_.search(tag);
    bool added = true;
    if (tagSet == nullptr) {
        Set<SidMapKey> fresh;
        TRELM_RETURN_IF_ERROR(fresh.insert(key));
        TRELM_RETURN_IF_ERROR(tagSids_.insert(tag, std::move(fresh)));
    } else {
        unsigned const before = tagSet->size();
        TRELM_RETURN_IF_ERROR(tagSet->insert(key));
        added = tagSet->size() != before;
    }

    if (found != nullptr) {
        if (added) ++found->refCount;
        guid = found->guid;
        return TRELM_OK();
    }
    SidMapValue value;
    value.guid = GUID::generate();
    value.refCount = 1;
    uError err = sidMap_.insert(key, value);
    if (err.failed()) {
        // Undo the tag's membership so that no tag holds a key that sidMap_ lacks.
        Set<SidMapKey>* set = tagSids_.search(tag);
        // Removing what was just inserted cannot fail: nothing is allocated.
        set->remove(key).ignore();
        if (set->empty()) tagSids_.remove(tag).ignore();
        return err;
    }
    guid = value.guid;
    return TRELM_OK();
}

uError FacebookSource::MappingCache::setItem(String const& tag, Metadata::Key const& /*key*/,
                                             SmartPtr<Map<String, Variant>> const& item) {
    TRELM_CACHE_LOCK(lock);
    if (!item) return TRELM_ERROR_MSG(kInvalid, "null record");
    static String const objectIdKey("core_object_id");
    Variant const* idValue = item->search(objectIdKey);
    if (idValue == nullptr) return TRELM_ERROR_MSG(kInvalid, "record without core_object_id");
    GUID guid;
    uError err = idValue->as(guid);
    if (err.failed()) return err;

    Set<GUID>* tagSet = tagObjs_.search(tag);
    bool const tagHeld = tagSet != nullptr && tagSet->contains(guid);

    ObjMapValue value;
    value.item = item;
    if (ObjMapValue const* found = objMap_.search(guid)) {
        value.refCount = found->refCount + (tagHeld ? 0 : 1);
    } else {
        value.refCount = 1;
    }

    if (!tagHeld) {
        if (tagSet == nullptr) {
            Set<GUID> fresh;
            TRELM_RETURN_IF_ERROR(fresh.insert(guid));
            TRELM_RETURN_IF_ERROR(tagObjs_.insert(tag, std::move(fresh)));
        } else {
            TRELM_RETURN_IF_ERROR(tagSet->insert(guid));
        }
    }
    err = objMap_.insert(guid, std::move(value));
    if (err.failed()) {
        if (!tagHeld) {
            Set<GUID>* set = tagObjs_.search(tag);
            // Removing what was just inserted cannot fail: nothing is allocated.
            set->remove(guid).ignore();
            if (set->empty()) tagObjs_.remove(tag).ignore();
        }
        return err;
    }
    return TRELM_OK();
}

uError FacebookSource::MappingCache::getItem(GUID const& guid, SmartPtr<Map<String, Variant>>& item) {
    TRELM_CACHE_LOCK(lock);
    ObjMapValue const* found = objMap_.search(guid);
    if (found == nullptr) return TRELM_ERROR(kNotFound);
    item = found->item;
    return TRELM_OK();
}

uError FacebookSource::MappingCache::clearMapping(String const& tag) {
    TRELM_CACHE_LOCK(lock);
    Set<SidMapKey> const* tagSet = tagSids_.search(tag);
    if (tagSet == nullptr) return TRELM_OK();
    for (SidMapKey const& key : *tagSet) {
        SidMapValue* value = sidMap_.search(key);
        if (value == nullptr) continue;
        if (value->refCount <= 1) {
            TRELM_RETURN_IF_ERROR(sidMap_.remove(key));
        } else {
            --value->refCount;
        }
    }
    return tagSids_.remove(tag);
}

uError FacebookSource::MappingCache::clearItems(String const& tag) {
    TRELM_CACHE_LOCK(lock);
    Set<GUID> const* tagSet = tagObjs_.search(tag);
    if (tagSet == nullptr) return TRELM_OK();
    for (GUID const& guid : *tagSet) {
        ObjMapValue* value = objMap_.search(guid);
        if (value == nullptr) continue;
        if (value->refCount <= 1) {
            TRELM_RETURN_IF_ERROR(objMap_.remove(guid));
        } else {
            --value->refCount;
        }
    }
    return tagObjs_.remove(tag);
}

uError FacebookSource::MappingCache::checkInvariants(Snapshot* snapshot) {
    TRELM_CACHE_LOCK(lock);
    Map<SidMapKey, unsigned> sidHolders;
    for (auto const& [tag, keys] : tagSids_) {
        if (keys.empty()) return TRELM_ERROR_MSG(kInvalid, "tag " + tag + " holds an empty key set");
        for (SidMapKey const& key : keys) {
            if (!sidMap_.contains(key)) return TRELM_ERROR_MSG(kInvalid, "tag " + tag + " holds an unmapped key");
            unsigned* n = sidHolders.search(key);
            TRELM_RETURN_IF_ERROR(sidHolders.insert(key, n ? *n + 1 : 1u));
        }
    }
    for (auto const& [key, value] : sidMap_) {
        unsigned const* n = sidHolders.search(key);
        if (n == nullptr || value.refCount != *n) {
            return TRELM_ERROR_MSG(kInvalid, "service id " + key.sid + " has a wrong reference count");
        }
    }
    Map<GUID, unsigned> objHolders;
    for (auto const& [tag, guids] : tagObjs_) {
        if (guids.empty()) return TRELM_ERROR_MSG(kInvalid, "tag " + tag + " holds an empty record set");
        for (GUID const& guid : guids) {
            if (!objMap_.contains(guid)) return TRELM_ERROR_MSG(kInvalid, "tag " + tag + " holds a missing record");
            unsigned* n = objHolders.search(guid);
            TRELM_RETURN_IF_ERROR(objHolders.insert(guid, n ? *n + 1 : 1u));
        }
    }
    for (auto const& [guid, value] : objMap_) {
        unsigned const* n = objHolders.search(guid);
        if (n == nullptr || value.refCount != *n) {
            return TRELM_ERROR_MSG(kInvalid, "record " + guid.toString() + " has a wrong reference count");
        }
    }
    if (snapshot != nullptr) {
        snapshot->sidEntries = sidMap_.size();
        snapshot->objEntries = objMap_.size();
        snapshot->sidTags = tagSids_.size();
        snapshot->objTags = tagObjs_.size();
    }
    return TRELM_OK();
}

#undef TRELM_CACHE_LOCK

}  // namespace trelm
