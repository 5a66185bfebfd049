// An in-process emulator on ephemeral loopback ports over a small generated dataset, with helpers
// that build signed calls the way the client does.
#pragma once

#include <expat.h>
#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <regex>
#include <string>

#include "Emulator.h"
#include "TestClient.h"

namespace emu::test {

inline constexpr char const* kFql = "SELECT name FROM user WHERE uid = me()";

// The text of element `name` in `body`, or empty.
inline std::string elementText(std::string const& body, std::string const& name) {
    std::smatch m;
    if (std::regex_search(body, m, std::regex("<" + name + ">([^<]*)</" + name + ">"))) return m[1];
    return {};
}

// Whether `body` is a whole, well-formed XML document.
inline bool wellFormed(std::string const& body) {
    XML_Parser p = XML_ParserCreate(nullptr);
    bool const ok = XML_Parse(p, body.data(), static_cast<int>(body.size()), 1) == XML_STATUS_OK;
    XML_ParserFree(p);
    return ok;
}

// Members are public so that table cases (lambdas) can build their requests with them.
class EmulatorFixture : public ::testing::Test {
public:
    // Unix time of the emulator's session clock; tests move it forward.
    std::atomic<std::int64_t> now{1700000000};

    Emulator::Options options() {
        Emulator::Options o;
        o.generator.users = 20;
        o.generator.demoFriends = 5;
        o.generator.friendsPerUser = 3;
        o.clock = [this] { return now.load(); };
        o.sessionLifetimeSeconds = 3600;
        o.threads = 8;
        return o;
    }

    void start(Emulator::Options o) {
        emulator = std::make_unique<Emulator>(std::move(o));
        std::string error;
        ASSERT_TRUE(emulator->start(error)) << error;
        session = emulator->loginDemo();
    }
    void SetUp() override { start(options()); }
    void TearDown() override { emulator.reset(); }

    // An application call: method, v, api_key and the fields, signed with `secret`.
    Fields appCall(std::string const& method, Fields fields = {}, std::string const& secret = DemoAccount::appSecret) {
        fields["method"] = method;
        fields["v"] = "1.0";
        fields["api_key"] = DemoAccount::apiKey;
        return sign(std::move(fields), secret);
    }
    // A session call of `s` with the next call_id, signed with the session secret.
    Fields sessionCall(std::string const& method, Fields fields = {}, Session const* s = nullptr) {
        if (s == nullptr) s = &session;
        fields["session_key"] = s->key;
        if (fields.count("call_id") == 0) fields["call_id"] = std::to_string(++callId_);
        return appCall(method, std::move(fields), s->secret);
    }
    Fields fqlCall() { return sessionCall("facebook.fql.query", {{"query", kFql}}); }

    // A client that reaches the HTTPS listener under the service's own host name.
    void useHttps(TestClient& c) {
        c.trust(emulator->caFile());
        c.connectTo("api.facebook.com:443:127.0.0.1:" + std::to_string(emulator->httpsPort()));
    }
    static constexpr char const* kHttpsUrl = "https://api.facebook.com/restserver.php";

    Fields loginFields(std::string const& password = DemoAccount::password) {
        return appCall("facebook.auth.login", {{"email", DemoAccount::email}, {"password", password}});
    }

    std::unique_ptr<Emulator> emulator;
    Session session;
    TestClient client;

private:
    int callId_ = 0;
};

}  // namespace emu::test
