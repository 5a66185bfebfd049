#pragma once

#include <mutex>
#include <string>
#include <vector>

#include "Component.h"
#include "trelm/String.h"
#include "trelm/uError.h"

namespace trelm::test {

// A component that notes the account messages it receives, in arrival order:
//   "status:<code in hex>:<user>"  for "ILoginStatus::LoginStatusMessage"
//   "wipe" / "wakeup"              for "WipeMessage" / "WakeupMessage"
// Other messages are accepted and ignored. Thread-safe.
class RecordingListener : public Component {
public:
    explicit RecordingListener(String const& name);
    ~RecordingListener() override;

    std::vector<std::string> events() const;
    void clear();

protected:
    uError handleMessage(IMessage& msg) override;

private:
    mutable std::mutex mutex_;  // guards events_
    std::vector<std::string> events_;
};

}  // namespace trelm::test
