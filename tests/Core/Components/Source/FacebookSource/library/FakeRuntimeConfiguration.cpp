#include "FakeRuntimeConfiguration.h"

namespace trelm::test {

std::vector<String> FakeRuntimeConfiguration::received() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return received_;
}

void FakeRuntimeConfiguration::clearReceived() {
    std::lock_guard<std::mutex> lock(mutex_);
    received_.clear();
}

uError FakeRuntimeConfiguration::handleMessage(IMessage& msg) {
    // The three message types of the store end alike; anything else is a broadcast for others.
    if (msg.type().find("RuntimeConfigurationMessage") == String::npos) return TRELM_OK();
    {
        std::lock_guard<std::mutex> lock(mutex_);
        received_.push_back(msg.type());
    }
    if (msg.type() == failing) return TRELM_ERROR(kFailure);
    return RuntimeConfiguration::handleMessage(msg);
}

}  // namespace trelm::test
