#pragma once

#include <map>
#include <mutex>
#include <vector>

#include "Component.h"
#include "trelm/Map.h"
#include "trelm/Set.h"

namespace trelm::test {

// Stands in for the host's "RuntimeConfiguration": records every store, reset and get message
// and keeps what it is told, so that a get sees earlier stores. Messages of the type given to
// failType fail with kFailure and change nothing.
// Thread safety: every member may be called from any thread.
class FakeRuntimeConfiguration : public Component {
public:
    // `values`: the key/value texts of a store; `keys`: the keys of a reset or get.
    struct Record {
        String type;
        String tag;
        Map<String, String> values;
        Set<String> keys;
    };

    FakeRuntimeConfiguration() : Component("RuntimeConfiguration", "RuntimeConfiguration") {}

    void failType(String const& type);
    void put(String const& tag, String const& key, String const& value);
    // The stored value, or "<none>".
    String get(String const& tag, String const& key) const;
    std::vector<Record> records() const;
    void clearRecords();

protected:
    uError handleMessage(IMessage& msg) override;

private:
    mutable std::mutex mutex_;  // guards the fields below
    std::vector<Record> records_;
    std::map<String, String> store_;  // "tag/key" -> value
    String failType_;
};

}  // namespace trelm::test
