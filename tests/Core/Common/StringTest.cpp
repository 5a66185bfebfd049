#include "trelm/String.h"

#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <climits>

namespace trelm {
namespace {

TEST(StringTest, OrderIsBytewiseWithShorterPrefixFirst) {
    EXPECT_TRUE(String("ab") < String("abc"));
    EXPECT_FALSE(String("abc") < String("ab"));
    EXPECT_TRUE(String("") < String("a"));
    EXPECT_TRUE(String("B") < String("a"));  // no case folding
    // Bytes compare as unsigned: a UTF-8 lead byte sorts after ASCII.
    EXPECT_TRUE(String("z") < String("\xc3\xa9"));
    EXPECT_FALSE(String("same") < String("same"));
}

TEST(StringTest, FindAnswersNposWhenAbsentAndSeesPastNulBytes) {
    String s("a,b,,c");
    EXPECT_EQ(s.find(',', 2), 3u);
    EXPECT_EQ(s.find(String(",,")), 3u);
    EXPECT_EQ(s.find('x'), String::npos);
    EXPECT_EQ(s.find(String("c"), 6), String::npos);
    EXPECT_EQ(s.find(',', 100), String::npos);
    String nul("a\0b", 3);
    EXPECT_EQ(nul.size(), 3u);
    EXPECT_EQ(nul.find('b'), 2u);
    EXPECT_NE(nul, String("a"));
}

TEST(StringTest, SubstrAndEraseClampOutOfRangePositions) {
    String s("hello");
    EXPECT_EQ(s.substr(1, 3), "ell");
    EXPECT_EQ(s.substr(3), "lo");
    EXPECT_EQ(s.substr(5), "");
    EXPECT_EQ(s.substr(99, 2), "");
    String t("hello");
    t.erase(1, 2);
    EXPECT_EQ(t, "hlo");
    t.erase(10);
    EXPECT_EQ(t, "hlo");
    t.erase(1);
    EXPECT_EQ(t, "h");
}

TEST(StringTest, FromWritesDecimalTextAtTheLimits) {
    EXPECT_EQ(String::from(INT_MIN), "-2147483648");
    EXPECT_EQ(String::from(INT_MAX), "2147483647");
    EXPECT_EQ(String::from(UINT_MAX), "4294967295");
    EXPECT_EQ(String::from(LLONG_MIN), "-9223372036854775808");
    EXPECT_EQ(String::from(ULLONG_MAX), "18446744073709551615");
}

// A refused text leaves the out-parameter as it was.
template <class T>
void expectParse(char const* text, bool ok, T value, T sentinel) {
    T out = sentinel;
    uError const e = String(text).to(out);
    if (ok) EXPECT_OK(e) << text;
    else EXPECT_CODE(e, kInvalid) << text;
    EXPECT_EQ(out, ok ? value : sentinel) << text;
}

TEST(StringTest, WholeTextMustBeADecimalInRange) {
    struct Case {
        char const* text;
        bool intOk;
        int intValue;
        bool unsignedOk;
        unsigned unsignedValue;
    } const cases[] = {
        {"0", true, 0, true, 0}, {"42", true, 42, true, 42}, {"2147483647", true, INT_MAX, true, 2147483647u},
        {"2147483648", false, 0, true, 2147483648u}, {"-2147483648", true, INT_MIN, false, 0},
        {"-2147483649", false, 0, false, 0}, {"4294967295", false, 0, true, UINT_MAX},
        {"4294967296", false, 0, false, 0}, {"-1", true, -1, false, 0}, {"007", true, 7, true, 7},
        {"", false, 0, false, 0}, {"-", false, 0, false, 0}, {"+5", false, 0, false, 0}, {" 5", false, 0, false, 0},
        {"5 ", false, 0, false, 0}, {"12abc", false, 0, false, 0}, {"1.5", false, 0, false, 0},
        {"0x10", false, 0, false, 0}, {"99999999999999999999", false, 0, false, 0},
    };
    for (Case const& c : cases) {
        expectParse(c.text, c.intOk, c.intValue, -777);
        expectParse(c.text, c.unsignedOk, c.unsignedValue, 777u);
    }
}

}  // namespace
}  // namespace trelm
