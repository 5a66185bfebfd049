#include "trelm/uError.h"

#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include "trelm/String.h"

namespace trelm {
namespace {

TEST(uErrorTest, HighBitDecidesFailureAndNoDataIsNotAFailure) {
    struct Case {
        unsigned code;
        bool failed;
    } const cases[] = {{kSuccess, false}, {kNoData, false}, {kFailure, true},
                       {kOutOfMemory, true}, {kServiceUnavailable, true}, {0x7fffffffu, false}};
    for (auto const& c : cases) {
        uError e(c.code, "", "f", 1);
        EXPECT_EQ(e.failed(), c.failed) << std::hex << c.code;
        EXPECT_EQ(e.ok(), !c.failed) << std::hex << c.code;
    }
    EXPECT_OK(uError());
    EXPECT_EQ(uError().cause(), nullptr);
}

TEST(uErrorTest, FormatRendersTheWholeChainOuterFirst) {
    uError inner(kOutOfMemory, "node", "Core/Common/Include/trelm/Map", 31);
    uError middle(kInvalid, inner, "", "Core/Components/Source/FacebookSource/FacebookSource", 7);
    uError outer(kFailure, middle, nullptr, "Core/Libraries/trelmfacebook/loader", 46);
    String text("trace: ");  // appended to, not replaced
    outer.format(text);
    EXPECT_EQ(text,
              "trace: 0x80000001 at Core/Libraries/trelmfacebook/loader:46\n"
              "  caused by 0x80000004 at Core/Components/Source/FacebookSource/FacebookSource:7\n"
              "  caused by 0x80000010 at Core/Common/Include/trelm/Map:31: node");
    ASSERT_NE(outer.cause(), nullptr);
    ASSERT_NE(outer.cause()->cause(), nullptr);
    EXPECT_EQ(outer.cause()->cause()->code(), kOutOfMemory);
    EXPECT_EQ(outer.cause()->cause()->cause(), nullptr);
}

TEST(uErrorTest, CopiesShareTheCauseAndSurviveTheOriginal) {
    uError copy;
    {
        uError cause = TRELM_ERROR_MSG(kNotFound, String("no such key"));
        uError wrapped = TRELM_WRAP(kFailure, cause);
        copy = wrapped;
    }
    ASSERT_NE(copy.cause(), nullptr);
    EXPECT_EQ(copy.cause()->code(), kNotFound);
    EXPECT_EQ(copy.cause()->message(), "no such key");
    EXPECT_TRUE(copy.message().empty());
}

}  // namespace
}  // namespace trelm
