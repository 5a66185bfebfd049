#include <gtest/gtest.h>

#include "ErrorAssertions.h"
#include "ServiceTransport.h"

namespace trelm::test {
namespace {

// The login of the emulator's demo account as the service's documentation signs it.
TEST(ServiceTransportTest, SignatureIsTheMd5OfTheSortedPairsAndTheSecret) {
    Map<String, String> args{{"password", "demo-password"},
                             {"email", "demo@trelm.example"},
                             {"api_key", "4f6b1e0c9a7d4c2e8b3a5d6f7e8c9b0a"}};
    ASSERT_OK(ServiceTransport::makeBaseArgs("facebook.auth.login", args));
    EXPECT_EQ(ServiceTransport::signature(args, "c3d2e1f0a9b8c7d6e5f4a3b2c1d0e9f8"),
              "2d3a5b9cce0389af55fe285fb827bfc1");
}

// Code 100 is a wrong e-mail or password only in a login's answer; everything else reads alike.
TEST(ServiceTransportTest, ErrorDocumentsReadTheSameForCallsAndLoginsButCode100) {
    struct Case {
        char const* code;
        unsigned call, login;
    } const cases[] = {{"2", kServiceUnavailable, kServiceUnavailable},
                       {"100", kServiceError, kNotSignedIn},
                       {" 102\n", kNotSignedIn, kNotSignedIn},
                       {"x2", kFailure, kFailure}};
    for (Case const& c : cases) {
        String const document = String("<error_response><error_code>") + c.code +
                                "</error_code><error_msg>text</error_msg></error_response>";
        EXPECT_CODE(ServiceTransport::errorOf(document, false), c.call) << c.code;
        EXPECT_CODE(ServiceTransport::errorOf(document, true), c.login) << c.code;
    }
    EXPECT_OK(ServiceTransport::errorOf("<users_setStatus_response>1</users_setStatus_response>", true));
}

}  // namespace
}  // namespace trelm::test
