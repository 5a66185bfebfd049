#include "trelm/Variant.h"

#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <climits>

namespace trelm {
namespace {

enum class Target { Int, Int64, UInt, Bool, Guid, Str, IntList, StrList };

GUID const kGuid = [] {
    GUID g;
    // A well-formed literal; GUIDTest covers the parsing.
    GUID::fromString("0f1e2d3c-4b5a-4978-8695-a4b3c2d1e0f9", g).ignore();
    return g;
}();

// Runs the conversion twice, into out-parameters pre-set to two different sentinels, so that any
// write on refusal shows. On success `result` holds the converted value.
template <class T>
uError tryAs(Variant const& in, T first, T second, Variant& result, bool& untouched) {
    T const a = first, b = second;
    uError e = in.as(first);
    in.as(second).ignore();  // answers as the first call; only whether it writes matters
    result = first;
    untouched = first == a && second == b;
    return e;
}

uError convert(Variant const& in, Target target, Variant& result, bool& untouched) {
    switch (target) {
        case Target::Int: return tryAs(in, -777, -778, result, untouched);
        case Target::Int64: return tryAs(in, -777LL, -778LL, result, untouched);
        case Target::UInt: return tryAs(in, 777u, 778u, result, untouched);
        case Target::Bool: return tryAs(in, true, false, result, untouched);
        case Target::Guid: return tryAs(in, GUID::generate(), GUID::generate(), result, untouched);
        case Target::Str: return tryAs(in, String("sentinel"), String("other"), result, untouched);
        case Target::IntList: return tryAs(in, Vector<int>{-777}, Vector<int>{}, result, untouched);
        case Target::StrList:
            return tryAs(in, Vector<String>{"sentinel"}, Vector<String>{}, result, untouched);
    }
    return uError();
}

struct ConversionCase {
    char const* name;
    Variant in;
    Target target;
    bool ok;
    Variant expected;  // meaningful when ok
};

void PrintTo(ConversionCase const& c, std::ostream* os) { *os << c.name << " " << c.in; }

class VariantConversionTest : public testing::TestWithParam<ConversionCase> {};

TEST_P(VariantConversionTest, ConvertsWhereTheValueAllowsAndOtherwiseLeavesTheTarget) {
    ConversionCase const& c = GetParam();
    Variant result;
    bool untouched = false;
    uError e = convert(c.in, c.target, result, untouched);
    if (c.ok) {
        ASSERT_OK(e);
        EXPECT_EQ(result, c.expected);
    } else {
        EXPECT_CODE(e, kInvalid);
        EXPECT_TRUE(untouched) << "out-parameter written on refusal, now " << result;
    }
}

Variant const kNone;
std::string const kGuidText = "0f1e2d3c-4b5a-4978-8695-a4b3c2d1e0f9";

using C = ConversionCase;

INSTANTIATE_TEST_SUITE_P(
    Table, VariantConversionTest,
    testing::Values(
        // to int
        C{"Int32ToInt", 5, Target::Int, true, 5},
        C{"Int64MaxIntToInt", (long long)INT_MAX, Target::Int, true, INT_MAX},
        C{"Int64AboveIntToInt", (long long)INT_MAX + 1, Target::Int, false, kNone},
        C{"Int64BelowIntToInt", (long long)INT_MIN - 1, Target::Int, false, kNone},
        C{"UInt32MaxIntToInt", 2147483647u, Target::Int, true, INT_MAX},
        C{"UInt32AboveIntToInt", 2147483648u, Target::Int, false, kNone},
        C{"DecimalStringToInt", "-12", Target::Int, true, -12},
        C{"JunkStringToInt", "12x", Target::Int, false, kNone}, C{"BoolToInt", true, Target::Int, false, kNone},
        C{"EmptyToInt", kNone, Target::Int, false, kNone}, C{"IntListToInt", Vector<int>{1}, Target::Int, false, kNone},
        // to long long
        C{"Int32ToInt64", -1, Target::Int64, true, -1LL},
        C{"UInt32ToInt64", UINT_MAX, Target::Int64, true, 4294967295LL},
        C{"MinStringToInt64", "-9223372036854775808", Target::Int64, true, LLONG_MIN},
        C{"OverflowStringToInt64", "9223372036854775808", Target::Int64, false, kNone},
        // to unsigned
        C{"NegativeInt32ToUInt", -1, Target::UInt, false, kNone},
        C{"Int64MaxUIntToUInt", 4294967295LL, Target::UInt, true, UINT_MAX},
        C{"Int64AboveUIntToUInt", 4294967296LL, Target::UInt, false, kNone},
        C{"StringToUInt", "4294967295", Target::UInt, true, UINT_MAX},
        // to bool
        C{"BoolToBool", false, Target::Bool, true, false}, C{"OneToBool", 1, Target::Bool, true, true},
        C{"ZeroInt64ToBool", 0LL, Target::Bool, true, false}, C{"TwoToBool", 2, Target::Bool, false, kNone},
        C{"TrueStringToBool", "true", Target::Bool, true, true},
        C{"ZeroStringToBool", "0", Target::Bool, true, false},
        C{"YesStringToBool", "yes", Target::Bool, false, kNone},
        // to GUID
        C{"GuidToGuid", kGuid, Target::Guid, true, kGuid},
        C{"GuidTextToGuid", String(kGuidText), Target::Guid, true, kGuid},
        C{"OtherTextToGuid", "nope", Target::Guid, false, kNone},
        // to String
        C{"StringToString", "x", Target::Str, true, "x"}, C{"Int32ToString", -3, Target::Str, true, "-3"},
        C{"Int64ToString", 100000000000LL, Target::Str, true, "100000000000"},
        C{"UInt32ToString", 4000000000u, Target::Str, true, "4000000000"},
        C{"BoolToString", true, Target::Str, true, "true"},
        C{"GuidToString", kGuid, Target::Str, true, String(kGuidText)},
        C{"IntListToString", Vector<int>{1}, Target::Str, false, kNone},
        C{"EmptyToString", kNone, Target::Str, false, kNone},
        // to Vector<int>
        C{"IntListToIntList", Vector<int>{1, 2}, Target::IntList, true, Vector<int>{1, 2}},
        C{"SingleIntToIntList", 7, Target::IntList, true, Vector<int>{7}},
        C{"BigInt64ToIntList", 1LL << 40, Target::IntList, false, kNone},
        C{"DecimalStringListToIntList", Vector<String>{"1", "-2"}, Target::IntList, true, Vector<int>{1, -2}},
        C{"MixedStringListToIntList", Vector<String>{"1", "x"}, Target::IntList, false, kNone},
        C{"StringToIntList", "5", Target::IntList, false, kNone},
        // to Vector<String>
        C{"StringListToStringList", Vector<String>{"a"}, Target::StrList, true, Vector<String>{"a"}},
        C{"IntListToStringList", Vector<int>{1, -2}, Target::StrList, true, Vector<String>{"1", "-2"}},
        C{"StringToStringList", "a", Target::StrList, false, kNone}),
    [](testing::TestParamInfo<ConversionCase> const& info) { return info.param.name; });

// The accessors give defaults where the value does not convert; toString prints lists.
TEST(VariantTest, AccessorsGiveDefaultsWhenTheValueDoesNotConvertAndToStringPrintsLists) {
    Variant text("not a number");
    EXPECT_EQ(text.asInt32(), 0);
    EXPECT_EQ(text.asInt64(), 0);
    EXPECT_EQ(text.asUInt32(), 0u);
    EXPECT_TRUE(text.asGUID().isNull());
    EXPECT_EQ(Variant(Vector<int>{1}).asString(), "");
    EXPECT_EQ(Variant("42").asInt32(), 42);
    EXPECT_EQ(Variant().toString(), "");
    EXPECT_EQ(Variant(Vector<int>{1, 2}).toString(), "[1, 2]");
    EXPECT_EQ(Variant(Vector<String>{"a", "b"}).toString(), "[a, b]");
}

TEST(VariantTest, OrderIsByTypeCodeThenByValue) {
    // Empty < Bool < String < Guid < IntList < StringList < Int32 < Int64 < UInt32.
    EXPECT_TRUE(Variant() < Variant(false));
    EXPECT_TRUE(Variant(true) < Variant(""));
    EXPECT_TRUE(Variant("zzz") < Variant(kGuid));
    EXPECT_TRUE(Variant(Vector<String>{}) < Variant(-5));
    EXPECT_TRUE(Variant(1000) < Variant(0LL));  // Int32 before Int64 whatever the values
    EXPECT_TRUE(Variant(-2) < Variant(1));
    EXPECT_TRUE(Variant("ab") < Variant("abc"));
    EXPECT_FALSE(Variant(1) < Variant(1));
    EXPECT_NE(Variant(5), Variant(5LL));
    EXPECT_EQ(Variant("a"), Variant(String("a")));
}

}  // namespace
}  // namespace trelm
