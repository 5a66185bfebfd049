#include "MappingCache.h"

#include <iterator>
#include <new>
#include <set>
#include <string_view>
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
    // A new key's entry, made before locking; unused, it is freed after unlocking.
    SidBucket::node_type entryNode;
    if (create) {
        try {
            entryNode = makeNode<SidBucket>(key.sid, SidEntry{SidMapValue{GUID::generate(), 1}, {}});
        } catch (std::bad_alloc const&) {
            return TRELM_ERROR(kOutOfMemory);
        }
    }

    TRELM_CACHE_LOCK(lock);
    auto bucket = sidMap_.find(key.key.name());
    if (bucket == sidMap_.end()) {
        if (!create) return TRELM_ERROR(kNotFound);
        // The first id of a key name: its map is made here, once per name.
        try {
            bucket = sidMap_.emplace(key.key.name(), SidBucket()).first;
        } catch (std::bad_alloc const&) {
            return TRELM_ERROR(kOutOfMemory);
        }
    }
    SidBucket& sids = bucket->second;
    auto tagList = tagSids_.find(tag);
    // Where the key is or would go: the first entry not below it, which serves both the lookup
    // and the insertion of a new key. A cursor registers its ids mostly in ascending order, so
    // the place right after the tag's last id is tried first, and searched for only otherwise.
    auto at = sids.end();
    bool placed = false;
    if (tagList != tagSids_.end() && !tagList->second.refs.empty()) {
        SidRef const& last = tagList->second.refs.back();
        if (last.bucket == &sids && last.at->first < key.sid) {
            at = std::next(last.at);
            placed = at == sids.end() || !(at->first < key.sid);
        }
    }
    if (!placed) at = sids.lower_bound(key.sid);
    bool const known = at != sids.end() && !(key.sid < at->first);
    if (!known && !create) return TRELM_ERROR(kNotFound);

    bool const newTag = tagList == tagSids_.end();
    try {
        if (newTag) tagList = tagSids_.emplace(tag, SidList()).first;
        SidList& list = tagList->second;
        // Room for the reference first, so that nothing below can fail half-way.
        if (list.refs.size() == list.refs.capacity()) list.refs.reserve(list.refs.size() * 2 + 16);
        if (known) {
            SidEntry& entry = at->second;
            if (!entry.holders.contains(&list)) {
                entry.holders.add(&list);
                ++entry.value.refCount;
                list.refs.push_back(SidRef{&sids, at, {}});
            }
            guid = entry.value.guid;
        } else {
            auto const added = sids.insert(at, std::move(entryNode));
            added->second.holders.add(&list);
            list.refs.push_back(SidRef{&sids, added, {}});
            guid = added->second.value.guid;
        }
    } catch (std::bad_alloc const&) {
        // Only the allocations before any change can fail; a tag made here holds nothing yet.
        if (newTag && tagList != tagSids_.end() && tagList->second.refs.empty()) tagSids_.erase(tagList);
        return TRELM_ERROR(kOutOfMemory);
    }
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
    TRELM_RETURN_IF_ERROR(idValue->as(guid));

    // The new entry, made before locking. When the GUID is stored already, the stored record is
    // swapped into it instead, and so released with it after unlocking.
    ObjMap::node_type entryNode;
    try {
        entryNode = makeNode<ObjMap>(guid, ObjEntry{ObjMapValue{item, 1}, {}});
    } catch (std::bad_alloc const&) {
        return TRELM_ERROR(kOutOfMemory);
    }

    TRELM_CACHE_LOCK(lock);
    auto tagList = tagObjs_.find(tag);
    bool const newTag = tagList == tagObjs_.end();
    try {
        if (newTag) tagList = tagObjs_.emplace(tag, ObjList()).first;
        ObjList& list = tagList->second;
        if (list.refs.size() == list.refs.capacity()) list.refs.reserve(list.refs.size() * 2 + 16);
        auto const at = objMap_.lower_bound(guid);
        if (at != objMap_.end() && !(guid < at->first)) {
            ObjEntry& entry = at->second;
            if (!entry.holders.contains(&list)) {
                entry.holders.add(&list);
                ++entry.value.refCount;
                list.refs.push_back(ObjRef{at, {}});
            }
            std::swap(entry.value.item, entryNode.mapped().value.item);
        } else {
            auto const added = objMap_.insert(at, std::move(entryNode));
            added->second.holders.add(&list);
            list.refs.push_back(ObjRef{added, {}});
        }
    } catch (std::bad_alloc const&) {
        if (newTag && tagList != tagObjs_.end() && tagList->second.refs.empty()) tagObjs_.erase(tagList);
        return TRELM_ERROR(kOutOfMemory);
    }
    return TRELM_OK();
}

uError FacebookSource::MappingCache::getItem(GUID const& guid, SmartPtr<Map<String, Variant>>& item) {
    TRELM_CACHE_LOCK(lock);
    auto const found = objMap_.find(guid);
    if (found == objMap_.end()) return TRELM_ERROR(kNotFound);
    item = found->second.value.item;
    return TRELM_OK();
}

