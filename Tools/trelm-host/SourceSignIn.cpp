#include "SourceSignIn.h"

#include <cstdio>
#include <memory>
#include <mutex>
#include <utility>
#include <vector>

#include "ConfigurationChangedMessage.h"
#include "trelm/Configuration.h"
#include "trelm/Set.h"
#include "trelm/Trace.h"

namespace trelm {
namespace host {

namespace {

char const* const kHandedOver[] = {"facebook_source_appkey", "facebook_source_appsecret",
                                   "facebook_source_login", "facebook_source_password"};
char const* const kLogin = "facebook_source_login";
char const* const kExtendedApi = "haveExtendedApi";
char const* const kSessionId = "facebook_source_session_id";

// Collects the trace lines written while it lives (the source traces why a sign-in failed and
// keeps only the code for its announcement), passing them on to the sink it replaced. The lines
// live in a block shared with the installed sink, so a thread still inside a copy of the sink
// after the capture ended does no harm.
class TraceCapture {
public:
    TraceCapture() : state_(std::make_shared<State>()) {
        TraceSink previous = setTraceSink([state = state_](String const& line) {
            TraceSink forward;
            {
                std::lock_guard<std::mutex> lock(state->mutex);
                state->lines.push_back(line);
                forward = state->previous;
            }
            if (forward) forward(line);
        });
        std::lock_guard<std::mutex> lock(state_->mutex);
        state_->previous = std::move(previous);
    }
    ~TraceCapture() {
        TraceSink previous;
        {
            std::lock_guard<std::mutex> lock(state_->mutex);
            previous = state_->previous;
        }
        setTraceSink(std::move(previous));
    }
    TraceCapture(TraceCapture const&) = delete;
    TraceCapture& operator=(TraceCapture const&) = delete;

    // The lines so far, each on a line of its own and indented under an error message.
    String text() const {
        std::lock_guard<std::mutex> lock(state_->mutex);
        String joined;
        for (String const& line : state_->lines) joined += "\n    " + line;
        return joined;
    }

private:
    struct State {
        // Guards lines and previous: a source may trace from any thread.
        std::mutex mutex;
        std::vector<String> lines;
        TraceSink previous;
    };
    std::shared_ptr<State> const state_;
};

String hex(unsigned code) {
    char text[16];
    std::snprintf(text, sizeof text, "0x%08x", code);
    return String(text);
}

}  // namespace

SourceSignIn::SourceSignIn(ComponentHost& host, LoginListener& listener,
                           HostConfig::ComponentEntry const& entry)
    : host_(host), listener_(listener), entry_(entry) {}

bool SourceSignIn::possible() const {
    String login;
    Variant const* value = entry_.config.search(kLogin);
    if (value == nullptr || value->as(login).failed() || login.empty()) return false;
    bool extended = true;
    Variant const* flag = entry_.config.search(kExtendedApi);
    return flag == nullptr || (flag->as(extended).ok() && extended);
}

uError SourceSignIn::sessionStored(bool& stored) const {
    Map<String, Variant> values;
    uError e = values.insert(kSessionId, Variant());
    if (e.ok()) e = host_.runtimeConfiguration().get(entry_.name, values);
    if (e.failed()) return TRELM_WRAP_MSG(kFailure, e, "cannot read the stored session of " + entry_.name);
    String session;
    stored = values.search(kSessionId)->as(session).ok() && !session.empty();
    return TRELM_OK();
}

uError SourceSignIn::signIn(LoginListener::Status& status) {
    Set<Configuration::Value> values;
    Set<String> keys;
    for (char const* key : kHandedOver) {
        Variant const* value = entry_.config.search(key);
        if (value == nullptr) continue;
        uError e = values.insert(Configuration::Value(key, *value));
        if (e.ok()) e = keys.insert(key);
        if (e.failed()) return e;
    }
    RuntimeConfiguration& store = host_.runtimeConfiguration();
    uError e = store.store(entry_.name, values);
    if (e.failed()) return TRELM_WRAP_MSG(kFailure, e, "cannot hand the login settings to " + entry_.name);

    std::size_t const before = listener_.count();
    String traced;
    {
        TraceCapture capture;
        ConfigurationChangedMessage changed(keys);
        e = changed.send(entry_.name);
        traced = capture.text();
    }
    uError const removed = store.reset(entry_.name, keys);
    if (e.failed()) return TRELM_WRAP_MSG(kFailure, e, "the settings change was refused by " + entry_.name);
    if (removed.failed()) {
        return TRELM_WRAP_MSG(kFailure, removed, "cannot remove the handed-over settings of " + entry_.name);
    }

    std::vector<LoginListener::Status> announced = listener_.since(before, entry_.name);
    if (announced.empty()) {
        return TRELM_ERROR_MSG(kFailure, entry_.name + " did not announce a sign-in" + traced);
    }
    status = announced.back();
    if ((status.code & 0x80000000u) != 0) {
        return TRELM_WRAP_MSG(kFailure, TRELM_ERROR_MSG(status.code, "refused" + traced),
                              "the sign-in of " + entry_.name + " failed with " + hex(status.code));
    }
    return TRELM_OK();
}

}  // namespace host
}  // namespace trelm
