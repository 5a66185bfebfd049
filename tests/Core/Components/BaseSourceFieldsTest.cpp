#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include "BaseSource.h"

namespace trelm {
namespace {

BaseSource::Record record() {
    return BaseSource::Record{
        {"type_int", 9},  {"type_text", "4"},      {"type_junk", "four"},      {"type_big", 1LL << 40},
        {"text", "hello"}, {"text_empty", ""},     {"number", 12},             {"list", Vector<String>{"a"}},
        {"empty_variant", Variant()},
    };
}

struct FieldCase {
    char const* key;
    unsigned code;
    bool wrapsCause;  // a conversion failure is carried as the cause
    char const* text;  // what the reader wrote, as text; "untouched": nothing
};

TEST(BaseSourceFieldsTest, FieldRequiredReadsAnIntegerOrRefuses) {
    char const* const none = "untouched";
    FieldCase const cases[] = {{"type_int", kSuccess, false, "9"}, {"type_text", kSuccess, false, "4"},
                               {"absent", kInvalid, false, none},   {"empty_variant", kInvalid, false, none},
                               {"type_junk", kInvalid, true, none}, {"type_big", kInvalid, true, none},
                               {"list", kInvalid, true, none}};
    auto const r = record();
    for (auto const& c : cases) {
        int out = -1;
        uError e = BaseSource::fieldRequired(r, c.key, out);
        EXPECT_CODE(e, c.code) << c.key;
        EXPECT_EQ(e.cause() != nullptr, c.wrapsCause) << c.key;
        EXPECT_EQ(out == -1 ? "untouched" : std::to_string(out), c.text) << c.key;
    }
}

TEST(BaseSourceFieldsTest, FieldRequiredNotEmptyRefusesMissingEmptyAndUnconvertible) {
    FieldCase const cases[] = {{"text", kSuccess, false, "hello"},
                               {"number", kSuccess, false, "12"},
                               {"text_empty", kInvalid, false, "untouched"},
                               {"absent", kInvalid, false, "untouched"},
                               {"empty_variant", kInvalid, false, "untouched"},
                               {"list", kInvalid, true, "untouched"}};
    auto const r = record();
    for (auto const& c : cases) {
        String out("untouched");
        uError e = BaseSource::fieldRequiredNotEmpty(r, c.key, out);
        EXPECT_CODE(e, c.code) << c.key;
        EXPECT_EQ(e.cause() != nullptr, c.wrapsCause) << c.key;
        EXPECT_EQ(out, c.text) << c.key;
        EXPECT_CODE(BaseSource::fieldRequiredStringNotEmpty(r, c.key), c.code) << c.key;
    }
}

TEST(BaseSourceFieldsTest, FieldOptionalTellsPresenceAndRefusesUnconvertible) {
    struct Case {
        char const* key;
        unsigned code;
        bool present;
        char const* text;
    } const cases[] = {{"text", kSuccess, true, "hello"},
                       {"text_empty", kSuccess, true, ""},
                       {"absent", kSuccess, false, "untouched"},
                       {"list", kInvalid, true /* untouched */, "untouched"}};
    auto const r = record();
    for (auto const& c : cases) {
        bool present = !c.present;
        if (c.code != kSuccess) present = c.present;
        String out("untouched");
        EXPECT_CODE(BaseSource::fieldOptional(r, c.key, present, out), c.code) << c.key;
        EXPECT_EQ(present, c.present) << c.key;
        EXPECT_EQ(out, c.text) << c.key;
    }
}

}  // namespace
}  // namespace trelm
