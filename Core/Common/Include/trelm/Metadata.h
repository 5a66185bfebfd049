#pragma once

#include "trelm/Export.h"
#include "trelm/String.h"
#include "trelm/uError.h"

namespace trelm {

namespace TRELM_TYPES {
// Metadata value types of the host's item keys.
enum TYPES {
    NONE = 0,
    GUID_TYPE = 1,
    BINARY = 2,
    STRING = 3,
    BOOL = 4,
    INT32_LIST = 5,
    STRING_LIST = 6,
    UINT32 = 7,
    UINT64 = 8,
    DOUBLE = 9,
    TIME = 10,
    URI = 11,
    INT32 = 12,
    INT64 = 13,
};
}  // namespace TRELM_TYPES

namespace Metadata {

// A metadata key: a name and its value type. A plain value; ordered by name, then type.
class TRELM_API Key {
public:
    Key() = default;
    Key(char const* name, TRELM_TYPES::TYPES type) : name_(name), type_(type) {}
    Key(String const& name, TRELM_TYPES::TYPES type) : name_(name), type_(type) {}

    String const& name() const noexcept { return name_; }
    TRELM_TYPES::TYPES type() const noexcept { return type_; }

    friend bool operator==(Key const& a, Key const& b) { return a.type_ == b.type_ && a.name_ == b.name_; }
    friend bool operator!=(Key const& a, Key const& b) { return !(a == b); }
    friend bool operator<(Key const& a, Key const& b) {
        if (a.name_ != b.name_) return a.name_ < b.name_;
        return a.type_ < b.type_;
    }

private:
    String name_;
    TRELM_TYPES::TYPES type_ = TRELM_TYPES::NONE;
};

// The type under which `name` was registered; kNotFound (type untouched) for an unknown name.
// Thread-safe.
TRELM_API uError getType(String const& name, TRELM_TYPES::TYPES& type);

// Kinds of item ("core_object_type" values).
namespace Object {
enum Kind {
    TYPE_CONTACT = 2,
    TYPE_STATUS = 4,
    TYPE_PHOTO_EVENT = 5,
    TYPE_MEDIA = 9,
    TYPE_MESSAGE = 10,
    TYPE_ALBUM = 11,
    TYPE_FRIEND_REQUEST = 12,
    TYPE_PHOTO_TAG = 13,
};
}  // namespace Object

}  // namespace Metadata
}  // namespace trelm

// Registers an item key name with its value type for the whole process and returns the key as
// registered. A name is kept once: registering it again (from this or another library) keeps the
// first registration, and the returned key carries that first type. Thread-safe; may be called
// from static initialisers of any library (the registry is built on first use).
// libtrelm registers the host's own "core_*" keys, "media_uri" and "media_notes" when it is loaded.
TRELM_API trelm::Metadata::Key trelm_RegisterMetadataType(char const* name, trelm::TRELM_TYPES::TYPES type);
