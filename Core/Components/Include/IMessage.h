#pragma once

#include "trelm/Export.h"
#include "trelm/String.h"
#include "trelm/uError.h"

namespace trelm {

// The base of every message between components. A message carries its type name (for example
// "RuntimeConfigurationMessage") and, in its subclass, its fields; a receiver recognises a message
// by type() and then casts it to the class (so every message class is exported from libtrelm).
//
// Lifetime: the sender owns the message; a receiver must not keep a pointer to it after
// onMessage returns. Thread safety: a message is used by one thread at a time.
class TRELM_API IMessage {
public:
    explicit IMessage(String type) : type_(std::move(type)) {}
    virtual ~IMessage();

    String const& type() const noexcept { return type_; }

    // Delivers this message synchronously, through the active ComponentRegistry, to the component
    // registered under `target` and returns that component's onMessage result; the receiver's
    // answers are in the message's fields on return. kNotFound when there is no such component
    // or no active registry.
    // An empty target delivers to every registered component in registration order and returns
    // the first failure (every component still receives the message), or success.
    uError send(String const& target);

protected:
    IMessage(IMessage const&) = default;
    IMessage& operator=(IMessage const&) = default;

private:
    String type_;
};

}  // namespace trelm
