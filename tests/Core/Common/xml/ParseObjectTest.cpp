#include <gtest/gtest.h>

#include <functional>
#include <map>
#include <ostream>
#include <string>

#include "XmlFixtures.h"
#include "trelm/FStreamParseObj.h"
#include "trelm/FlatParseObj.h"
#include "trelm/FqlParseObj.h"
#include "trelm/HashParseObj.h"
#include "trelm/ListHashParseObj.h"
#include "trelm/ListParseObj.h"

namespace trelm {
namespace {

using test::loadXml;
using Row = std::map<String, String>;
using Rows = Vector<Map<String, String>>;

std::vector<Row> plain(Rows const& rows) {
    std::vector<Row> out;
    for (auto const& r : rows) out.push_back(r.map());
    return out;
}

// --- HashParseObj / FlatParseObj / ListParseObj / ListHashParseObj --------------------------

TEST(HashParseObjTest, ErrorDocumentGivesCodeAndMessageAndStructuredArgsAsEmpty) {
    Map<String, String> out;
    HashParseObj p("error_response");
    ASSERT_EQ(p.parse(loadXml("error_response.xml"), out).code(), kSuccess);
    EXPECT_EQ(out.map(), (Row{{"error_code", "102"},
                              {"error_msg", "Session key invalid or no longer valid"},
                              {"request_args", ""}}));
}

TEST(HashParseObjTest, AnswerIsNotMistakenForErrorDocument) {
    Map<String, String> out;
    out.insert("kept", "yes");
    HashParseObj p("error_response");
    uError e = p.parse(loadXml("auth_login_response.xml"), out);
    EXPECT_EQ(e.code(), kFailure);
    EXPECT_EQ(out.map(), (Row{{"kept", "yes"}}));
}

TEST(HashParseObjTest, LoginAnswerGivesSessionFields) {
    Map<String, String> out;
    HashParseObj p("auth_login_response");
    ASSERT_EQ(p.parse(loadXml("auth_login_response.xml"), out).code(), kSuccess);
    EXPECT_EQ(out.map(), (Row{{"session_key", "2.b1c2d3e4f5a6b7c8d9e0f1a2.3600.1262307600-1001"},
                              {"uid", "1001"},
                              {"secret", "9f8e7d6c5b4a39281706f5e4d3c2b1a0"},
                              {"expires", "0"}}));
}

TEST(HashParseObjTest, UploadAnswerDecodesEntitiesInValues) {
    Map<String, String> out;
    HashParseObj p("photos_upload_response");
    ASSERT_EQ(p.parse(loadXml("photos_upload_response.xml"), out).code(), kSuccess);
    EXPECT_EQ(out.size(), 9u);
    EXPECT_EQ(*out.search("pid"), "1001_90210");
    EXPECT_EQ(*out.search("link"), "http://www.facebook.com/photo.php?pid=90210&id=1001");
}

TEST(HashParseObjTest, NilChildIsAbsentAndEmptyChildIsEmpty) {
    Map<String, String> out;
    HashParseObj p("r");
    ASSERT_EQ(p.parse(String(R"(<r xmlns:xsi="x"><a xsi:nil="true"/><b/><c></c><d> </d></r>)"), out).code(),
              kSuccess);
    EXPECT_EQ(out.map(), (Row{{"b", ""}, {"c", ""}, {"d", " "}}));
}

TEST(FlatParseObjTest, StatusAnswerGivesItsValue) {
    String out = "old";
    FlatParseObj p("users_setStatus_response");
    ASSERT_EQ(p.parse(loadXml("users_setStatus_response.xml"), out).code(), kSuccess);
    EXPECT_EQ(out, "1");
}

TEST(FlatParseObjTest, ErrorDocumentFailsAndKeepsOutput) {
    String out = "old";
    FlatParseObj p("users_setStatus_response");
    EXPECT_EQ(p.parse(loadXml("error_response.xml"), out).code(), kFailure);
    EXPECT_EQ(out, "old");
}

TEST(ListParseObjTest, FriendsAnswerGivesIdsInOrderAfterExistingEntries) {
    Vector<String> out{"existing"};
    ListParseObj p("friends_get_response");
    ASSERT_EQ(p.parse(loadXml("friends_get_response.xml"), out).code(), kSuccess);
    EXPECT_EQ(out, (Vector<String>{"existing", "1002", "1003", "1017"}));
}

TEST(ListParseObjTest, NilEntriesAreLeftOut) {
    Vector<String> out;
    ListParseObj p("l");
    ASSERT_EQ(p.parse(String(R"(<l><v>1</v><v xsi:nil="true"/><v></v></l>)"), out).code(), kSuccess);
    EXPECT_EQ(out, (Vector<String>{"1", ""}));
}

TEST(ListHashParseObjTest, InboxAnswerGivesOneRecordPerThread) {
    Rows rows;
    ListHashParseObj p("mailbox_getInbox_response");
    ASSERT_EQ(p.parse(loadXml("mailbox_getInbox_response.xml"), rows).code(), kSuccess);
    EXPECT_EQ(plain(rows), (std::vector<Row>{
                               {{"tid", "3001"}, {"subject", "Dinner on Friday?"}, {"last_update", "1262400000"},
                                {"unread", "1"}, {"message_count", "4"}},
                               {{"tid", "3000"}, {"subject", ""}, {"last_update", "1262300000"},
                                {"unread", "0"}, {"message_count", "1"}},
                           }));
}

// --- FqlParseObj ----------------------------------------------------------------------------

TEST(FqlParseObjTest, NestedFieldsAreDottedNilFieldsAbsentEmptyFieldsEmpty) {
    Rows rows;
    unsigned count = 99;
    FqlParseObj p("fql_query_response", "user", 0);
    ASSERT_EQ(p.parse(loadXml("fql_query_response_users.xml"), rows, count).code(), kSuccess);
    EXPECT_EQ(count, 3u);
    EXPECT_EQ(plain(rows),
              (std::vector<Row>{
                  {{"uid", "1001"},
                   {"name", "Ada Tester"},
                   {"about_me", ""},
                   {"current_location.city", "Z\xC3\xBCrich"},
                   {"current_location.country", "Switzerland"},
                   {"current_location.zip", ""},
                   {"status.message", "Reading <XML> & \"quotes\""},
                   {"status.time", "1262304000"},
                   {"status.status_id", "55"}},
                  {{"uid", "1002"},
                   {"name", "Bo Example"},
                   {"about_me", "line one\nline two"},
                   {"status.message", ""},
                   {"status.time", "0"},
                   {"status.status_id", "0"},
                   {"birthday", "March 3"}},
                  {{"uid", "1003"},
                   {"name", "Cy Sample"},
                   {"about_me", "\xE2\x98\xBA"},
                   {"current_location", ""},
                   {"birthday", ""}},
              }));
}

struct SkipCase {
    unsigned skip;
    std::vector<std::string> uids;
};

void PrintTo(SkipCase const& c, std::ostream* os) { *os << "skip " << c.skip; }

class FqlParseObjSkipTest : public ::testing::TestWithParam<SkipCase> {};

TEST_P(FqlParseObjSkipTest, SkippedRowsAreCountedButNotReturned) {
    Rows rows;
    unsigned count = 0;
    FqlParseObj p("fql_query_response", "user", GetParam().skip);
    ASSERT_EQ(p.parse(loadXml("fql_query_response_users.xml"), rows, count).code(), kSuccess);
    EXPECT_EQ(count, 3u);
    std::vector<std::string> uids;
    for (auto const& r : rows) uids.push_back(r.search("uid")->str());
    EXPECT_EQ(uids, GetParam().uids);
}

INSTANTIATE_TEST_SUITE_P(Skips, FqlParseObjSkipTest,
                         ::testing::Values(SkipCase{0, {"1001", "1002", "1003"}}, SkipCase{1, {"1002", "1003"}},
                                           SkipCase{3, {}}, SkipCase{7, {}}));

TEST(FqlParseObjTest, EmptyAnswerIsSuccessWithNoRows) {
    Rows rows;
    rows.pushBack(Map<String, String>{{"earlier", "row"}});
    unsigned count = 99;
    FqlParseObj p("fql_query_response", "user", 0);
    ASSERT_EQ(p.parse(loadXml("fql_query_response_empty.xml"), rows, count).code(), kSuccess);
    EXPECT_EQ(count, 0u);
    EXPECT_EQ(plain(rows), (std::vector<Row>{{{"earlier", "row"}}}));
}

TEST(FqlParseObjTest, OnlyElementsOfTheRowTableAreRows) {
    Rows rows;
    unsigned count = 99;
    FqlParseObj p("fql_query_response", "photo", 0);
    ASSERT_EQ(p.parse(loadXml("fql_query_response_users.xml"), rows, count).code(), kSuccess);
    EXPECT_EQ(count, 0u);
    EXPECT_TRUE(rows.empty());
}

TEST(FqlParseObjTest, ErrorDocumentFailsWithoutRows) {
    Rows rows;
    unsigned count = 99;
    FqlParseObj p("fql_query_response", "user", 0);
    EXPECT_EQ(p.parse(loadXml("error_response.xml"), rows, count).code(), kFailure);
    EXPECT_TRUE(rows.empty());
    EXPECT_EQ(count, 0u);
}

TEST(FqlParseObjTest, RowsReadBeforeATruncationStay) {
    std::string whole = loadXml("fql_query_response_users.xml").str();
    // Cut inside the third row.
    std::string cut = whole.substr(0, whole.find("<uid>1003</uid>") + 8);
    Rows rows;
    unsigned count = 0;
    FqlParseObj p("fql_query_response", "user", 0);
    EXPECT_EQ(p.parse(String(cut), rows, count).code(), kFailure);
    ASSERT_EQ(rows.size(), 2u);
    EXPECT_EQ(*rows[1].search("uid"), "1002");
    EXPECT_EQ(count, 2u);
}

TEST(FqlParseObjTest, RepeatedNestedFieldKeepsFirstValue) {
    Rows rows;
    unsigned count = 0;
    FqlParseObj p("fql_query_response", "stream", 0);
    ASSERT_EQ(p.parse(String("<fql_query_response><stream><attachment><media>"
                             "<stream_media><src>first</src></stream_media>"
                             "<stream_media><src>second</src></stream_media>"
                             "</media></attachment></stream></fql_query_response>"),
                      rows, count)
                  .code(),
              kSuccess);
    EXPECT_EQ(plain(rows), (std::vector<Row>{{{"attachment.media.stream_media.src", "first"}}}));
}

// --- FStreamParseObj ------------------------------------------------------------------------

TEST(FStreamParseObjTest, StreamAnswerGivesOneRowPerPostByKind) {
    Rows rows;
    unsigned count = 0;
    FStreamParseObj p;
    ASSERT_EQ(p.parse(loadXml("stream_get_response.xml"), rows, count).code(), kSuccess);
    EXPECT_EQ(count, 5u);
    EXPECT_EQ(plain(rows),
              (std::vector<Row>{
                  // status update (type 46): comment texts and times must not leak in
                  {{"is_status", "1"},
                   {"post_id", "1002_501"},
                   {"source_id", "1002"},
                   {"created_time", "1262396000"},
                   {"message", "Off to the mountains & back on Monday"}},
                  // photo post: the first photo medium, the post's own time
                  {{"is_photo", "1"},
                   {"pid", "1003_77"},
                   {"aid", "1003_12"},
                   {"owner", "1003"},
                   {"src", "http://photos.example/s1003_77.jpg"},
                   {"alt", "The lake at noon"},
                   {"created_time", "1262394000"}},
                  // link post
                  {{"post_id", "1004_503"}, {"created_time", "1262392000"}},
                  // wall post without media counts as a status
                  {{"is_status", "1"},
                   {"post_id", "1002_504"},
                   {"source_id", "1001"},
                   {"created_time", "1262390000"},
                   {"message", ""}},
                  // photo medium without its photo element: no pid, aid or owner
                  {{"is_photo", "1"},
                   {"src", "http://photos.example/s1005_90.jpg"},
                   {"alt", ""},
                   {"created_time", "1262388000"}},
              }));
}

TEST(FStreamParseObjTest, StatusPostWithNilMessageHasNoMessageField) {
    Rows rows;
    unsigned count = 0;
    FStreamParseObj p;
    ASSERT_EQ(p.parse(String(R"(<stream_get_response><posts list="true"><stream_post>)"
                             R"(<post_id>1_2</post_id><type>46</type><message xsi:nil="true"/>)"
                             R"(<created_time>5</created_time></stream_post></posts></stream_get_response>)"),
                      rows, count)
                  .code(),
              kSuccess);
    EXPECT_EQ(plain(rows), (std::vector<Row>{{{"is_status", "1"}, {"post_id", "1_2"}, {"created_time", "5"}}}));
}

TEST(FStreamParseObjTest, ErrorDocumentFails) {
    Rows rows;
    unsigned count = 9;
    FStreamParseObj p;
    EXPECT_EQ(p.parse(loadXml("error_response.xml"), rows, count).code(), kFailure);
    EXPECT_TRUE(rows.empty());
    EXPECT_EQ(count, 0u);
}

TEST(FStreamParseObjTest, PostsReadBeforeATruncationStay) {
    std::string whole = loadXml("stream_get_response.xml").str();
    std::string cut = whole.substr(0, whole.find("<post_id>1004_503"));
    Rows rows;
    unsigned count = 0;
    FStreamParseObj p;
    EXPECT_EQ(p.parse(String(cut), rows, count).code(), kFailure);
    EXPECT_EQ(rows.size(), 2u);
    EXPECT_EQ(count, 2u);
}

// --- Malformed documents, every parse object ------------------------------------------------

using Runner = std::function<uError(String const&)>;

struct ParseObject {
    char const* name;
    Runner run;
};

std::vector<ParseObject> allParseObjects() {
    return {
        {"hash", [](String const& x) { Map<String, String> m; return HashParseObj("r").parse(x, m); }},
        {"flat", [](String const& x) { String s; return FlatParseObj("r").parse(x, s); }},
        {"list", [](String const& x) { Vector<String> v; return ListParseObj("r").parse(x, v); }},
        {"listhash", [](String const& x) { Rows v; return ListHashParseObj("r").parse(x, v); }},
        {"fql", [](String const& x) { Rows v; unsigned c; return FqlParseObj("r", "row", 0).parse(x, v, c); }},
        {"stream", [](String const& x) { Rows v; unsigned c; return FStreamParseObj().parse(x, v, c); }},
    };
}

TEST(ParseObjectTest, MalformedOrTruncatedDocumentsFailCleanly) {
    std::string const stream = loadXml("stream_get_response.xml").str();
    std::vector<std::pair<char const*, std::string>> documents = {
        {"empty", ""},
        {"whitespace only", "  \n"},
        {"not xml", "Service Unavailable"},
        {"html error page", "<html><body><h1>502 Bad Gateway</h1></body>"},
        {"unclosed root", "<r><row><a>1</a></row>"},
        {"mismatched tags", "<r><row></r></row>"},
        {"two roots", "<r/><r/>"},
        {"undefined entity", "<r><row><a>&nbsp;</a></row></r>"},
        {"bad attribute", "<r list=true/>"},
        {"invalid utf-8", "<r><row><a>\xC3\x28</a></row></r>"},
        {"nul byte", std::string("<r><row><a>x") + '\0' + "y</a></row></r>"},
        {"truncated stream", stream.substr(0, stream.size() / 2)},
        {"stream cut before root end", stream.substr(0, stream.rfind("</stream_get_response>"))},
    };
    for (ParseObject const& obj : allParseObjects()) {
        for (auto const& [what, xml] : documents) {
            uError e = obj.run(String(xml));
            EXPECT_EQ(e.code(), kFailure) << obj.name << " on " << what << ": " << e;
        }
    }
}

TEST(ParseObjectTest, WrongRootFailsForEveryParseObject) {
    for (ParseObject const& obj : allParseObjects()) {
        uError e = obj.run(String("<error_response><error_code>1</error_code></error_response>"));
        EXPECT_EQ(e.code(), kFailure) << obj.name;
    }
}

}  // namespace
}  // namespace trelm
