#include "SourceSignIn.h"

#include <cstdio>
#include <memory>
#include <mutex>
#include <utility>
#include <vector>

#include "ConfigurationChangedMessage.h"
#include "trelm/Configuration.h"
#include "trelm/MD5.h"
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
char const* const kAppKey = "facebook_source_appkey";
char const* const kSessionAccount = "trelm_host_session_account";

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

// Names the account a session belongs to without keeping the login itself in the store.
String accountFingerprint(HostConfig::ComponentEntry const& entry) {
    String appKey, login;
    if (Variant const* v = entry.config.search(kAppKey)) v->as(appKey).ignore();  // absent: empty
    if (Variant const* v = entry.config.search(kLogin)) v->as(login).ignore();
    return md5Hex(appKey + "\n" + login);
}

// The source traces why a sign-in failed; the part a user can act on is the service's own answer
// ("service error 100: ..."), which the client puts in its error's message. Empty when the trace
// holds none (a transport failure, for one).
String serviceExplanation(String const& traced) {
    unsigned const at = traced.find("service error ");
    if (at == String::npos) return String();
    unsigned end = traced.find('\n', at);
    if (end == String::npos) end = traced.size();
    return traced.substr(at, end - at);
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
    if (e.ok()) e = values.insert(kSessionAccount, Variant());
    if (e.ok()) e = host_.runtimeConfiguration().get(entry_.name, values);
    if (e.failed()) return TRELM_WRAP_MSG(kFailure, e, "cannot read the stored session of " + entry_.name);
    String session, account;
    stored = values.search(kSessionId)->as(session).ok() && !session.empty();
    if (stored && possible()) {
        stored = values.search(kSessionAccount)->as(account).ok() && account == accountFingerprint(entry_);
    }
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
    uError e = store.hold(entry_.name, values);
    if (e.failed()) return TRELM_WRAP_MSG(kFailure, e, "cannot hand the login settings to " + entry_.name);

    std::size_t const before = listener_.count();
    String traced;
    {
        TraceCapture capture;
        ConfigurationChangedMessage changed(keys);
        e = changed.send(entry_.name);
        traced = capture.text();
    }
    store.release(entry_.name, keys);
    if (e.failed()) return TRELM_WRAP_MSG(kFailure, e, "the settings change was refused by " + entry_.name);

    std::vector<LoginListener::Status> announced = listener_.since(before, entry_.name);
    if (announced.empty()) {
        return TRELM_ERROR_MSG(kFailure, entry_.name + " did not announce a sign-in" + traced);
    }
    status = announced.back();
    if ((status.code & 0x80000000u) != 0) {
        return TRELM_WRAP_MSG(kFailure, TRELM_ERROR_MSG(status.code, serviceExplanation(traced)),
                              "the sign-in of " + entry_.name + " failed");
    }
    // The session now stored belongs to this account.
    e = store.store(entry_.name, {Configuration::Value(kSessionAccount, Variant(accountFingerprint(entry_)))});
    if (e.failed()) return TRELM_WRAP_MSG(kFailure, e, "cannot note which account the session of " + entry_.name + " belongs to");
    return TRELM_OK();
}

}  // namespace host
}  // namespace trelm
