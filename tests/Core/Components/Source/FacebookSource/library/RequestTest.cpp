#include "LibraryFixture.h"

namespace trelm::test {
namespace {

class RequestTest : public LibraryFixture {
protected:
    // A bare call "m" through the path every service call takes.
    uError call(String* response = nullptr) {
        Map<String, String> args;
        String body;
        EXPECT_OK(lib->makeBaseArgs("m", args));
        uError err = lib->runFacebookRequest(args, SmartPtr<InputDataStream>(), body);
        if (response) *response = body;
        return err;
    }
};

// Pairs in key order, run together, the secret last. An application call (an empty session id
// is no session): md5("api_key=kmethod=mv=1.0s"). A session call also carries the session key and
// a call id: md5("api_key=kcall_id=1method=msession_key=SKv=1.0SS").
TEST_F(RequestTest, CallsAreSignedWithTheSessionSecretOrElseTheApplicationSecret) {
    Fields const application{
        {"api_key", "k"}, {"method", "m"}, {"sig", "8159b22f8566a82474b00cde4c690b69"}, {"v", "1.0"}};
    Map<String, String> args;
    ASSERT_OK(lib->makeBaseArgs("m", args));
    ASSERT_OK(lib->addAuth(args, false));
    EXPECT_EQ(entries(args), application);

    signIn("", "SS");
    ASSERT_OK(call());
    EXPECT_EQ(entries(lastFields()), application);

    signIn("SK", "SS");
    ASSERT_OK(call());
    auto sent = http.exchanges();
    ASSERT_EQ(sent.size(), 2u);
    EXPECT_EQ(sent[1].url, "http://api.facebook.com/restserver.php");
    EXPECT_EQ(entries(sent[1].fields), (Fields{{"api_key", "k"}, {"call_id", "1"}, {"method", "m"},
                                               {"session_key", "SK"}, {"sig", "0f8286907dce2e0d651ddbb0516239ba"},
                                               {"v", "1.0"}}));
}

// The counter belongs to the client: it survives a new session and only session calls use it.
TEST_F(RequestTest, CallIdCountsSessionCallsOverTheClientsLife) {
    signIn();
    std::vector<std::string> ids;
    for (int n = 0; n < 4; ++n) {
        if (n == 2) {
            Map<String, String> app;
            ASSERT_OK(lib->addAuth(app, false));
            signIn("SK2", "SS2");
        }
        ASSERT_OK(call());
        ids.push_back(lastFields().search("call_id")->str());
    }
    EXPECT_EQ(ids, (std::vector<std::string>{"1", "2", "3", "4"}));
}

TEST_F(RequestTest, CallsThatCannotAuthenticateAnswerNotSignedInWithoutARequest) {
    EXPECT_CODE(call(), kNotSignedIn);  // no session
    auto noApp = makeSmart<FacebookLibrary::ConnectionInfo>(kTag);
    ASSERT_OK(noApp->setSessionConfig("SK", "SS", "1", false, false));
    lib = makeSmart<FacebookLibrary>();
    ASSERT_OK(lib->setup(noApp));
    EXPECT_CODE(call(), kNotSignedIn);  // no application data
    lib = makeSmart<FacebookLibrary>();
    EXPECT_CODE(call(), kNotSignedIn);  // no settings
    EXPECT_TRUE(http.exchanges().empty());
}

// Only a status from 200 to 299 is an answer; a failed or impossible exchange is a failure.
TEST_F(RequestTest, OnlyStatus200To299IsSuccessAndTransportFailuresAreFailures) {
    signIn();
    for (int status : {199, 200, 204, 299, 300, 404, 503, 0}) {
        bool const ok = status >= 200 && status <= 299;
        http.queue({status, "<ok/>", status == 0 ? TRELM_ERROR(kFailure) : uError()});
        String response = "before";
        EXPECT_CODE(call(&response), ok ? kSuccess : kFailure) << status;
        EXPECT_EQ(response, ok ? "<ok/>" : "") << status;
    }
    http.refuseRequests(true);
    EXPECT_CODE(call(), kFailure);
    ASSERT_OK(registry.remove("HttpRequestFactory"));
    EXPECT_CODE(call(), kFailure);
}

// The service's error codes, and which of them drop the session (in memory and in the store,
// so that the next call fails without going out) while keeping the user.
TEST_F(RequestTest, ServiceErrorsTranslateAndSessionErrorsDropTheSession) {
    struct Case {
        char const* serviceCode;
        unsigned code;
    } const cases[] = {
        {"2", kServiceUnavailable}, {"4", kRequestLimit}, {"102", kNotSignedIn}, {"400", kNotSignedIn},
        {"401", kNotSignedIn},      {"1", kServiceError}, {"100", kServiceError}, {"104", kServiceError},
        {"0", kServiceError},       {"-4", kServiceError}, {"\n 102 ", kNotSignedIn}, {"abc", kFailure},
        {"", kFailure},             {"4x", kFailure},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(std::string("service code '") + c.serviceCode + "'");
        EXPECT_CODE(FacebookLibrary::resolveBaseFacebookErrorCode(c.serviceCode), c.code);
        signIn("SK", "SS", "42");
        store.clearRecords();
        http.queue(String("<error_response><error_code>") + c.serviceCode +
                   "</error_code><error_msg>m</error_msg></error_response>");
        EXPECT_CODE(call(), c.code);

        bool const drops = c.code == kNotSignedIn;
        String user;
        EXPECT_EQ(info->hasSession(), !drops);
        ASSERT_OK(info->getUserId(user));
        EXPECT_EQ(user, "42");
        auto records = store.records();
        ASSERT_EQ(records.size(), drops ? 1u : 0u);
        if (drops) {
            EXPECT_EQ(records[0].type, "ResetRuntimeConfigurationMessage");
            EXPECT_EQ(records[0].keys, (Set<String>{"facebook_source_session_id", "facebook_source_session_secret"}));
            size_t const sent = http.exchanges().size();
            EXPECT_CODE(call(), kNotSignedIn) << "a refused session fails the next call locally";
            EXPECT_EQ(http.exchanges().size(), sent);
        }
    }
}

}  // namespace
}  // namespace trelm::test
