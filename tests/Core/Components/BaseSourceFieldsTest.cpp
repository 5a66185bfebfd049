#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include "BaseSource.h"

namespace trelm {
namespace {

BaseSource::Record record() {
    return BaseSource::Record{{"type_int", 9},
                              {"type_text", "4"},
                              {"type_junk", "four"},
                              {"type_big", 1LL << 40},
                              {"text", "hello"},
                              {"text_empty", ""},
                              {"number", 12},
                              {"list", Vector<String>{"a"}},
                              {"empty_variant", Variant()}};
}

// fieldRequired reads an integer, fieldRequiredNotEmpty a non-empty text; both refuse what is
// missing or empty, and carry a failed conversion as the cause.
TEST(BaseSourceFieldsTest, RequiredFieldsReadTheirTypeOrRefuse) {
    struct Case {
        bool integer;  // fieldRequired; else fieldRequiredNotEmpty
        char const* key;
        unsigned code;
        bool wrapsCause;
        char const* text;  // what the reader wrote, as text; "untouched": nothing
    } const cases[] = {
        {true, "type_int", kSuccess, false, "9"},         {true, "type_text", kSuccess, false, "4"},
        {true, "absent", kInvalid, false, "untouched"},   {true, "empty_variant", kInvalid, false, "untouched"},
        {true, "type_junk", kInvalid, true, "untouched"}, {true, "type_big", kInvalid, true, "untouched"},
        {true, "list", kInvalid, true, "untouched"},      {false, "text", kSuccess, false, "hello"},
        {false, "number", kSuccess, false, "12"},         {false, "text_empty", kInvalid, false, "untouched"},
        {false, "absent", kInvalid, false, "untouched"},  {false, "empty_variant", kInvalid, false, "untouched"},
        {false, "list", kInvalid, true, "untouched"}};
    auto const r = record();
    for (auto const& c : cases) {
        SCOPED_TRACE(std::string(c.integer ? "integer " : "text ") + c.key);
        int number = -1;
        String text("untouched");
        uError e =
            c.integer ? BaseSource::fieldRequired(r, c.key, number) : BaseSource::fieldRequiredNotEmpty(r, c.key, text);
        EXPECT_CODE(e, c.code);
        EXPECT_EQ(e.cause() != nullptr, c.wrapsCause);
        EXPECT_EQ(number == -1 ? text.str() : std::to_string(number), c.text);
        if (!c.integer) {
            EXPECT_CODE(BaseSource::fieldRequiredStringNotEmpty(r, c.key), c.code);
        }
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