uError FacebookSource::MappingCache::clearMapping(String const& tag) {
    // The tag's list, with the entries it was the last to hold, taken out under the lock and
    // freed after it.
    TagSids::node_type tagNode;
    TRELM_CACHE_LOCK(lock);
    auto const tagList = tagSids_.find(tag);
    if (tagList == tagSids_.end()) return TRELM_OK();
    SidList const* const holder = &tagList->second;
    for (SidRef& ref : tagList->second.refs) {
        SidEntry& entry = ref.at->second;
        entry.holders.remove(holder);
        if (--entry.value.refCount == 0) ref.released = ref.bucket->extract(ref.at);
    }
    tagNode = tagSids_.extract(tagList);
    return TRELM_OK();
}

uError FacebookSource::MappingCache::clearItems(String const& tag) {
    // As clearMapping; the records nobody else holds go with their entries.
    TagObjs::node_type tagNode;
    TRELM_CACHE_LOCK(lock);
    auto const tagList = tagObjs_.find(tag);
    if (tagList == tagObjs_.end()) return TRELM_OK();
    ObjList const* const holder = &tagList->second;
    for (ObjRef& ref : tagList->second.refs) {
        ObjEntry& entry = ref.at->second;
        entry.holders.remove(holder);
        if (--entry.value.refCount == 0) ref.released = objMap_.extract(ref.at);
    }
    tagNode = tagObjs_.extract(tagList);
    return TRELM_OK();
}

namespace {

// One entry of the cache (a service id's or a record's) as the check sees it.
template <class Holders>
struct Held {
    void const* entry;
    unsigned refCount;
    Holders const* holders;
};

// Checks one kind of entry against the tags' lists. `entryOf` gives the entry a tag's reference
// points to.
template <class Lists, class Holders, class EntryOf>
uError checkHolding(char const* kind, Lists const& lists, std::vector<Held<Holders>> const& held, EntryOf entryOf) {
    std::set<void const*> liveLists;
    for (auto const& [tag, list] : lists) liveLists.insert(&list);
    std::map<void const*, unsigned> entries;  // every entry of the cache -> its refCount
    for (Held<Holders> const& h : held) {
        entries.emplace(h.entry, h.refCount);
        if (h.refCount == 0 || h.refCount != h.holders->count()) {
            return TRELM_ERROR_MSG(kInvalid, String(kind) + " entry with a wrong reference count");
        }
        bool gone = false;
        h.holders->forEach([&](void const* holder) { gone = gone || liveLists.count(holder) == 0; });
        if (gone) return TRELM_ERROR_MSG(kInvalid, String(kind) + " entry held by a tag that is gone");
    }
    std::map<void const*, unsigned> listed;  // entry -> number of tags listing it
    for (auto const& [tag, list] : lists) {
        if (list.refs.empty()) return TRELM_ERROR_MSG(kInvalid, "tag " + tag + " holds an empty " + kind + " list");
        for (auto const& ref : list.refs) {
            void const* entry = entryOf(ref);
            if (entries.count(entry) == 0) {
                return TRELM_ERROR_MSG(kInvalid, "tag " + tag + " lists a " + kind + " entry not in the cache");
            }
            if (!ref.at->second.holders.contains(&list)) {
                return TRELM_ERROR_MSG(kInvalid, "tag " + tag + " lists a " + kind + " entry that it does not hold");
            }
            ++listed[entry];
        }
    }
    for (auto const& [entry, refCount] : entries) {
        auto const n = listed.find(entry);
        if (n == listed.end() || n->second != refCount) {
            return TRELM_ERROR_MSG(kInvalid, String(kind) + " entry listed by a wrong number of tags");
        }
    }
    return TRELM_OK();
}

}  // namespace

uError FacebookSource::MappingCache::checkInvariants(Snapshot* snapshot) {
    TRELM_CACHE_LOCK(lock);
    try {
        std::vector<Held<Holders<SidList>>> sids;
        for (auto const& [name, bucket] : sidMap_) {
            for (auto const& [sid, entry] : bucket) sids.push_back({&entry, entry.value.refCount, &entry.holders});
        }
        TRELM_RETURN_IF_ERROR(checkHolding("service id", tagSids_, sids,
                                           [](SidRef const& ref) -> void const* { return &ref.at->second; }));
        std::vector<Held<Holders<ObjList>>> objs;
        for (auto const& [guid, entry] : objMap_) objs.push_back({&entry, entry.value.refCount, &entry.holders});
        TRELM_RETURN_IF_ERROR(
            checkHolding("record", tagObjs_, objs, [](ObjRef const& ref) -> void const* { return &ref.at->second; }));
        if (snapshot != nullptr) {
            snapshot->sidEntries = static_cast<unsigned>(sids.size());
            snapshot->objEntries = static_cast<unsigned>(objs.size());
            snapshot->sidTags = static_cast<unsigned>(tagSids_.size());
            snapshot->objTags = static_cast<unsigned>(tagObjs_.size());
        }
    } catch (std::bad_alloc const&) {
        return TRELM_ERROR(kOutOfMemory);
    }
    return TRELM_OK();
}

#undef TRELM_CACHE_LOCK

}  // namespace trelm
