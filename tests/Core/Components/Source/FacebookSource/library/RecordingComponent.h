#pragma once

#include <memory>
#include <mutex>
#include <vector>

#include "Component.h"
#include "trelm/String.h"
#include "trelm/uError.h"

namespace trelm::test {

// The messages several components received, in the order they arrived, as "<component>:<what>":
// "wipe:tag" / "wakeup:tag" for wipe and wake-up messages (tag = the key of their one-entry map),
// "status:<tag>:<code in hex>:<user>" for login status messages. Thread-safe.
class EventLog {
public:
    void add(String const& event);
    std::vector<String> events() const;
    void clear();

private:
    mutable std::mutex mutex_;  // guards events_
    std::vector<String> events_;
};

// A component that writes the wipe, wake-up and login-status messages it receives into a shared
// EventLog; with `fail`, it answers each of them with kFailure.
class RecordingComponent : public Component {
public:
    RecordingComponent(String const& name, std::shared_ptr<EventLog> log, bool fail = false);
    ~RecordingComponent() override;

protected:
    uError handleMessage(IMessage& msg) override;

private:
    std::shared_ptr<EventLog> const log_;
    bool const fail_;
};

}  // namespace trelm::test
