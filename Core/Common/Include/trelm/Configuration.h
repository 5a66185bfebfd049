#pragma once

#include "trelm/Export.h"
#include "trelm/Map.h"
#include "trelm/String.h"
#include "trelm/Variant.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {
namespace Configuration {

// One configured value: a key and its Variant. Ordered (and made equal, for Set) by key only, so
// a Set<Value> holds one value per key.
class TRELM_API Value {
public:
    Value() = default;
    Value(String key, Variant value) : key_(std::move(key)), value_(std::move(value)) {}

    String const& key() const noexcept { return key_; }
    Variant const& value() const noexcept { return value_; }

    friend bool operator<(Value const& a, Value const& b) { return a.key_ < b.key_; }
    friend bool operator==(Value const& a, Value const& b) { return a.key_ == b.key_; }

private:
    String key_;
    Variant value_;
};

// The configuration group of one component: its name and its values by key.
// A plain value; not guarded (the host hands each component its own copy).
class TRELM_API Group {
public:
    Group() = default;
    explicit Group(String name, Map<String, Variant> values = {})
        : name_(std::move(name)), values_(std::move(values)) {}

    String const& name() const noexcept { return name_; }

    // The value of `key`, or an empty Variant.
    Variant get(String const& key) const;
    // Absent: out = def, success. Present and bool-like (a bool, an integer 0 or 1, or one of
    // "true", "false", "1", "0"): out = that value, success. Otherwise kInvalid, out untouched.
    uError get(String const& key, bool& out, bool def) const;
    // Absent: out = def, success. A String list or int list: its texts. A single String: a
    // one-element list. Otherwise kInvalid, out untouched.
    uError get(String const& key, Vector<String>& out, Vector<String> const& def) const;

    // Adds or replaces a value.
    uError set(String const& key, Variant const& value);
    Map<String, Variant> const& values() const noexcept { return values_; }

private:
    String name_;
    Map<String, Variant> values_;
};

}  // namespace Configuration
}  // namespace trelm
