#include "trelm/GUID.h"

#include <gtest/gtest.h>

#include <regex>
#include <set>

namespace trelm {
namespace {

TEST(GUIDTest, GeneratedValuesAreDistinctAndInLowercaseCanonicalForm) {
    std::set<GUID> seen;
    std::regex const form("^[0-9a-f]{8}-[0-9a-f]{4}-4[0-9a-f]{3}-[89ab][0-9a-f]{3}-[0-9a-f]{12}$");
    for (int i = 0; i < 1000; ++i) {
        GUID g = GUID::generate();
        EXPECT_FALSE(g.isNull());
        EXPECT_TRUE(std::regex_match(g.toString().str(), form)) << g.toString();
        EXPECT_TRUE(seen.insert(g).second) << "duplicate " << g;
    }
}

TEST(GUIDTest, TextRoundTripsAndUppercaseIsAccepted) {
    GUID g = GUID::generate();
    GUID back;
    ASSERT_EQ(GUID::fromString(g.toString(), back).code(), kSuccess);
    EXPECT_EQ(back, g);
    GUID upper;
    ASSERT_EQ(GUID::fromString("0F1E2D3C-4B5A-4978-8695-A4B3C2D1E0F9", upper).code(), kSuccess);
    EXPECT_EQ(upper.toString(), "0f1e2d3c-4b5a-4978-8695-a4b3c2d1e0f9");
}

TEST(GUIDTest, MalformedTextIsRefusedAndLeavesTheTargetUntouched) {
    GUID const original = GUID::generate();
    for (char const* text : {"", "0f1e2d3c4b5a49788695a4b3c2d1e0f9",
                             "0f1e2d3c-4b5a-4978-8695-a4b3c2d1e0f",
                             "0f1e2d3c-4b5a-4978-8695-a4b3c2d1e0f9a",
                             "0f1e2d3c-4b5a-4978-8695_a4b3c2d1e0f9",
                             "{0f1e2d3c-4b5a-4978-8695-a4b3c2d1e0f}",
                             "0f1e2d3c-4b5a-4978-8695-a4b3c2d1e0fg"}) {
        GUID target = original;
        EXPECT_EQ(GUID::fromString(text, target).code(), kInvalid) << text;
        EXPECT_EQ(target, original) << text;
    }
}

TEST(GUIDTest, OrderFollowsTheBytesAndMatchesTheText) {
    GUID a, b;
    ASSERT_TRUE(GUID::fromString("00000000-0000-0000-0000-0000000000ff", a).ok());
    ASSERT_TRUE(GUID::fromString("00000000-0000-0000-0000-000000000100", b).ok());
    EXPECT_TRUE(a < b);
    EXPECT_FALSE(b < a);
    EXPECT_TRUE(GUID() < a);
    EXPECT_TRUE(GUID().isNull());
    for (int i = 0; i < 100; ++i) {
        GUID x = GUID::generate(), y = GUID::generate();
        EXPECT_EQ(x < y, x.toString() < y.toString());
    }
}

}  // namespace
}  // namespace trelm
