#include <gtest/gtest.h>

#include <string>

#include "ErrorAssertions.h"
#include "ServiceTransport.h"

namespace trelm::test {
namespace {

// The login of the emulator's demo account as the service's documentation signs it.
TEST(ServiceTransportTest, SignatureIsTheMd5OfTheSortedPairsAndTheSecret) {
    Map<String, String> args;
    ASSERT_OK(ServiceTransport::makeBaseArgs("facebook.auth.login", args));
    ASSERT_OK(args.insert("password", "demo-password"));
    ASSERT_OK(args.insert("email", "demo@trelm.example"));
    ASSERT_OK(args.insert("api_key", "4f6b1e0c9a7d4c2e8b3a5d6f7e8c9b0a"));
    EXPECT_EQ(ServiceTransport::signature(args, "c3d2e1f0a9b8c7d6e5f4a3b2c1d0e9f8"),
              "2d3a5b9cce0389af55fe285fb827bfc1");
}

std::string errorDocument(std::string const& code) {
    return "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<error_response xmlns=\"http://api.facebook.com/1.0/\">"
           "<error_code>" + code + "</error_code><error_msg>text</error_msg></error_response>";
}

struct ErrorCase {
    char const* name;
    std::string document;
    unsigned call;   // errorOf(document, false)
    unsigned login;  // errorOf(document, true)
};

void PrintTo(ErrorCase const& c, std::ostream* os) { *os << c.name; }

class ServiceErrorTest : public ::testing::TestWithParam<ErrorCase> {};

TEST_P(ServiceErrorTest, ErrorDocumentGivesTheSystemsCode) {
    ErrorCase const& c = GetParam();
    EXPECT_CODE(ServiceTransport::errorOf(String(c.document), false), c.call);
    EXPECT_CODE(ServiceTransport::errorOf(String(c.document), true), c.login);
}

INSTANTIATE_TEST_SUITE_P(
    Codes, ServiceErrorTest,
    ::testing::Values(
        ErrorCase{"answer", "<users_setStatus_response>1</users_setStatus_response>", kSuccess, kSuccess},
        ErrorCase{"unavailable", errorDocument("2"), kServiceUnavailable, kServiceUnavailable},
        ErrorCase{"limit", errorDocument("4"), kRequestLimit, kRequestLimit},
        ErrorCase{"bad_parameter_or_credentials", errorDocument("100"), kServiceError, kNotSignedIn},
        ErrorCase{"session", errorDocument(" 102\n"), kNotSignedIn, kNotSignedIn},
        ErrorCase{"code_400", errorDocument("400"), kNotSignedIn, kNotSignedIn},
        ErrorCase{"code_401", errorDocument("401"), kNotSignedIn, kNotSignedIn},
        ErrorCase{"signature", errorDocument("104"), kServiceError, kServiceError},
        ErrorCase{"not_a_number", errorDocument("x2"), kFailure, kFailure},
        ErrorCase{"no_code", "<error_response><error_msg>m</error_msg></error_response>", kFailure, kFailure}),
    [](auto const& info) { return std::string(info.param.name); });

}  // namespace
}  // namespace trelm::test
