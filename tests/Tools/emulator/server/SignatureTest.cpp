#include "Signature.h"

#include <gtest/gtest.h>

namespace emu {
namespace {

// Digests computed outside the program: printf '<text>' | md5sum
TEST(SignatureTest, DigestCoversSortedPairsThenTheSecret) {
    struct Case {
        Arguments args;
        const char* secret;
        const char* digest;
    };
    const std::vector<Case> cases = {
        // "api_key=kmethod=mv=1.0s"
        {{{"v", "1.0"}, {"method", "m"}, {"api_key", "k"}}, "s", "8159b22f8566a82474b00cde4c690b69"},
        // "sig" itself is never part of the text.
        {{{"v", "1.0"}, {"method", "m"}, {"api_key", "k"}, {"sig", "whatever"}}, "s",
         "8159b22f8566a82474b00cde4c690b69"},
        // Raw values (spaces, '=' and parentheses as they are); "call_id" sorts before "method".
        {{{"api_key", "4f6b1e0c9a7d4c2e8b3a5d6f7e8c9b0a"},
          {"call_id", "1"},
          {"method", "facebook.fql.query"},
          {"query", "SELECT name FROM user WHERE uid=me()"},
          {"session_key", "abc"},
          {"v", "1.0"}},
         "sessionsecret", "3d2b457babc28d7aa68b6fa2a3b36e58"},
    };
    for (const Case& c : cases) {
        EXPECT_EQ(Signature::compute(c.args, c.secret), c.digest);
        Arguments signedArgs = c.args;
        signedArgs["sig"] = c.digest;
        EXPECT_TRUE(Signature::matches(signedArgs, c.secret));
    }
}

TEST(SignatureTest, OnlyTheExactLowercaseDigestMatches) {
    Arguments args{{"api_key", "k"}, {"method", "m"}, {"v", "1.0"}};
    for (const char* sig : {"8159B22F8566A82474B00CDE4C690B69", "8159b22f8566a82474b00cde4c690b6", "", " 8159b22f8566a82474b00cde4c690b69"}) {
        args["sig"] = sig;
        EXPECT_FALSE(Signature::matches(args, "s")) << sig;
    }
    args.erase("sig");
    EXPECT_FALSE(Signature::matches(args, "s"));
    args["sig"] = "8159b22f8566a82474b00cde4c690b69";
    EXPECT_FALSE(Signature::matches(args, "S"));
}

}  // namespace
}  // namespace emu
