#pragma once

#include <cstdio>
#include <memory>
#include <vector>

#include "Component.h"
#include "LoginStatusMessage.h"
#include "WakeupMessage.h"
#include "WipeMessage.h"

namespace trelm::test {

// Writes the wipe, wake-up and login-status messages it receives into a log shared by several
// components, as "<name>:wipe:<keys>", "<name>:wakeup:<keys>", "<name>:status:<tag>:<hex code>:<user>".
// With `fail` it answers each of them with kFailure. Single-threaded tests only.
class RecordingComponent : public Component {
public:
    using Log = std::vector<String>;

    RecordingComponent(String const& name, std::shared_ptr<Log> log, bool fail = false)
        : Component(name, "Recording"), log_(std::move(log)), fail_(fail) {}

protected:
    uError handleMessage(IMessage& msg) override {
        if (msg.type() == WipeMessage::kType) {
            log_->push_back(name() + ":wipe:" + keys(static_cast<WipeMessage&>(msg).params));
        } else if (msg.type() == WakeupMessage::kType) {
            log_->push_back(name() + ":wakeup:" + keys(static_cast<WakeupMessage&>(msg).params));
        } else if (msg.type() == ILoginStatus::LoginStatusMessage::kType) {
            auto& status = static_cast<ILoginStatus::LoginStatusMessage&>(msg);
            char code[16];
            std::snprintf(code, sizeof code, "%x", status.status);
            log_->push_back(name() + ":status:" + status.tag + ":" + code + ":" + status.userId);
        } else {
            return TRELM_OK();
        }
        return fail_ ? TRELM_ERROR(kFailure) : TRELM_OK();
    }

private:
    static String keys(Map<String, String> const& params) {
        String out;
        for (auto const& [key, value] : params) out += (out.empty() ? "" : ",") + key + (value.empty() ? "" : "=" + value);
        return out;
    }

    std::shared_ptr<Log> const log_;
    bool const fail_;
};

}  // namespace trelm::test
