#pragma once

#include <initializer_list>
#include <new>
#include <stdexcept>
#include <utility>
#include <vector>

#include "trelm/uError.h"

namespace trelm {

// Growable array over std::vector. The operations that can grow report kOutOfMemory instead of
// throwing when memory can't be had; an index out of range is reported as kInvalid.
// Thread safety: as std::vector.
template <class T>
class Vector {
public:
    using value_type = T;
    using iterator = typename std::vector<T>::iterator;
    using const_iterator = typename std::vector<T>::const_iterator;

    Vector() = default;
    // The growth step of the original container interface; the standard vector grows
    // geometrically, so it is accepted and ignored.
    explicit Vector(unsigned /*growthStep*/) {}
    Vector(std::initializer_list<T> values) : v_(values) {}
    explicit Vector(std::vector<T> values) : v_(std::move(values)) {}

    uError resize(unsigned n) {
        try {
            v_.resize(n);
        } catch (std::bad_alloc const&) {
            return TRELM_ERROR(kOutOfMemory);
        } catch (std::length_error const&) {
            return TRELM_ERROR(kOutOfMemory);
        }
        return TRELM_OK();
    }
    uError reserve(unsigned n) {
        try {
            v_.reserve(n);
        } catch (std::bad_alloc const&) {
            return TRELM_ERROR(kOutOfMemory);
        } catch (std::length_error const&) {
            return TRELM_ERROR(kOutOfMemory);
        }
        return TRELM_OK();
    }
    uError pushBack(T const& value) {
        try {
            v_.push_back(value);
        } catch (std::bad_alloc const&) {
            return TRELM_ERROR(kOutOfMemory);
        }
        return TRELM_OK();
    }
    uError pushBack(T&& value) {
        try {
            v_.push_back(std::move(value));
        } catch (std::bad_alloc const&) {
            return TRELM_ERROR(kOutOfMemory);
        }
        return TRELM_OK();
    }
    // Inserts before index pos; pos == size() appends. pos > size() gives kInvalid.
    uError insert(unsigned pos, T const& value) {
        if (pos > v_.size()) return TRELM_ERROR(kInvalid);
        try {
            v_.insert(v_.begin() + pos, value);
        } catch (std::bad_alloc const&) {
            return TRELM_ERROR(kOutOfMemory);
        }
        return TRELM_OK();
    }
    // Removes the element at pos; pos >= size() gives kInvalid.
    uError erase(unsigned pos) {
        if (pos >= v_.size()) return TRELM_ERROR(kInvalid);
        v_.erase(v_.begin() + pos);
        return TRELM_OK();
    }

    // REQUIRES: i < size().
    T& operator[](unsigned i) { return v_[i]; }
    T const& operator[](unsigned i) const { return v_[i]; }

    unsigned size() const noexcept { return static_cast<unsigned>(v_.size()); }
    bool empty() const noexcept { return v_.empty(); }
    void clear() noexcept { v_.clear(); }

    iterator begin() noexcept { return v_.begin(); }
    iterator end() noexcept { return v_.end(); }
    const_iterator begin() const noexcept { return v_.begin(); }
    const_iterator end() const noexcept { return v_.end(); }

    std::vector<T> const& vec() const noexcept { return v_; }
    std::vector<T>& vec() noexcept { return v_; }

    friend bool operator==(Vector const& a, Vector const& b) { return a.v_ == b.v_; }
    friend bool operator!=(Vector const& a, Vector const& b) { return !(a.v_ == b.v_); }
    // Lexicographic by T::operator<.
    friend bool operator<(Vector const& a, Vector const& b) { return a.v_ < b.v_; }

private:
    std::vector<T> v_;
};

}  // namespace trelm
