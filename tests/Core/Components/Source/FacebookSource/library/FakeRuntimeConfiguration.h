#pragma once

#include <mutex>
#include <vector>

#include "RuntimeConfiguration.h"

namespace trelm::test {

// Stands in for the host's "RuntimeConfiguration": the host's own in-memory store, which also
// notes the type of every store, reset and get message it receives. Messages of the type in
// `failing` fail with kFailure and change nothing.
// Thread safety: as the store's; `failing` is set while no message is under way.
class FakeRuntimeConfiguration : public RuntimeConfiguration {
public:
    String failing;

    std::vector<String> received() const;
    void clearReceived();

protected:
    uError handleMessage(IMessage& msg) override;

private:
    mutable std::mutex mutex_;  // guards received_
    std::vector<String> received_;
};

}  // namespace trelm::test
