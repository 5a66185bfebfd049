#include "trelm/Configuration.h"

#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include "trelm/Set.h"

namespace trelm {
namespace {

Configuration::Group makeGroup() {
    // The conversions themselves are VariantTest's: here, what the group adds to them.
    Map<String, Variant> const values{
        {"flag_true", true}, {"flag_text", "false"}, {"list", Vector<String>{"a", "b"}},
        {"single", "solo"},  {"number", 7},
    };
    return Configuration::Group("source", values);
}

TEST(ConfigurationTest, GetBoolAcceptsBoolLikeValuesAndDefaultsWhenAbsent) {
    auto group = makeGroup();
    struct Case {
        char const* key;
        bool def;
        unsigned code;
        bool expected;  // value of out afterwards (starts as !def ^ ... see below)
    } const cases[] = {{"flag_true", false, kSuccess, true}, {"flag_text", true, kSuccess, false},
                       {"absent", true, kSuccess, true},     {"absent", false, kSuccess, false},
                       {"list", true, kInvalid, false}};
    for (auto const& c : cases) {
        // out starts as !def for successes so that a skipped write would show; for failures it
        // must keep its start value `expected`.
        bool out = c.code == kSuccess ? !c.expected : c.expected;
        EXPECT_CODE(group.get(c.key, out, c.def), c.code) << c.key;
        EXPECT_EQ(out, c.expected) << c.key;
    }
}

TEST(ConfigurationTest, GetListAcceptsListsAndASingleString) {
    auto group = makeGroup();
    Vector<String> const def{"default"};
    struct Case {
        char const* key;
        unsigned code;
        Vector<String> expected;
    } const cases[] = {{"list", kSuccess, {"a", "b"}},
                       {"single", kSuccess, {"solo"}},
                       {"absent", kSuccess, {"default"}},
                       {"number", kInvalid, {"untouched"}}};
    for (auto const& c : cases) {
        Vector<String> out{"untouched"};
        EXPECT_CODE(group.get(c.key, out, def), c.code) << c.key;
        EXPECT_EQ(out, c.expected) << c.key;
    }
}

TEST(ConfigurationTest, SetReplacesAndValuesAreOrderedByKey) {
    Configuration::Group group("g");
    ASSERT_OK(group.set("b", 1));
    ASSERT_OK(group.set("a", 2));
    ASSERT_OK(group.set("b", 3));
    ASSERT_EQ(group.values().size(), 2u);
    EXPECT_EQ(group.values().begin()->first, "a");
    EXPECT_EQ(group.get("b"), Variant(3));

    Set<Configuration::Value> values;
    ASSERT_OK(values.insert(Configuration::Value("k", "one")));
    ASSERT_OK(values.insert(Configuration::Value("k", "two")));
    EXPECT_EQ(values.size(), 1u);
}

}  // namespace
}  // namespace trelm
