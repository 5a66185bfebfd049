#pragma once

#include <cstddef>
#include <memory>
#include <utility>

namespace trelm {

// Shared owning pointer over std::shared_ptr. The reference count is updated atomically, so
// copies may be made and dropped on different threads; the object itself is not guarded.
// The object is deleted, through the type it was created with, when the last SmartPtr to it goes.
template <class T>
class SmartPtr {
public:
    using element_type = T;

    SmartPtr() noexcept = default;
    SmartPtr(std::nullptr_t) noexcept {}  // NOLINT: implicit by design
    // Takes ownership of p (which may be null).
    template <class U>
    explicit SmartPtr(U* p) : p_(p) {}
    SmartPtr(std::shared_ptr<T> p) noexcept : p_(std::move(p)) {}  // NOLINT
    // Derived-to-base conversion.
    template <class U>
    SmartPtr(SmartPtr<U> const& other) noexcept : p_(other.shared()) {}  // NOLINT

    T* get() const noexcept { return p_.get(); }
    T* operator->() const noexcept { return p_.get(); }
    T& operator*() const noexcept { return *p_; }
    explicit operator bool() const noexcept { return p_ != nullptr; }

    void reset() noexcept { p_.reset(); }
    template <class U>
    void reset(U* p) {
        p_.reset(p);
    }

    long useCount() const noexcept { return p_.use_count(); }
    std::shared_ptr<T> const& shared() const noexcept { return p_; }

    friend bool operator==(SmartPtr const& a, SmartPtr const& b) noexcept { return a.p_ == b.p_; }
    friend bool operator==(SmartPtr const& a, std::nullptr_t) noexcept { return !a.p_; }

private:
    std::shared_ptr<T> p_;
};

// Allocates a T with args, object and count in one block.
template <class T, class... Args>
SmartPtr<T> makeSmart(Args&&... args) {
    return SmartPtr<T>(std::make_shared<T>(std::forward<Args>(args)...));
}

template <class T, class U>
SmartPtr<T> staticPointerCast(SmartPtr<U> const& p) noexcept {
    return SmartPtr<T>(std::static_pointer_cast<T>(p.shared()));
}

// Null when p does not point to a T.
template <class T, class U>
SmartPtr<T> dynamicPointerCast(SmartPtr<U> const& p) noexcept {
    return SmartPtr<T>(std::dynamic_pointer_cast<T>(p.shared()));
}

}  // namespace trelm
