// Injected faults, seen by a real client over loopback.
#include <chrono>

#include "EmulatorFixture.h"

namespace emu::test {
namespace {

using FaultsTest = EmulatorFixture;

// Installs a rule written as on the command line.
void install(Emulator& e, const std::string& text) {
    std::string method, error;
    FaultRule rule;
    ASSERT_TRUE(Faults::parse(text, method, rule, error)) << error;
    e.faults().set(method, rule);
}

TEST_F(FaultsTest, ServiceErrorFaultsHitTheCallsTheirRuleSelects) {
    struct Case {
        const char* rule;
        const char* method;    // the method called, repeatedly
        std::vector<int> codes;  // the error code of each call in turn
        bool clearBeforeLast = false;  // an expired session stays expired once the fault is gone
    };
    const std::vector<Case> cases = {
        {"fql.query:error=2,every=3", "fql.query", {0, 0, 2, 0, 0, 2, 0}},
        {"*:error=2,every=2", "stream.get", {0, 2, 0, 2}},
        {"stream.get:error=2", "fql.query", {0, 0, 0}},
        {"fql.query:expire_after=2", "fql.query", {0, 0, 102, 102}, true},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.rule);
        session = emulator->loginDemo();
        emulator->faults().clearAll();
        install(*emulator, c.rule);
        for (std::size_t i = 0; i < c.codes.size(); ++i) {
            if (c.clearBeforeLast && i + 1 == c.codes.size()) emulator->faults().clearAll();
            const Reply r = client.postForm(emulator->httpUrl(), sessionCall(c.method, {{"query", kFql}}));
            ASSERT_EQ(r.code, CURLE_OK);
            EXPECT_EQ(r.errorCode(), c.codes[i]) << "call " << i + 1 << ": " << r.body;
        }
    }
}

TEST_F(FaultsTest, RateLimitIsAnsweredBeforeTheSessionIsChecked) {
    install(*emulator, "*:rate=0.001,burst=1");
    EXPECT_EQ(client.postForm(emulator->httpUrl(), fqlCall()).errorCode(), 0);
    Fields noSession = appCall("fql.query", {{"query", kFql}});
    EXPECT_EQ(client.postForm(emulator->httpUrl(), noSession).errorCode(), 4);
}

TEST_F(FaultsTest, SeededProbabilityRepeatsItsPattern) {
    auto pattern = [&] {
        install(*emulator, "fql.query:error=2,probability=0.5,seed=42");
        std::string hits;
        for (int i = 0; i < 24; ++i)
            hits += client.postForm(emulator->httpUrl(), fqlCall()).errorCode() == 2 ? 'x' : '.';
        return hits;
    };
    const std::string first = pattern();
    EXPECT_EQ(pattern(), first);
    EXPECT_NE(first.find('x'), std::string::npos) << first;
    EXPECT_NE(first.find('.'), std::string::npos) << first;
}

TEST_F(FaultsTest, TransportFaultsReachTheClientAsTransportFailures) {
    struct Case {
        const char* rule;
        CURLcode code;
        long status;
        bool wellFormedBody;
        const char* logged;
    };
    const std::vector<Case> cases = {
        {"fql.query:drop", CURLE_GOT_NOTHING, 0, false, "drop"},
        {"fql.query:truncate", CURLE_PARTIAL_FILE, 200, false, "truncate"},
        {"fql.query:malformed", CURLE_OK, 200, false, "malformed"},
        {"fql.query:http_status=503", CURLE_OK, 503, false, "http_status"},
        {"fql.query:drop,every=2", CURLE_OK, 200, true, ""},  // the first call is not hit
    };
    TestClient https;
    useHttps(https);
    for (const Case& c : cases) {
        for (bool overTls : {false, true}) {
            SCOPED_TRACE(std::string(c.rule) + (overTls ? " over https" : " over http"));
            emulator->faults().clearAll();
            emulator->log().clear();
            install(*emulator, c.rule);
            const Fields f = fqlCall();
            const Reply r = overTls ? https.postForm(kHttpsUrl, f) : client.postForm(emulator->httpUrl(), f);
            EXPECT_EQ(r.code, c.code) << curl_easy_strerror(r.code);
            if (c.code == CURLE_OK) {
                EXPECT_EQ(r.status, c.status);
            }
            EXPECT_EQ(wellFormed(r.body), c.wellFormedBody) << r.body;
            const auto logged = emulator->log().entries();
            ASSERT_EQ(logged.size(), 1u);
            EXPECT_EQ(logged[0].fault, c.logged);

            // The client recovers: with the fault gone the next call is answered normally.
            emulator->faults().clearAll();
            const Reply next = overTls ? https.postForm(kHttpsUrl, fqlCall())
                                       : client.postForm(emulator->httpUrl(), fqlCall());
            ASSERT_EQ(next.code, CURLE_OK);
            EXPECT_EQ(next.errorCode(), 0);
        }
    }
}

TEST_F(FaultsTest, DelayHoldsTheAnswerBack) {
    install(*emulator, "fql.query:delay_ms=200");
    const auto start = std::chrono::steady_clock::now();
    const Reply r = client.postForm(emulator->httpUrl(), fqlCall());
    const auto elapsed = std::chrono::steady_clock::now() - start;
    EXPECT_EQ(r.errorCode(), 0);
    EXPECT_GE(elapsed, std::chrono::milliseconds(200));
}

}  // namespace
}  // namespace emu::test
