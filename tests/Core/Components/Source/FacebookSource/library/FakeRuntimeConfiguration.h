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

    std::vector<String> received() const {
        std::lock_guard<std::mutex> lock(mutex_);
        return received_;
    }
    void clearReceived() {
        std::lock_guard<std::mutex> lock(mutex_);
        received_.clear();
    }

protected:
    uError handleMessage(IMessage& msg) override {
        // The three message types of the store end alike; anything else is a broadcast for others.
        if (msg.type().find("RuntimeConfigurationMessage") == String::npos) return TRELM_OK();
        {
            std::lock_guard<std::mutex> lock(mutex_);
            received_.push_back(msg.type());
        }
        if (msg.type() == failing) return TRELM_ERROR(kFailure);
        return RuntimeConfiguration::handleMessage(msg);
    }

private:
    mutable std::mutex mutex_;  // guards received_
    std::vector<String> received_;
};

}  // namespace trelm::test
