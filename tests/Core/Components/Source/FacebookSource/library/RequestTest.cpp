#include <gtest/gtest.h>

#include "ConnectionInfo.h"
#include "LibraryFixture.h"

namespace trelm::test {
namespace {

using Fields = std::vector<std::pair<std::string, std::string>>;

class RequestTest : public LibraryFixture {
protected:
    // Signs and sends a bare call "m" through the path every service call takes.
    uError call(String& response) {
        Map<String, String> args;
        EXPECT_TRUE(lib->makeBaseArgs("m", args).ok());
        return lib->runFacebookRequest(args, SmartPtr<InputDataStream>(), response);
    }
    uError call() {
        String response;
        return call(response);
    }
    static String errorDocument(char const* code) {
        return String("<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<error_response><error_code>") + code +
               "</error_code><error_msg>text</error_msg><request_args list=\"true\"/></error_response>";
    }
};

// md5("api_key=kmethod=mv=1.0s"): the pairs in key order, run together, the secret last.
TEST_F(RequestTest, ApplicationCallIsSignedWithTheApplicationSecretOverSortedPairs) {
    Map<String, String> args;
    ASSERT_TRUE(lib->makeBaseArgs("m", args).ok());
    ASSERT_TRUE(lib->addAuth(args, false).ok());
    EXPECT_EQ(entries(args), (Fields{{"api_key", "k"},
                                     {"method", "m"},
                                     {"sig", "8159b22f8566a82474b00cde4c690b69"},
                                     {"v", "1.0"}}));
}

// md5("api_key=kcall_id=1method=msession_key=SKv=1.0SS").
TEST_F(RequestTest, SessionCallCarriesSessionKeyAndCallIdAndIsSignedWithTheSessionSecret) {
    signIn("SK", "SS");
    ASSERT_TRUE(call().ok());
    auto sent = http.exchanges();
    ASSERT_EQ(sent.size(), 1u);
    EXPECT_EQ(sent[0].url, "http://api.facebook.com/restserver.php");
    EXPECT_EQ(entries(sent[0].fields), (Fields{{"api_key", "k"},
                                               {"call_id", "1"},
                                               {"method", "m"},
                                               {"session_key", "SK"},
                                               {"sig", "0f8286907dce2e0d651ddbb0516239ba"},
                                               {"v", "1.0"}}));
    EXPECT_FALSE(sent[0].upload);
}

// An empty session id is no session: the call goes out as an application call.
TEST_F(RequestTest, EmptySessionIdSendsAnApplicationCall) {
    signIn("", "SS");
    ASSERT_TRUE(call().ok());
    EXPECT_EQ(entries(lastFields()), (Fields{{"api_key", "k"},
                                             {"method", "m"},
                                             {"sig", "8159b22f8566a82474b00cde4c690b69"},
                                             {"v", "1.0"}}));
}

// The counter belongs to the client, survives a change of session, and only session calls use it.
TEST_F(RequestTest, CallIdCountsSessionCallsOverTheClientsLife) {
    signIn();
    std::vector<std::string> ids;
    for (int n = 0; n < 3; ++n) {
        ASSERT_TRUE(call().ok());
        ids.push_back(lastFields().search("call_id")->str());
    }
    Map<String, String> app;
    ASSERT_TRUE(lib->makeBaseArgs("m", app).ok());
    ASSERT_TRUE(lib->addAuth(app, false).ok());
    EXPECT_FALSE(app.contains("call_id"));
    signIn("SK2", "SS2");
    ASSERT_TRUE(call().ok());
    ids.push_back(lastFields().search("call_id")->str());
    EXPECT_EQ(ids, (std::vector<std::string>{"1", "2", "3", "4"}));
}

TEST_F(RequestTest, CallsThatCannotAuthenticateAnswerNotSignedInWithoutARequest) {
    // No session.
    EXPECT_EQ(call().code(), kNotSignedIn);
    // No application data at all.
    auto bare = makeSmart<FacebookLibrary::ConnectionInfo>(kTag);
    ASSERT_TRUE(bare->setSessionConfig("SK", "SS", "1", false, false).ok());
    FacebookLibrary other;
    ASSERT_TRUE(other.setup(bare).ok());
    Map<String, String> args;
    String response;
    EXPECT_EQ(other.runFacebookRequest(args, SmartPtr<InputDataStream>(), response).code(), kNotSignedIn);
    // Not set up.
    FacebookLibrary unset;
    EXPECT_EQ(unset.runFacebookRequest(args, SmartPtr<InputDataStream>(), response).code(), kNotSignedIn);
    EXPECT_TRUE(http.exchanges().empty());
}

TEST_F(RequestTest, OnlyStatus200To299IsSuccess) {
    signIn();
    struct Case {
        int status;
        unsigned code;
    };
    Case const cases[] = {{199, kFailure}, {200, kSuccess}, {204, kSuccess}, {299, kSuccess},
                          {300, kFailure}, {404, kFailure}, {503, kFailure}};
    for (Case const& c : cases) {
        SCOPED_TRACE(c.status);
        http.queue(FakeHttpRequestFactory::Answer{c.status, "<ok/>", uError()});
        String response = "before";
        EXPECT_EQ(call(response).code(), c.code);
        EXPECT_EQ(response, c.code == kSuccess ? "<ok/>" : "before");
    }
    // Every completed exchange gives its connection back for reuse.
    EXPECT_EQ(http.disconnects(), 7u);
}

TEST_F(RequestTest, TransportFailuresAreReported) {
    signIn();
    http.queue(FakeHttpRequestFactory::Answer{0, "", TRELM_ERROR_MSG(kFailure, "connection refused")});
    EXPECT_EQ(call().code(), kFailure);

    http.refuseRequests(true);
    EXPECT_EQ(call().code(), kFailure);
    http.refuseRequests(false);

    ASSERT_TRUE(registry.remove("HttpRequestFactory").ok());
    EXPECT_EQ(call().code(), kFailure);
}

// The whole translation of the service's error codes, and which of them drop the session.
TEST_F(RequestTest, ServiceErrorDocumentsTranslateToCodesAndSessionErrorsDropTheSession) {
    struct Case {
        char const* serviceCode;
        unsigned code;
        bool dropsSession;
    };
    Case const cases[] = {
        {"2", kServiceUnavailable, false}, {"4", kRequestLimit, false},   {"102", kNotSignedIn, true},
        {"400", kNotSignedIn, true},       {"401", kNotSignedIn, true},   {"1", kServiceError, false},
        {"100", kServiceError, false},     {"104", kServiceError, false}, {"601", kServiceError, false},
        {"0", kServiceError, false},       {"-4", kServiceError, false},  {"\n 102 \n", kNotSignedIn, true},
        {"abc", kFailure, false},          {"", kFailure, false},         {"4x", kFailure, false},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(std::string("service code '") + c.serviceCode + "'");
        EXPECT_EQ(FacebookLibrary::resolveBaseFacebookErrorCode(c.serviceCode).code(), c.code);

        signIn("SK", "SS", "42");
        store.clearRecords();
        http.queue(errorDocument(c.serviceCode));
        EXPECT_EQ(call().code(), c.code);

        String out;
        EXPECT_EQ(info->getSessionId(out).ok(), !c.dropsSession);
        ASSERT_TRUE(info->getUserId(out).ok());
        EXPECT_EQ(out, "42");
        auto records = store.records();
        if (c.dropsSession) {
            ASSERT_EQ(records.size(), 1u);
            EXPECT_EQ(records[0].type, "ResetRuntimeConfigurationMessage");
            EXPECT_EQ(records[0].tag, kTag);
            EXPECT_EQ(records[0].keys,
                      (Set<String>{"facebook_source_session_id", "facebook_source_session_secret"}));
        } else {
            EXPECT_TRUE(records.empty());
        }
    }
}

TEST_F(RequestTest, ErrorDocumentWithoutCodeIsAGeneralFailure) {
    signIn();
    http.queue(String("<error_response><error_msg>x</error_msg></error_response>"));
    EXPECT_EQ(call().code(), kFailure);
}

// After the service refused the session, the next call does not go out at all.
TEST_F(RequestTest, RefusedSessionMakesTheNextCallFailLocally) {
    signIn();
    http.queue(errorDocument("102"));
    EXPECT_EQ(call().code(), kNotSignedIn);
    EXPECT_EQ(call().code(), kNotSignedIn);
    EXPECT_EQ(http.exchanges().size(), 1u);
}

TEST_F(RequestTest, UploadTravelsWithTheRequest) {
    auto photo = makeSmart<InputDataStream>();
    ASSERT_TRUE(photo->setUri("/tmp/photo.jpg").ok());
    Map<String, String> args{{"a", "b"}};
    String response;
    ASSERT_TRUE(lib->sendPost("http://example.org/x", args, photo, response).ok());
    auto sent = http.exchanges();
    ASSERT_EQ(sent.size(), 1u);
    EXPECT_EQ(sent[0].url, "http://example.org/x");
    EXPECT_EQ(sent[0].upload, SmartPtr<InputDataStream>(photo));
    EXPECT_EQ(entries(sent[0].fields), (Fields{{"a", "b"}}));
}

}  // namespace
}  // namespace trelm::test
