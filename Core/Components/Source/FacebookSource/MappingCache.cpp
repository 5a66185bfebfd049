#include "MappingCache.h"

#include <new>
#include <utility>

#include "trelm/Mutex.h"

namespace trelm {

namespace {

// A detached node holding `value`, made without touching any shared container.
template <class Container, class... Args>
typename Container::node_type makeNode(Args&&... args) {
    Container scratch;
    scratch.emplace(std::forward<Args>(args)...);
    return scratch.extract(scratch.begin());
}

}  // namespace

FacebookSource::MappingCache::MappingCache() = default;

FacebookSource::MappingCache::~MappingCache() = default;

uError FacebookSource::MappingCache::setup() {
    if (mutex_.made()) return TRELM_ERROR_MSG(kInvalid, "mapping cache set up twice");
    if (mutex_.init() != 0) return TRELM_ERROR(kResource);
    return TRELM_OK();
}

// Each operation below locks with a MutexLock; a failure to lock is reported, never ignored,
// because running unlocked would break the invariants for every other user of the cache.
// Whatever an operation frees is declared before the lock, so that it is destroyed after the
// lock is let go.
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
    // What a new key needs, made before locking; unused parts are freed after unlocking.
    SidSet::node_type memberNode;
    SidMap::node_type entryNode;
    try {
        memberNode = makeNode<SidSet>(key);
        if (create) entryNode = makeNode<SidMap>(key, SidMapValue{GUID::generate(), 1});
    } catch (std::bad_alloc const&) {
        return TRELM_ERROR(kOutOfMemory);
    }

    TRELM_CACHE_LOCK(lock);
    // One search serves both the lookup and, for a new key, the insertion just before `at`.
    auto const at = sidMap_.lower_bound(key);
    bool const known = at != sidMap_.end() && !(key < at->first);
    if (!known && !create) return TRELM_ERROR(kNotFound);

    // A key that sidMap_ lacks is in no tag's set, so for a new key the insertion always adds it;
    // for a known one the insertion tells whether the tag held it.
    auto tagSet = tagSids_.find(tag);
    if (tagSet == tagSids_.end()) {
        // The first key of a tag: the tag's own entry is made here, once per tag.
        try {
            tagSet = tagSids_.emplace(tag, SidSet()).first;
        } catch (std::bad_alloc const&) {
            return TRELM_ERROR(kOutOfMemory);
        }
    }
    // A cursor registers its ids mostly in ascending order, so the end is tried first; a node
    // that is not taken stays in memberNode and is freed after unlocking.
    tagSet->second.insert(tagSet->second.end(), std::move(memberNode));
    bool const added = memberNode.empty();

    if (known) {
        if (added) ++at->second.refCount;
        guid = at->second.guid;
        return TRELM_OK();
    }
    guid = entryNode.mapped().guid;
    sidMap_.insert(at, std::move(entryNode));
    return TRELM_OK();
}

uError FacebookSource::MappingCache::setItem(String const& tag, Metadata::Key const& /*key*/,
                                             SmartPtr<Map<String, Variant>> const& item) {
    if (!mutex_.made()) return TRELM_ERROR_MSG(kNotSet, "mapping cache not set up");
    if (!item) return TRELM_ERROR_MSG(kInvalid, "null record");
    // The record is its producer's until stored, so it is read before locking.
    static String const objectIdKey("core_object_id");
    Variant const* idValue = item->search(objectIdKey);
    if (idValue == nullptr) return TRELM_ERROR_MSG(kInvalid, "record without core_object_id");
    GUID guid;
    uError err = idValue->as(guid);
    if (err.failed()) return err;

    GuidSet::node_type memberNode;
    ObjMap::node_type entryNode;
    SmartPtr<Map<String, Variant>> replaced;  // a record this one replaces, released after unlocking
    try {
        memberNode = makeNode<GuidSet>(guid);
        entryNode = makeNode<ObjMap>(guid, ObjMapValue{item, 1});
    } catch (std::bad_alloc const&) {
        return TRELM_ERROR(kOutOfMemory);
    }

    TRELM_CACHE_LOCK(lock);
    auto tagSet = tagObjs_.find(tag);
    if (tagSet == tagObjs_.end()) {
        try {
            tagSet = tagObjs_.emplace(tag, GuidSet()).first;
        } catch (std::bad_alloc const&) {
            return TRELM_ERROR(kOutOfMemory);
        }
    }
    auto inserted = tagSet->second.insert(std::move(memberNode));
    bool const added = inserted.inserted;
    if (!added) memberNode = std::move(inserted.node);  // freed after unlocking

    auto const at = objMap_.lower_bound(guid);
    if (at != objMap_.end() && !(guid < at->first)) {
        replaced = std::move(at->second.item);
        at->second.item = item;
        if (added) ++at->second.refCount;
        return TRELM_OK();
    }
    objMap_.insert(at, std::move(entryNode));
    return TRELM_OK();
}

