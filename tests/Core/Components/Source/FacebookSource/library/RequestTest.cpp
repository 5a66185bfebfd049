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

// A session call is signed with the session secret; an empty session id is no session: the call
// goes out as an application call, signed with the application secret.
TEST_F(RequestTest, CallsAreSignedWithTheSessionSecretOrElseTheApplicationSecret) {
    for (char const* session : {"", "SK"}) {
        signIn(session, "SS");
        ASSERT_OK(call());
        EXPECT_EQ(lastFields().contains("session_key"), *session != '\0') << session;
        EXPECT_TRUE(signedWith(lastFields(), *session != '\0' ? "SS" : "s")) << session;
    }
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
    for (int status : {199, 200, 299, 300, 503, 0}) {
        bool const ok = status >= 200 && status <= 299;
        http.queue({status, "<ok/>", status == 0 ? TRELM_ERROR(kFailure) : uError()});
        String response = "before";
        EXPECT_CODE(call(&response), ok ? kSuccess : kFailure) << status;
        EXPECT_EQ(response, ok ? "<ok/>" : "") << status;
    }
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
        for (char const* key : {"facebook_source_session_id", "facebook_source_session_secret",
                                "facebook_source_session_user"}) {
            put(key, "x");
        }
        http.queue(String("<error_response><error_code>") + c.serviceCode +
                   "</error_code><error_msg>m</error_msg></error_response>");
        EXPECT_CODE(call(), c.code);

        bool const drops = c.code == kNotSignedIn;
        String user;
        EXPECT_EQ(info->hasSession(), !drops);
        ASSERT_OK(info->getUserId(user));
        EXPECT_EQ(user, "42");
        EXPECT_EQ(stored("facebook_source_session_id") + stored("facebook_source_session_secret") +
                      stored("facebook_source_session_user"),
                  drops ? "--x" : "xxx");
        if (drops) {
            size_t const sent = http.exchanges().size();
            EXPECT_CODE(call(), kNotSignedIn) << "a refused session fails the next call locally";
            EXPECT_EQ(http.exchanges().size(), sent);
        }
    }
}

// Only a "1" answers a status post; anything else, though a well-formed answer, is a failure.
TEST_F(RequestTest, StatusAnswerOtherThanOneIsAFailure) {
    signIn();
    for (char const* answer : {"1", "0", "", "<other_response>1</other_response>"}) {
        bool const ok = std::string(answer) == "1";
        http.queue(answer[0] == '<' ? String(answer)
                                    : String("<users_setStatus_response>") + answer + "</users_setStatus_response>");
        EXPECT_CODE(lib->setStatus("s", false), ok ? kSuccess : kFailure) << answer;
    }
}

}  // namespace
}  // namespace trelm::test
