// The emulator's protocol over real loopback HTTP and HTTPS with libcurl.
#include <chrono>
#include <functional>

#include "EmulatorFixture.h"

namespace emu::test {
namespace {

using ProtocolTest = EmulatorFixture;

// A signed query call changed by `change`, then signed again with the session secret.
Fields resigned(ProtocolTest& t, const std::function<void(Fields&)>& change) {
    Fields f = t.fqlCall();
    change(f);
    return sign(f, t.session.secret);
}

struct ErrorCase {
    const char* name;
    bool https;
    std::function<Fields(ProtocolTest&)> fields;
    int code;
};

TEST_F(ProtocolTest, EachInvalidRequestGetsItsErrorDocument) {
    const std::vector<ErrorCase> cases = {
        {"wrong signature", false,
         [](ProtocolTest& t) { auto f = t.fqlCall(); f["sig"] = std::string(32, '0'); return f; }, 104},
        {"signed with the application secret instead of the session's", false,
         [](ProtocolTest& t) { return sign(t.fqlCall(), DemoAccount::appSecret); }, 104},
        {"unknown api_key", false, [](ProtocolTest& t) { return resigned(t, [](Fields& f) { f["api_key"] = "0123"; }); },
         101},
        {"missing method", false, [](ProtocolTest& t) { return resigned(t, [](Fields& f) { f.erase("method"); }); }, 3},
        {"unknown method", false, [](ProtocolTest& t) { return t.sessionCall("facebook.photos.delete"); }, 3},
        {"missing session", false,
         [](ProtocolTest& t) { return t.appCall("facebook.fql.query", {{"query", kFql}}); }, 102},
        {"expired session", false,
         [](ProtocolTest& t) {
             auto f = t.fqlCall();
             t.now += 3600;
             return f;
         },
         102},
        {"login over plain HTTP", false, [](ProtocolTest& t) { return t.loginFields(); }, 8},
        {"wrong password", true, [](ProtocolTest& t) { return t.loginFields("guess"); }, 100},
        {"fql.query without query", false, [](ProtocolTest& t) { return t.sessionCall("fql.query"); }, 100},
        // The service's order: an earlier check wins when several fail.
        {"unknown api_key before bad signature", false,
         [](ProtocolTest& t) { auto f = t.fqlCall(); f["api_key"] = "x"; return f; }, 101},
        {"missing method before bad session", false,
         [](ProtocolTest&) { return Fields{{"api_key", DemoAccount::apiKey}, {"session_key", "x"}}; }, 3},
        {"bad session before bad signature", false,
         [](ProtocolTest& t) { auto f = t.fqlCall(); f["session_key"] = "x"; return f; }, 102},
        {"bad signature before unknown method", false,
         [](ProtocolTest& t) { auto f = t.sessionCall("no.such"); f["sig"] = "0"; return f; }, 104},
    };

    TestClient https;
    useHttps(https);
    for (const ErrorCase& c : cases) {
        SCOPED_TRACE(c.name);
        // A fresh session for each case: the expired case moves the clock on.
        session = emulator->loginDemo();
        const Fields fields = c.fields(*this);
        const Reply r = c.https ? https.postForm(kHttpsUrl, fields) : client.postForm(emulator->httpUrl(), fields);
        ASSERT_EQ(r.code, CURLE_OK);
        EXPECT_EQ(r.status, 200);
        EXPECT_EQ(r.contentType, "text/xml; charset=utf-8");
        EXPECT_TRUE(wellFormed(r.body)) << r.body;
        EXPECT_EQ(r.errorCode(), c.code) << r.body;
        EXPECT_EQ(elementText(r.body, "error_msg"), Protocol::errorText(c.code));
        // Every argument comes back, sig and call_id included; the password never does.
        for (const auto& [key, value] : fields) {
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
        "<error_response xmlns=\"http://api.facebook.com/1.0/\" xmlns:xsi=\"http://www.w3.org/2001/XMLSchema-instance\">"
        "<error_code>104</error_code><error_msg>Incorrect signature</error_msg><request_args list=\"true\">"
        "<arg><key>api_key</key><value>" + std::string(DemoAccount::apiKey) + "</value></arg>"
        "<arg><key>call_id</key><value>1</value></arg>"
        "<arg><key>method</key><value>facebook.fql.query</value></arg>"
        "<arg><key>query</key><value>" + kFql + "</value></arg>"
        "<arg><key>session_key</key><value>" + session.key + "</value></arg>"
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
    for (const auto& [k, v] : all) (k == "method" || k == "api_key" || k == "v" ? inQuery : inBody)[k] = v;
    const std::string url = emulator->httpUrl() + "?" + client.encode(inQuery);

    struct Case {
        const char* name;
        std::function<Reply()> send;
        bool file;
    };
    const std::vector<Case> cases = {
        {"query string only (GET)", [&] { return client.get(emulator->httpUrl(), all); }, false},
        {"query string and url-encoded body", [&] { return client.postForm(url, inBody); }, false},
        {"query string and multipart body with a file", [&] { return client.postMultipart(url, inBody, &image); },
         true},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        emulator->log().clear();
        const Reply r = c.send();
        ASSERT_EQ(r.code, CURLE_OK);
        // Without the file the store answers 324: the call itself was valid and signed.
        EXPECT_EQ(r.errorCode(), c.file ? 0 : 324) << r.body;
        const auto logged = emulator->log().entries();
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
        const std::pair<const char*, bool> steps[] = {{"2", false}, {"2", true}, {"1", true}, {"x", true}, {"3", false}};
        for (const auto& [callId, refused] : steps) {
            const Reply r = client.postForm(emulator->httpUrl(),
                                            sessionCall("fql.query", {{"query", kFql}, {"call_id", callId}}));
            EXPECT_EQ(r.errorCode(), on && refused ? 103 : 0) << "call_id " << callId;
        }
    }
}

TEST_F(ProtocolTest, KeepAliveServesManyRequestsOnOneConnection) {
    long connections = 0;
    long port = -1;
    for (int i = 0; i < 300; ++i) {
        const Reply r = client.postForm(emulator->httpUrl(), fqlCall());
        ASSERT_EQ(r.code, CURLE_OK);
        ASSERT_EQ(r.errorCode(), 0) << r.body;
        connections += r.newConnections;
        if (port < 0) port = r.localPort;
        EXPECT_EQ(r.localPort, port) << "request " << i;
    }
    EXPECT_EQ(connections, 1);
}

TEST_F(ProtocolTest, StopDoesNotWaitForIdleKeepAliveConnections) {
    Emulator::Options o = options();
    o.keepAliveSeconds = 60;
    start(o);
    TestClient https;
    useHttps(https);
    ASSERT_EQ(client.postForm(emulator->httpUrl(), fqlCall()).errorCode(), 0);
    ASSERT_EQ(https.postForm(kHttpsUrl, loginFields()).errorCode(), 0);

    // Both clients keep their connections open; stopping must not wait out the keep-alive time.
    const auto before = std::chrono::steady_clock::now();
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

}  // namespace
}  // namespace emu::test
