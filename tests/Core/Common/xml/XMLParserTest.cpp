#include "trelm/XMLParser.h"

#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <string>
#include <vector>

namespace trelm {
namespace {

// Records every callback with the path seen at that moment; consecutive chars() are merged so
// the record does not depend on how expat splits text.
class RecordingParser : public XMLParser {
public:
    std::vector<std::string> events;
    // Fails the callback named "<kind>:<name>" (kind start, end or chars; chars by text).
    std::string failOn;
    unsigned failCode = kNotSupported;

protected:
    uError start(String const& name, Vector<String> const& attributes) override {
        std::string e = "start " + name.str() + " @" + path().str();
        for (unsigned i = 0; i + 1 < attributes.size(); i += 2) {
            e += " " + attributes[i].str() + "=" + attributes[i + 1].str();
        }
        return record(e, "start:" + name.str());
    }
    uError end(String const& name) override {
        return record("end " + name.str() + " @" + path().str(), "end:" + name.str());
    }
    uError chars(String const& text) override {
        if (!events.empty() && events.back().rfind("chars ", 0) == 0) {
            std::string& last = events.back();
            std::size_t at = last.rfind(" @");
            last.insert(at, text.str());
        } else {
            events.push_back("chars " + text.str() + " @" + path().str());
        }
        if (!failOn.empty() && failOn == "chars:" + text.str()) return TRELM_ERROR(failCode);
        return TRELM_OK();
    }

private:
    uError record(std::string event, std::string const& key) {
        events.push_back(std::move(event));
        if (key == failOn) return TRELM_ERROR(failCode);
        return TRELM_OK();
    }
};

// A failing callback stops the run with its own error; the next run starts with an empty path.
// The path holds the element from its start to its end, and no more at its end.
TEST(XMLParserTest, FailingCallbackStopsParseWithItsOwnErrorAndTheNextRunStartsAfresh) {
    struct Case {
        char const* failOn;
        std::vector<std::string> events;  // everything recorded, the failing callback last
    } const cases[] = {
        {"start:b", {"start r @.r", "start a @.r.a", "chars one @.r.a", "end a @.r", "start b @.r.b"}},
        {"end:a", {"start r @.r", "start a @.r.a", "chars one @.r.a", "end a @.r"}},
        {"chars:one", {"start r @.r", "start a @.r.a", "chars one @.r.a"}},
        {"end:r",
         {"start r @.r", "start a @.r.a", "chars one @.r.a", "end a @.r", "start b @.r.b", "chars two @.r.b",
          "end b @.r", "start c @.r.c", "end c @.r", "end r @"}},
    };
    for (Case const& c : cases) {
        RecordingParser p;
        p.failOn = c.failOn;
        EXPECT_CODE(p.runParser(String("<r><a>one</a><b>two</b><c/></r>")), kNotSupported) << c.failOn;
        EXPECT_EQ(p.events, c.events) << c.failOn;
        p.failOn.clear();
        p.events.clear();
        ASSERT_OK(p.runParser(String("<other/>")));
        EXPECT_EQ(p.events, (std::vector<std::string>{"start other @.other", "end other @"})) << c.failOn;
    }
}

TEST(XMLParserTest, MalformedDocumentReportsFailureWithExpatPosition) {
    RecordingParser p;
    uError e = p.runParser(String("<a>\n<b></a>"));
    EXPECT_CODE(e, kFailure);
    EXPECT_NE(e.message().str().find("line 2"), std::string::npos) << e;
    EXPECT_NE(e.message().str().find("mismatched tag"), std::string::npos) << e;
}

TEST(XMLParserTest, IsNilAcceptsAnyPrefixAndTrueOrOne) {
    struct Case {
        Vector<String> attributes;
        bool nil;
    } cases[] = {
        {{"xsi:nil", "true"}, true},
        {{"list", "true", "i:nil", "1"}, true},
        {{"nil", "true"}, true},
        {{"xsi:nil", "false"}, false},
        {{"xsi:nilx", "true"}, false},
        {{"true", "xsi:nil"}, false},
        {{}, false},
    };
    for (auto const& c : cases) {
        EXPECT_EQ(XMLParser::isNil(c.attributes), c.nil) << c.attributes.size();
    }
}

}  // namespace
}  // namespace trelm
