#pragma once

#include <mutex>
#include <vector>

#include "Component.h"
#include "trelm/Map.h"
#include "trelm/Set.h"
#include "trelm/String.h"
#include "trelm/uError.h"

namespace trelm::test {

// A stand-in for the host's "RuntimeConfiguration": records every message it receives and keeps
// what it is told in a map, so that a "GetRuntimeConfigurationMessage" sees earlier stores.
// It can be told to fail messages of one type (or of every type, with the type "*").
// Thread safety: every member may be called from any thread.
class FakeRuntimeConfiguration : public Component {
public:
    // One message as received. `values` holds the stored key/value texts of a store message;
    // `keys` the keys of a reset or get message.
    struct Record {
        String type;
        String tag;
        Map<String, String> values;
        Set<String> keys;
    };

    FakeRuntimeConfiguration();
    ~FakeRuntimeConfiguration() override;

    // Messages of `type` fail with kFailure (and change nothing); "" stops failing.
    void failType(String const& type);
    void put(String const& tag, String const& key, String const& value);
    // The stored value, or null.
    bool get(String const& tag, String const& key, String& out) const;

    std::vector<Record> records() const;
    void clearRecords();

protected:
    uError handleMessage(IMessage& msg) override;

private:
    // Guards every field below.
    mutable std::mutex mutex_;
    std::vector<Record> records_;
    Map<String, Map<String, String>> store_;  // tag -> key -> value
    String failType_;
};

}  // namespace trelm::test
