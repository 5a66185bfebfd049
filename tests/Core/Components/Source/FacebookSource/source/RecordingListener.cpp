#include "RecordingListener.h"

#include <cstdio>

#include "LoginStatusMessage.h"
#include "WakeupMessage.h"
#include "WipeMessage.h"

namespace trelm::test {

RecordingListener::RecordingListener(String const& name) : Component(name, name) {}

RecordingListener::~RecordingListener() = default;

std::vector<std::string> RecordingListener::events() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return events_;
}

void RecordingListener::clear() {
    std::lock_guard<std::mutex> lock(mutex_);
    events_.clear();
}

uError RecordingListener::handleMessage(IMessage& msg) {
    std::string event;
    if (msg.type() == ILoginStatus::LoginStatusMessage::kType) {
        auto& status = static_cast<ILoginStatus::LoginStatusMessage&>(msg);
        char code[16];
        std::snprintf(code, sizeof code, "%x", status.status);
        event = std::string("status:") + code + ":" + status.userId.str();
    } else if (msg.type() == WipeMessage::kType) {
        event = "wipe";
    } else if (msg.type() == WakeupMessage::kType) {
        event = "wakeup";
    } else {
        return TRELM_OK();
    }
    std::lock_guard<std::mutex> lock(mutex_);
    events_.push_back(std::move(event));
    return TRELM_OK();
}

}  // namespace trelm::test
