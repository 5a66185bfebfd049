#include "Signature.h"

#include <gtest/gtest.h>

namespace emu {
namespace {

// The digest of "api_key=kmethod=mv=1.0s" in any other spelling, a missing one, or the right one
// with another secret does not match. (Every signed call of the protocol tests checks the digest.)
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
