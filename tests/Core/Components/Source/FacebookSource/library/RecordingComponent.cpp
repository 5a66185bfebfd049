#include "RecordingComponent.h"

#include <cstdio>

#include "LoginStatusMessage.h"
#include "WakeupMessage.h"
#include "WipeMessage.h"

namespace trelm::test {

void EventLog::add(String const& event) {
    std::lock_guard<std::mutex> lock(mutex_);
    events_.push_back(event);
}

std::vector<String> EventLog::events() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return events_;
}

void EventLog::clear() {
    std::lock_guard<std::mutex> lock(mutex_);
    events_.clear();
}

RecordingComponent::RecordingComponent(String const& name, std::shared_ptr<EventLog> log, bool fail)
    : Component(name, "Recording"), log_(std::move(log)), fail_(fail) {}

RecordingComponent::~RecordingComponent() = default;

namespace {
String keysOf(Map<String, String> const& params) {
    String keys;
    for (auto const& [key, value] : params) {
        if (!keys.empty()) keys += ",";
        keys += key;
        if (!value.empty()) keys += "=" + value;
    }
    return keys;
}
}  // namespace

uError RecordingComponent::handleMessage(IMessage& msg) {
    if (msg.type() == WipeMessage::kType) {
        log_->add(name() + ":wipe:" + keysOf(static_cast<WipeMessage&>(msg).params));
    } else if (msg.type() == WakeupMessage::kType) {
        log_->add(name() + ":wakeup:" + keysOf(static_cast<WakeupMessage&>(msg).params));
    } else if (msg.type() == ILoginStatus::LoginStatusMessage::kType) {
        auto& status = static_cast<ILoginStatus::LoginStatusMessage&>(msg);
        char code[16];
        std::snprintf(code, sizeof code, "%x", status.status);
        log_->add(name() + ":status:" + status.tag + ":" + code + ":" + status.userId);
    } else {
        return TRELM_OK();
    }
    return fail_ ? TRELM_ERROR(kFailure) : TRELM_OK();
}

}  // namespace trelm::test
