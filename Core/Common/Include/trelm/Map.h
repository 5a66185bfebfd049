#pragma once

#include <map>
#include <new>
#include <utility>

#include "trelm/uError.h"

namespace trelm {

// Ordered associative container over std::map, keyed by K::operator<. Iteration runs in
// ascending key order and yields std::pair<K const, V> (`first` = key, `second` = value).
// Thread safety: as std::map.
template <class K, class V>
class Map {
public:
    using key_type = K;
    using mapped_type = V;
    using iterator = typename std::map<K, V>::iterator;
    using const_iterator = typename std::map<K, V>::const_iterator;

    Map() = default;
    Map(std::initializer_list<std::pair<K const, V>> values) : m_(values) {}

    // Adds the entry, or replaces the value of an equal key; success in both cases.
    // kOutOfMemory when a node can't be allocated (the map is then unchanged).
    uError insert(K const& key, V const& value) {
        try {
            m_.insert_or_assign(key, value);
        } catch (std::bad_alloc const&) {
            return TRELM_ERROR(kOutOfMemory);
        }
        return TRELM_OK();
    }
    uError insert(K const& key, V&& value) {
        try {
            m_.insert_or_assign(key, std::move(value));
        } catch (std::bad_alloc const&) {
            return TRELM_ERROR(kOutOfMemory);
        }
        return TRELM_OK();
    }

    // Adds the entry unless an equal key is present, in which case the map is unchanged (and
    // `value` not moved from); success in both cases. kOutOfMemory when a node can't be allocated.
    uError insertIfAbsent(K const& key, V&& value) {
        try {
            m_.try_emplace(key, std::move(value));
        } catch (std::bad_alloc const&) {
            return TRELM_ERROR(kOutOfMemory);
        }
        return TRELM_OK();
    }

    // The value stored under key, or null. The pointer stays valid until that entry is removed.
    V* search(K const& key) {
        auto it = m_.find(key);
        return it == m_.end() ? nullptr : &it->second;
    }
    V const* search(K const& key) const {
        auto it = m_.find(key);
        return it == m_.end() ? nullptr : &it->second;
    }
    bool contains(K const& key) const { return m_.find(key) != m_.end(); }

    // Removes the entry of key; success also when there was none.
    uError remove(K const& key) {
        m_.erase(key);
        return TRELM_OK();
    }

    unsigned size() const noexcept { return static_cast<unsigned>(m_.size()); }
    bool empty() const noexcept { return m_.empty(); }
    void clear() noexcept { m_.clear(); }

    iterator begin() noexcept { return m_.begin(); }
    iterator end() noexcept { return m_.end(); }
    const_iterator begin() const noexcept { return m_.begin(); }
    const_iterator end() const noexcept { return m_.end(); }

    std::map<K, V> const& map() const noexcept { return m_; }

    friend bool operator==(Map const& a, Map const& b) { return a.m_ == b.m_; }
    friend bool operator!=(Map const& a, Map const& b) { return !(a.m_ == b.m_); }

private:
    std::map<K, V> m_;
};

}  // namespace trelm
