#pragma once

#include <initializer_list>
#include <new>
#include <set>

#include "trelm/uError.h"

namespace trelm {

// Ordered set over std::set, ordered by T::operator<; equal values are kept once. Iteration runs
// in ascending order.
// Thread safety: as std::set.
template <class T>
class Set {
public:
    using value_type = T;
    using const_iterator = typename std::set<T>::const_iterator;
    using iterator = const_iterator;

    Set() = default;
    Set(std::initializer_list<T> values) : s_(values) {}

    // Adds value unless an equal one is present (success either way).
    uError insert(T const& value) {
        try {
            s_.insert(value);
        } catch (std::bad_alloc const&) {
            return TRELM_ERROR(kOutOfMemory);
        }
        return TRELM_OK();
    }
    bool contains(T const& value) const { return s_.find(value) != s_.end(); }
    // Removes value; success also when it was absent.
    uError remove(T const& value) {
        s_.erase(value);
        return TRELM_OK();
    }

    unsigned size() const noexcept { return static_cast<unsigned>(s_.size()); }
    bool empty() const noexcept { return s_.empty(); }
    void clear() noexcept { s_.clear(); }

    const_iterator begin() const noexcept { return s_.begin(); }
    const_iterator end() const noexcept { return s_.end(); }

    std::set<T> const& set() const noexcept { return s_; }

    friend bool operator==(Set const& a, Set const& b) { return a.s_ == b.s_; }
    friend bool operator!=(Set const& a, Set const& b) { return !(a.s_ == b.s_); }

private:
    std::set<T> s_;
};

}  // namespace trelm
