#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <map>
#include <string>
#include <vector>

#include "trelm/FStreamParseObj.h"
#include "trelm/FqlParseObj.h"

namespace trelm {
namespace {

using Row = std::map<String, String>;

struct Case {
    char const* name;
    std::string body;  // inside the root element
    std::vector<Row> rows;
};

std::vector<Row> plain(Vector<Map<String, String>> const& rows) {
    std::vector<Row> out;
    for (auto const& r : rows) out.push_back(r.map());
    return out;
}

// Posts whose shape puts a field where only its place decides whether a row takes it.
TEST(AnswerShapesTest, StreamPostsTakeOnlyTheLeavesInTheirPlace) {
    auto post = [](std::string const& inside) { return "<posts><stream_post>" + inside + "</stream_post></posts>"; };
    std::string const link = "<stream_media><type>link</type><src>l.jpg</src></stream_media>";
    std::string const photo =
        "<stream_media><type>photo</type><src>p.jpg</src><photo><pid>9</pid></photo></stream_media>";
    Case const cases[] = {
        {"a repeated leaf gives its last text",
         post("<post_id>1</post_id><message>one</message><message>two</message>"),
         {{{"is_status", "1"}, {"post_id", "1"}, {"message", "two"}}}},
        {"the first photo medium counts, after a link",
         post("<created_time>5</created_time><attachment><media>" + link + photo + "</media></attachment>"),
         {{{"is_photo", "1"}, {"src", "p.jpg"}, {"pid", "9"}, {"created_time", "5"}}}},
        {"a status type with a link medium is a status",
         post("<post_id>2</post_id><type>46</type><attachment><media>" + link + "</media></attachment>"),
         {{{"is_status", "1"}, {"post_id", "2"}}}},
        {"a medium outside attachment.media is none",
         post("<post_id>3</post_id><attachment>" + photo + "</attachment>"),
         {{{"is_status", "1"}, {"post_id", "3"}}}},
        {"photo fields below the photo's children are not read",
         post("<attachment><media><stream_media><type>photo</type><photo><x><pid>9</pid></x><aid>4</aid></photo>"
              "</stream_media></media></attachment>"),
         {{{"is_photo", "1"}, {"aid", "4"}}}},
        {"a field with elements inside is no leaf",
         post("<post_id>4</post_id><message>a<b>c</b>d</message><source_id>7</source_id>"),
         {{{"is_status", "1"}, {"post_id", "4"}, {"source_id", "7"}}}},
        {"a post outside posts is no row", "<stream_post><post_id>5</post_id></stream_post>", {}},
    };
    for (Case const& c : cases) {
        Vector<Map<String, String>> rows;
        unsigned count = 0;
        std::string const xml = "<stream_get_response>" + c.body + "</stream_get_response>";
        ASSERT_OK(FStreamParseObj().parse(String(xml), rows, count)) << c.name;
        EXPECT_EQ(plain(rows), c.rows) << c.name;
        EXPECT_EQ(count, c.rows.size()) << c.name;
    }
}

// Nested and nil fields of FQL rows around each other: a field's name is its path inside the row,
// whatever closed before it.
TEST(AnswerShapesTest, FqlFieldNamesFollowNestingAroundNilElements) {
    Case const cases[] = {
        {"a nil element's children are left out",
         R"(<user><a xsi:nil="true"><b>1</b></a><c><d>2</d></c></user>)",
         {{{"c.d", "2"}}}},
        {"a nil child does not shorten its parent's path",
         R"(<user><p><q xsi:nil="true"/><r>3</r></p><s>4</s></user>)",
         {{{"p.r", "3"}, {"s", "4"}}}},
        {"deep fields return to the row's level",
         "<user><a><b><c>1</c></b><d>2</d></a><e>3</e></user>",
         {{{"a.b.c", "1"}, {"a.d", "2"}, {"e", "3"}}}},
        {"each row starts its names afresh",
         "<user><a><b>1</b></a></user><user><b>2</b></user>",
         {{{"a.b", "1"}}, {{"b", "2"}}}},
    };
    for (Case const& c : cases) {
        Vector<Map<String, String>> rows;
        unsigned count = 0;
        std::string const xml = "<fql_query_response xmlns:xsi=\"x\">" + c.body + "</fql_query_response>";
        ASSERT_OK(FqlParseObj("fql_query_response", "user", 0).parse(String(xml), rows, count)) << c.name;
        EXPECT_EQ(plain(rows), c.rows) << c.name;
    }
}

}  // namespace
}  // namespace trelm
