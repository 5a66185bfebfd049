#include "ComponentRegistry.h"

#include <algorithm>

#include "Component.h"
#include "IMessage.h"

namespace trelm {

std::atomic<ComponentRegistry*> ComponentRegistry::active_{nullptr};

ComponentRegistry::~ComponentRegistry() { deactivate(); }

uError ComponentRegistry::add(String const& name, Component* component) {
    if (name.empty() || component == nullptr) return TRELM_ERROR(kInvalid);
    std::lock_guard<std::mutex> lock(mutex_);
    for (auto const& entry : entries_) {
        if (entry.first == name) return TRELM_ERROR(kInvalid);
    }
    try {
        entries_.emplace_back(name, component);
    } catch (std::bad_alloc const&) {
        return TRELM_ERROR(kOutOfMemory);
    }
    return TRELM_OK();
}

uError ComponentRegistry::remove(String const& name) {
    std::lock_guard<std::mutex> lock(mutex_);
    auto it = std::find_if(entries_.begin(), entries_.end(), [&](auto const& entry) { return entry.first == name; });
    if (it == entries_.end()) return TRELM_ERROR(kNotFound);
    entries_.erase(it);
    return TRELM_OK();
}

Component* ComponentRegistry::find(String const& name) const {
    std::lock_guard<std::mutex> lock(mutex_);
    for (auto const& entry : entries_) {
        if (entry.first == name) return entry.second;
    }
    return nullptr;
}

Vector<String> ComponentRegistry::names() const {
    std::lock_guard<std::mutex> lock(mutex_);
    Vector<String> result;
    // Out of memory while listing yields the names gathered so far: a listing is a diagnostic
    // and has no error channel.
    if (result.reserve(static_cast<unsigned>(entries_.size())).failed()) return result;
    for (auto const& entry : entries_) {
        if (result.pushBack(entry.first).failed()) break;
    }
    return result;
}

void ComponentRegistry::activate() { active_.store(this); }

void ComponentRegistry::deactivate() {
    ComponentRegistry* self = this;
    active_.compare_exchange_strong(self, nullptr);
}

ComponentRegistry* ComponentRegistry::active() noexcept { return active_.load(); }

uError ComponentRegistry::deliver(IMessage& msg, String const& target) {
    if (!target.empty()) {
        Component* receiver = find(target);
        if (receiver == nullptr) return TRELM_ERROR_MSG(kNotFound, "no component named " + target);
        return receiver->onMessage(msg);
    }

    // The receivers are copied out so that no handler runs under the lock.
    std::vector<Component*> receivers;
    {
        std::lock_guard<std::mutex> lock(mutex_);
        try {
            receivers.reserve(entries_.size());
        } catch (std::bad_alloc const&) {
            return TRELM_ERROR(kOutOfMemory);
        }
        for (auto const& entry : entries_) receivers.push_back(entry.second);
    }
    uError result = TRELM_OK();
    for (Component* receiver : receivers) {
        uError e = receiver->onMessage(msg);
        if (e.failed() && !result.failed()) result = e;
    }
    return result;
}

}  // namespace trelm
