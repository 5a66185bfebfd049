// The emulator's protocol and its injected faults, seen by a real client over loopback HTTP and HTTPS
// with libcurl.
#include <chrono>
#include <functional>

#include "EmulatorFixture.h"

namespace emu::test {
namespace {

using ProtocolTest = EmulatorFixture;

struct ErrorCase {
    char const* name;
    int code;
    bool https;
    std::function<Fields(ProtocolTest&)> fields;
    Fields changed = {};  // set after signing ("-": removed)
    bool resign = false;  // sign again after the change, with the session secret
};

// A query call made when the session has expired.
Fields anHourLater(ProtocolTest& t) {
    t.now += 3600;
    return t.fqlCall();
}

TEST_F(ProtocolTest, EachInvalidRequestGetsItsErrorDocument) {
    auto const query = [](auto& t) { return t.fqlCall(); };
    auto const unknown = [](auto& t) { return t.sessionCall("facebook.photos.delete"); };
    auto const withoutSession = [](auto& t) { return t.appCall("fql.query", {{"query", kFql}}); };
    auto const withAppSecret = [](auto& t) { return sign(t.fqlCall(), DemoAccount::appSecret); };
    const std::vector<ErrorCase> cases = {
        {"wrong signature", 104, false, query, {{"sig", std::string(32, '0')}}},
        {"signed with the application secret instead of the session's", 104, false, withAppSecret},
        {"unknown api_key", 101, false, query, {{"api_key", "0123"}}, true},
        {"missing method", 3, false, query, {{"method", "-"}}, true},
        {"unknown method", 3, false, unknown},
        {"missing session", 102, false, withoutSession},
        {"expired session", 102, false, anHourLater},
        {"login over plain HTTP", 8, false, [](auto& t) { return t.loginFields(); }},
        {"wrong password", 100, true, [](auto& t) { return t.loginFields("guess"); }},
        {"fql.query without query", 100, false, [](auto& t) { return t.sessionCall("fql.query"); }},
        // The service's order: an earlier check wins when several fail.
        {"unknown api_key before bad signature", 101, false, query, {{"api_key", "x"}}},
        {"missing method before bad session", 3, false, query, {{"method", "-"}, {"session_key", "x"}}},
        {"bad session before bad signature", 102, false, query, {{"session_key", "x"}}},
        {"bad signature before unknown method", 104, false, unknown, {{"sig", "0"}}},
    };

    TestClient https;
    useHttps(https);
    for (ErrorCase const& c : cases) {
        SCOPED_TRACE(c.name);
        // A fresh session for each case: the expired case moves the clock on.
        session = emulator->loginDemo();
        Fields fields = c.fields(*this);
        for (auto const& [key, value] : c.changed) value == "-" ? void(fields.erase(key)) : void(fields[key] = value);
        if (c.resign) fields = sign(fields, session.secret);
        const Reply r = c.https ? https.postForm(kHttpsUrl, fields) : client.postForm(emulator->httpUrl(), fields);
        ASSERT_EQ(r.code, CURLE_OK);
        EXPECT_EQ(r.status, 200);
        EXPECT_EQ(r.contentType, "text/xml; charset=utf-8");
        EXPECT_TRUE(wellFormed(r.body)) << r.body;
        EXPECT_EQ(r.errorCode(), c.code) << r.body;
        EXPECT_EQ(elementText(r.body, "error_msg"), Protocol::errorText(c.code));
        // Every argument comes back, sig and call_id included; the password never does.
        for (auto const& [key, value] : fields) {
            const std::string shown = key == "password" ? "***" : value;
            EXPECT_NE(r.body.find("<arg><key>" + key + "</key><value>" + shown + "</value></arg>"), std::string::npos)
                << key << " in " << r.body;
        }
        if (fields.count("password")) {
            EXPECT_EQ(r.body.find(fields.at("password")), std::string::npos);
        }
    }
}

TEST_F(ProtocolTest, ErrorDocumentHasTheServiceLayout) {
    Fields f = fqlCall();
    f["sig"] = "bad";
    const Reply r = client.postForm(emulator->httpUrl(), f);
    const std::string expected =
        "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
        "<error_response xmlns=\"http://api.facebook.com/1.0/\" "
        "xmlns:xsi=\"http://www.w3.org/2001/XMLSchema-instance\">"
        "<error_code>104</error_code><error_msg>Incorrect signature</error_msg><request_args list=\"true\">"
        "<arg><key>api_key</key><value>" +
        std::string(DemoAccount::apiKey) +
        "</value></arg>"
        "<arg><key>call_id</key><value>1</value></arg>"
        "<arg><key>method</key><value>facebook.fql.query</value></arg>"
        "<arg><key>query</key><value>" +
        kFql +
        "</value></arg>"
        "<arg><key>session_key</key><value>" +
        session.key +
        "</value></arg>"
        "<arg><key>sig</key><value>bad</value></arg>"
        "<arg><key>v</key><value>1.0</value></arg>"
        "</request_args></error_response>\n";
    EXPECT_EQ(r.body, expected);
}

TEST_F(ProtocolTest, LoginOverHttpsGivesASessionThatSignsLaterCalls) {
    TestClient https;
    useHttps(https);
    const Reply login = https.postForm(kHttpsUrl, loginFields());
    ASSERT_EQ(login.code, CURLE_OK);
    ASSERT_EQ(login.errorCode(), 0) << login.body;
    ASSERT_NE(login.body.find("<auth_login_response xmlns="), std::string::npos) << login.body;

    Session s;
    s.key = elementText(login.body, "session_key");
    s.secret = elementText(login.body, "secret");
    ASSERT_FALSE(s.key.empty());
    ASSERT_EQ(s.secret.size(), 32u);
    EXPECT_EQ(elementText(login.body, "uid"), std::to_string(DemoAccount::uid));
    EXPECT_EQ(elementText(login.body, "expires"), std::to_string(now + 3600));

    const Reply r = client.postForm(emulator->httpUrl(), sessionCall("fql.query", {{"query", kFql}}, &s));
    ASSERT_EQ(r.code, CURLE_OK);
    EXPECT_EQ(r.errorCode(), 0) << r.body;
    EXPECT_NE(r.body.find("<fql_query_response xmlns=\"http://api.facebook.com/1.0/\" "
                          "xmlns:xsi=\"http://www.w3.org/2001/XMLSchema-instance\" list=\"true\">"),
              std::string::npos)
        << r.body;
    EXPECT_NE(r.body.find("<name>"), std::string::npos) << r.body;
}

TEST_F(ProtocolTest, ArgumentsMergeFromQueryStringAndBody) {
    const std::string image = std::string("\xff\xd8\xff\xe0", 4) + std::string(5000, '\x42') + std::string(1, '\0');
    const Fields all = sessionCall("facebook.photos.upload", {{"caption", "a & b = c"}, {"aid", ""}});
    // method, api_key and v in the query string; the rest in the body.
    Fields inQuery, inBody;
    for (auto const& [k, v] : all) (k == "method" || k == "api_key" || k == "v" ? inQuery : inBody)[k] = v;
    const std::string url = emulator->httpUrl() + "?" + client.encode(inQuery);

    struct Case {
        char const* name;
        std::function<Reply()> send;
        bool file;
    };
    const std::vector<Case> cases = {
        {"query string only (GET)", [&] { return client.get(emulator->httpUrl(), all); }, false},
        {"query string and url-encoded body", [&] { return client.postForm(url, inBody); }, false},
        {"query string and multipart body with a file",
         [&] {
             return client.postMultipart(url, inBody, {{"name=\"upload\"; filename=\"picture.jpg\"", image}});
         },
         true},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.name);
        emulator->log().clear();
        const Reply r = c.send();
        ASSERT_EQ(r.code, CURLE_OK);
        // Without the file the store answers 324: the call itself was valid and signed.
        EXPECT_EQ(r.errorCode(), c.file ? 0 : 324) << r.body;
        auto const logged = emulator->log().entries();
        ASSERT_EQ(logged.size(), 1u);
        EXPECT_EQ(logged[0].args, all);
        EXPECT_EQ(logged[0].hadFile, c.file);
        EXPECT_EQ(logged[0].fileSize, c.file ? image.size() : 0u);
    }
}

// The session table's unit tests hold the rules; here the option turns them on.
TEST_F(ProtocolTest, StrictCallIdRejectsACallIdThatDoesNotGrow) {
    for (bool on : {true, false}) {
        SCOPED_TRACE(on ? "strict" : "default");
        Emulator::Options o = options();
        o.strictCallId = on;
        o.httpsPort = -1;
        start(o);
        const std::pair<char const*, bool> steps[] = {
            {"2", false}, {"2", true}, {"1", true}, {"x", true}, {"3", false}};
        for (auto const& [callId, refused] : steps) {
            const Reply r =
                client.postForm(emulator->httpUrl(), sessionCall("fql.query", {{"query", kFql}, {"call_id", callId}}));
            EXPECT_EQ(r.errorCode(), on && refused ? 103 : 0) << "call_id " << callId;
        }
    }
}

// Many requests share one connection, and stopping does not wait for idle kept-alive ones.
TEST_F(ProtocolTest, KeepAliveServesManyRequestsOnOneConnectionAndStopDoesNotWaitForIt) {
    Emulator::Options o = options();
    o.keepAliveSeconds = 60;
    start(o);
    long connections = 0;
    for (int i = 0; i < 300; ++i) {
        const Reply r = client.postForm(emulator->httpUrl(), fqlCall());
        ASSERT_EQ(r.code, CURLE_OK);
        ASSERT_EQ(r.errorCode(), 0) << r.body;
        connections += r.newConnections;
    }
    EXPECT_EQ(connections, 1);
    TestClient https;
    useHttps(https);
    ASSERT_EQ(https.postForm(kHttpsUrl, loginFields()).errorCode(), 0);

    // Both clients keep their connections open; stopping must not wait out the keep-alive time.
    auto const before = std::chrono::steady_clock::now();
    emulator->stop();
    EXPECT_LT(std::chrono::steady_clock::now() - before, std::chrono::seconds(20));
    EXPECT_EQ(emulator->httpPort(), -1);

    std::string error;
    ASSERT_TRUE(emulator->start(error)) << error;
    // Sessions outlive a restart; the old connection is gone and the client opens a new one.
    const Reply r = client.postForm(emulator->httpUrl(), fqlCall());
    ASSERT_EQ(r.code, CURLE_OK);
    EXPECT_EQ(r.errorCode(), 0) << r.body;
    EXPECT_EQ(r.newConnections, 1);
}

TEST_F(ProtocolTest, PortsInUseAreReportedNotIgnored) {
    Emulator::Options o = options();
    o.httpPort = emulator->httpPort();
    o.httpsPort = -1;
    Emulator second(o);
    std::string error;
    EXPECT_FALSE(second.start(error));
    EXPECT_NE(error.find(std::to_string(o.httpPort)), std::string::npos) << error;
}

using FaultsTest = EmulatorFixture;

// Installs a rule written as on the command line.
void install(Emulator& e, std::string const& text) {
    std::string method, error;
    FaultRule rule;
    ASSERT_TRUE(Faults::parse(text, method, rule, error)) << error;
    e.faults().set(method, rule);
}

TEST_F(FaultsTest, ServiceErrorFaultsHitTheCallsTheirRuleSelects) {
    struct Case {
        char const* rule;
        char const* method;            // the method called, repeatedly
        std::vector<int> codes;        // the error code of each call in turn
        bool clearBeforeLast = false;  // an expired session stays expired once the fault is gone
    };
    const std::vector<Case> cases = {
        {"fql.query:error=2,every=3", "fql.query", {0, 0, 2, 0, 0, 2, 0}},
        {"*:error=2,every=2", "stream.get", {0, 2, 0, 2}},
        {"stream.get:error=2", "fql.query", {0, 0, 0}},
        {"fql.query:expire_after=2", "fql.query", {0, 0, 102, 102}, true},
    };
    for (Case const& c : cases) {
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
        char const* rule;
        CURLcode code;
        long status;
        bool wellFormedBody;
        char const* logged;
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
    for (Case const& c : cases) {
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
            auto const logged = emulator->log().entries();
            ASSERT_EQ(logged.size(), 1u);
            EXPECT_EQ(logged[0].fault, c.logged);

            // The client recovers: with the fault gone the next call is answered normally.
            emulator->faults().clearAll();
            const Reply next =
                overTls ? https.postForm(kHttpsUrl, fqlCall()) : client.postForm(emulator->httpUrl(), fqlCall());
            ASSERT_EQ(next.code, CURLE_OK);
            EXPECT_EQ(next.errorCode(), 0);
        }
    }
}

}  // namespace
}  // namespace emu::test
