#include "trelm/String.h"

#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <climits>
#include <functional>
#include <string>
#include <vector>

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

// Texts on both sides of what a String keeps in itself (15 bytes) and beyond.
std::vector<std::string> const kSharingTexts = {"", "short", std::string(15, 'a'), std::string(16, 'b'),
                                                "core_object_origin_importcomponent"};

// Every change of a String, each with what it does to a std::string holding the same text. Run on a
// String held alone (changed in place) and on one whose block a copy shares (changed on its own copy).
struct Change {
    char const* name;
    std::function<void(String&)> onString;
    std::function<void(std::string&)> onModel;
};

std::vector<Change> const kChanges = {
    {"append long", [](String& s) { s += String("-and-a-piece-longer-than-fifteen"); },
     [](std::string& m) { m += "-and-a-piece-longer-than-fifteen"; }},
    {"append char", [](String& s) { s += 'x'; }, [](std::string& m) { m += 'x'; }},
    {"append text", [](String& s) { s += "tail"; }, [](std::string& m) { m += "tail"; }},
    {"append itself", [](String& s) { s += s; }, [](std::string& m) { m += m; }},
    {"erase middle", [](String& s) { s.erase(2, 5); },
     [](std::string& m) { m.erase(std::min<std::size_t>(2, m.size()), 5); }},
    {"erase to end", [](String& s) { s.erase(1); },
     [](std::string& m) { m.erase(std::min<std::size_t>(1, m.size())); }},
    {"erase all", [](String& s) { s.erase(0); }, [](std::string& m) { m.clear(); }},
    {"assign long", [](String& s) { s.assign("assigned text of some length", 28); },
     [](std::string& m) { m.assign("assigned text of some length"); }},
    {"assign short", [](String& s) { s.assign("abc", 3); }, [](std::string& m) { m.assign("abc"); }},
    {"assign a part of itself", [](String& s) { s.assign(s.cStr() + s.size() / 2, s.size() - s.size() / 2); },
     [](std::string& m) { m = m.substr(m.size() / 2); }},
    {"copy-assign", [](String& s) { s = String("a replacement that is rather long"); },
     [](std::string& m) { m = "a replacement that is rather long"; }},
    {"copy-assign itself",
     [](String& s) {
         String const& same = s;
         s = same;
     },
     [](std::string&) {}},
    {"move-assign itself",
     [](String& s) {
         String& same = s;
         s = std::move(same);
     },
     [](std::string&) {}},
};

void expectText(String const& s, std::string const& text, std::string const& where) {
    EXPECT_EQ(s.str(), text) << where;
    EXPECT_EQ(s.size(), text.size()) << where;
    EXPECT_EQ(std::string(s.cStr()), text.substr(0, text.find('\0'))) << where;  // NUL-terminated
    EXPECT_TRUE(s == String(text)) << where;
    EXPECT_FALSE(s < String(text) || String(text) < s) << where;
    EXPECT_EQ(std::hash<String>()(s), std::hash<std::string>()(text)) << where;
}

TEST(StringTest, ChangingOneCopyLeavesTheOthersAlone) {
    for (std::string const& text : kSharingTexts) {
        for (Change const& change : kChanges) {
            std::string model = text;
            change.onModel(model);
            std::string const where = change.name + std::string(" on \"") + text + "\"";

            String alone(text);
            change.onString(alone);
            expectText(alone, model, where + ", held alone");

            String changed(text);
            String const before = changed;  // copied before the change
            change.onString(changed);
            String const after = changed;  // copied after it
            expectText(changed, model, where + ", shared");
            expectText(before, text, where + ", the copy made before");
            expectText(after, model, where + ", the copy made after");

            // The other way round: the original changes, the copy keeps the old text.
            String original(text);
            String const copy = original;
            change.onString(original);
            expectText(copy, text, where + ", copy of the changed original");
        }
    }
}

TEST(StringTest, MovedFromStringIsEmptyAndUsable) {
    for (std::string const& text : kSharingTexts) {
        String source(text);
        String const sharer = source;
        String moved(std::move(source));
        expectText(moved, text, "moved to, from \"" + text + "\"");
        expectText(source, "", "moved from");  // NOLINT(bugprone-use-after-move): on purpose
        source += "again and long enough to need a block";
        expectText(source, "again and long enough to need a block", "refilled");

        String target("a target whose text is shared with keep");
        String const keep = target;
        target = std::move(moved);
        expectText(target, text, "move-assigned");
        expectText(moved, "", "move-assigned from");  // NOLINT(bugprone-use-after-move): on purpose
        expectText(keep, "a target whose text is shared with keep", "the target's old text");
        expectText(sharer, text, "the source's copy");
    }
}

// Texts of one length whose first difference is at each position (the next byte then differs the
// other way, so that a later byte cannot decide), and prefixes of every length: the order must be
// that of the first differing unsigned byte.
TEST(StringTest, OrderAgreesWithUnsignedBytesAtEveryPosition) {
    std::string const base = "core_object_origin_importcomponent_0123";  // 39 bytes
    struct Pair {
        char low;
        char high;
    } const pairs[] = {{'a', 'b'}, {'\x7f', '\x80'}, {'\0', '\xff'}, {'A', 'a'}};
    for (std::size_t at = 0; at < base.size(); ++at) {
        for (Pair const& pair : pairs) {
            std::string low = base;
            std::string high = base;
            low[at] = pair.low;
            high[at] = pair.high;
            if (at + 1 < base.size()) {
                low[at + 1] = '\xff';
                high[at + 1] = '\0';
            }
            String const lowString(low);
            String const highString(high);
            EXPECT_TRUE(lowString < highString) << "byte " << at;
            EXPECT_FALSE(highString < lowString) << "byte " << at;
            EXPECT_FALSE(lowString == highString) << "byte " << at;
        }
    }
    for (std::size_t length = 0; length < base.size(); ++length) {
        String const prefix(base.substr(0, length));
        EXPECT_TRUE(prefix < String(base)) << length;
        EXPECT_FALSE(String(base) < prefix) << length;
        EXPECT_FALSE(prefix == String(base)) << length;
    }
}

}  // namespace
}  // namespace trelm