uError FacebookSource::MappingCache::getItem(GUID const& guid, SmartPtr<Map<String, Variant>>& item) {
    TRELM_CACHE_LOCK(lock);
    auto const found = objMap_.find(guid);
    if (found == objMap_.end()) return TRELM_ERROR(kNotFound);
    item = found->second.item;
    return TRELM_OK();
}

uError FacebookSource::MappingCache::clearMapping(String const& tag) {
    // Unlinked under the lock, freed after it. The tag's set is in sidMap_'s order, so each
    // released entry goes at the end of `released` without a search.
    TagSids::node_type tagNode;
    SidMap released;
    TRELM_CACHE_LOCK(lock);
    auto const tagSet = tagSids_.find(tag);
    if (tagSet == tagSids_.end()) return TRELM_OK();
    for (SidMapKey const& key : tagSet->second) {
        auto const value = sidMap_.find(key);
        if (value == sidMap_.end()) continue;
        if (value->second.refCount <= 1) {
            released.insert(released.end(), sidMap_.extract(value));
        } else {
            --value->second.refCount;
        }
    }
    tagNode = tagSids_.extract(tagSet);
    return TRELM_OK();
}

uError FacebookSource::MappingCache::clearItems(String const& tag) {
    // Unlinked under the lock, freed after it (with the records nobody else holds). The tag's
    // set is in objMap_'s order, so each released entry goes at the end without a search.
    TagObjs::node_type tagNode;
    ObjMap released;
    TRELM_CACHE_LOCK(lock);
    auto const tagSet = tagObjs_.find(tag);
    if (tagSet == tagObjs_.end()) return TRELM_OK();
    for (GUID const& guid : tagSet->second) {
        auto const value = objMap_.find(guid);
        if (value == objMap_.end()) continue;
        if (value->second.refCount <= 1) {
            released.insert(released.end(), objMap_.extract(value));
        } else {
            --value->second.refCount;
        }
    }
    tagNode = tagObjs_.extract(tagSet);
    return TRELM_OK();
}

uError FacebookSource::MappingCache::checkInvariants(Snapshot* snapshot) {
    TRELM_CACHE_LOCK(lock);
    Map<SidMapKey, unsigned> sidHolders;
    for (auto const& [tag, keys] : tagSids_) {
        if (keys.empty()) return TRELM_ERROR_MSG(kInvalid, "tag " + tag + " holds an empty key set");
        for (SidMapKey const& key : keys) {
            if (sidMap_.count(key) == 0) return TRELM_ERROR_MSG(kInvalid, "tag " + tag + " holds an unmapped key");
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
            if (objMap_.count(guid) == 0) return TRELM_ERROR_MSG(kInvalid, "tag " + tag + " holds a missing record");
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
        snapshot->sidEntries = static_cast<unsigned>(sidMap_.size());
        snapshot->objEntries = static_cast<unsigned>(objMap_.size());
        snapshot->sidTags = static_cast<unsigned>(tagSids_.size());
        snapshot->objTags = static_cast<unsigned>(tagObjs_.size());
    }
    return TRELM_OK();
}

#undef TRELM_CACHE_LOCK

}  // namespace trelm
