// Reading arguments and the file from url-encoded and multipart bodies, and the text rule for
// bytes that are not UTF-8 or that XML cannot carry.
#include <gtest/gtest.h>

#include "RequestParser.h"
#include "Utf8Text.h"

namespace emu::test {
namespace {

struct BodyCase {
    char const* name;
    std::string contentType;
    std::string body;
    bool accepted;
    Arguments args;
    std::optional<std::string> file;
};

TEST(RequestParserTest, BodiesOfTheEraGiveTheirArgumentsAndTheFirstFile) {
    const std::string b = "----abc";
    const std::string type = "multipart/form-data; boundary=" + b;
    const std::string jpeg("\xFF\xD8\xFF\x00\r\n--", 7);
    const std::vector<BodyCase> cases = {
        {"url-encoded: plus, escapes, a broken escape, a pair without '=', an empty name",
         "application/x-www-form-urlencoded",
         "a=x+y%26z&b=100%&c&=lost&d=%zz%41",
         true,
         {{"a", "x y&z"}, {"b", "100%"}, {"c", ""}, {"d", "%zzA"}},
         std::nullopt},
        {"file part without a name, as the era's client library sent it",
         type,
         "--" + b + "\r\nContent-Disposition: form-data; name=\"caption\"\r\n\r\nhi\r\n--" + b +
             "\r\nContent-Disposition: form-data; filename=\"a;b.jpg\"\r\nContent-Type: image/jpeg\r\n\r\n" + jpeg +
             "\r\n--" + b + "--\r\n",
         true,
         {{"caption", "hi"}},
         jpeg},
        {"file part named _file; a second file part is dropped",
         type,
         "preamble\r\n--" + b + "\r\nContent-Disposition: form-data; name=\"_file\"; filename=\"x\"\r\n\r\nONE\r\n--" +
             b + "\r\ncontent-disposition: FORM-DATA; NAME=two; FILENAME=y\r\n\r\nTWO\r\n--" + b + "--",
         true,
         {},
         std::string("ONE")},
        {"bare line feeds, a part without a disposition, an empty filename",
         type,
         "--" + b + "\nContent-Disposition: form-data; name=\"a\"\n\n1\n--" + b + "\nX-Other: 1\n\nlost\n--" + b +
             "\nContent-Disposition: form-data; name=\"f\"; filename=\"\"\n\n\n--" + b + "--\n",
         true,
         {{"a", "1"}},
         std::string()},
        {"no closing delimiter",
         type,
         "--" + b + "\r\nContent-Disposition: form-data; name=\"a\"\r\n\r\n1",
         false,
         {},
         std::nullopt},
        {"multipart without a boundary", "multipart/form-data", "--" + b + "--", false, {}, std::nullopt},
        {"another type adds nothing", "text/plain", "a=1", true, {}, std::nullopt},
    };
    for (BodyCase const& c : cases) {
        SCOPED_TRACE(c.name);
        HttpCall call;
        call.args["from_query"] = "q";
        EXPECT_EQ(RequestParser::addBody(c.contentType, c.body, call), c.accepted);
        Arguments expected = c.args;
        expected["from_query"] = "q";
        EXPECT_EQ(call.args, expected);
        EXPECT_EQ(call.haveFile, c.file.has_value());
        if (c.file) {
            EXPECT_EQ(call.file, *c.file);
        }
    }
}

TEST(RequestParserTest, TextsBecomeValidUtf8ThatXmlCanCarry) {
    const std::string fffd = "\xEF\xBF\xBD";
    struct Case {
        std::string in, cleaned;
    };
    const std::vector<Case> cases = {
        {"plain ascii\ttab\r\n", "plain ascii\ttab\r\n"},
        {"caf\xC3\xA9 \xE2\x98\x95 \xF0\x9F\x98\x80", "caf\xC3\xA9 \xE2\x98\x95 \xF0\x9F\x98\x80"},
        {"caf\xE9", "caf" + fffd},                                              // Latin-1
        {std::string("a\0b\x01", 4), "a" + fffd + "b" + fffd},                  // controls XML cannot carry
        {"\xED\xA0\x80", fffd + fffd + fffd},                                   // a surrogate
        {"\xEF\xBF\xBE\xEF\xBF\xBF", fffd + fffd + fffd + fffd + fffd + fffd},  // U+FFFE, U+FFFF
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.in);
        EXPECT_EQ(Utf8Text::clean(c.in), c.cleaned);
        EXPECT_EQ(Utf8Text::isClean(c.in), c.in == c.cleaned);
        std::string xml, json;
        Utf8Text::appendXml(xml, c.in + "<&>\"'");
        Utf8Text::appendJson(json, c.in + "\"\\");
        EXPECT_EQ(xml.find(c.cleaned + "&lt;&amp;&gt;&quot;&apos;"), 0u);
        EXPECT_NE(json.find("\\\"\\\\"), std::string::npos);
    }
}

}  // namespace
}  // namespace emu::test
