#include <gtest/gtest.h>

#include "ErrorAssertions.h"

#include <fstream>
#include <functional>
#include <map>
#include <sstream>
#include <string>

#include "trelm/FStreamParseObj.h"
#include "trelm/FlatParseObj.h"
#include "trelm/FqlParseObj.h"
#include "trelm/HashParseObj.h"
#include "trelm/ListHashParseObj.h"
#include "trelm/ListParseObj.h"

namespace trelm {
namespace {

using Row = std::map<String, String>;
using Rows = Vector<Map<String, String>>;

// The contents of tests/data/xml/<name>; fails the current test when the file can't be read.
String loadXml(std::string const& name) {
    std::string path = std::string(TRELM_TEST_DATA_DIR) + "/xml/" + name;
    std::ifstream in(path, std::ios::binary);
    EXPECT_TRUE(in.good()) << "cannot read " << path;
    std::ostringstream text;
    text << in.rdbuf();
    return String(text.str());
}

// A document given by file name, or inline when it starts with '<'.
String document(char const* source) { return source[0] == '<' ? String(source) : loadXml(source); }

std::vector<Row> plain(Rows const& rows) {
    std::vector<Row> out;
    for (auto const& r : rows) out.push_back(r.map());
    return out;
}

// --- HashParseObj / FlatParseObj / ListParseObj / ListHashParseObj --------------------------

TEST(HashParseObjTest, AnswerDocumentsGiveTheirFieldsWithEntitiesDecodedAndNilFieldsAbsent) {
    struct Case {
        char const* root;
        char const* source;
        Row expected;
    } const cases[] = {
        {"error_response", "error_response.xml",
         {{"error_code", "102"}, {"error_msg", "Session key invalid or no longer valid"}, {"request_args", ""}}},
        {"auth_login_response", "auth_login_response.xml",
         {{"session_key", "2.b1c2d3e4f5a6b7c8d9e0f1a2.3600.1262307600-1001"}, {"uid", "1001"},
          {"secret", "9f8e7d6c5b4a39281706f5e4d3c2b1a0"}, {"expires", "0"}}},
        {"r", R"(<r xmlns:xsi="x"><a xsi:nil="true"/><b/><c></c><d> </d></r>)", {{"b", ""}, {"c", ""}, {"d", " "}}},
    };
    for (auto const& c : cases) {
        Map<String, String> out;
        ASSERT_OK(HashParseObj(c.root).parse(document(c.source), out)) << c.source;
        EXPECT_EQ(out.map(), c.expected) << c.source;
    }
}

TEST(ListParseObjTest, ValuesFollowExistingEntriesInOrderWithoutNilEntries) {
    struct Case {
        char const* root;
        char const* source;
        Vector<String> expected;
    } const cases[] = {
        {"friends_get_response", "friends_get_response.xml", {"existing", "1002", "1003", "1017"}},
        {"l", R"(<l><v>1</v><v xsi:nil="true"/><v></v></l>)", {"existing", "1", ""}},
    };
    for (auto const& c : cases) {
        Vector<String> out{"existing"};
        ASSERT_OK(ListParseObj(c.root).parse(document(c.source), out)) << c.source;
        EXPECT_EQ(out, c.expected) << c.source;
    }
}

TEST(ListHashParseObjTest, MailboxAnswerGivesOneRecordPerEntry) {
    Rows rows;
    ASSERT_OK(ListHashParseObj("mailbox_getInbox_response").parse(loadXml("mailbox_getInbox_response.xml"), rows));
    EXPECT_EQ(plain(rows),
              (std::vector<Row>{{{"tid", "3001"}, {"subject", "Dinner on Friday?"}, {"last_update", "1262400000"},
                                 {"unread", "1"}, {"message_count", "4"}},
                                {{"tid", "3000"}, {"subject", ""}, {"last_update", "1262300000"}, {"unread", "0"},
                                 {"message_count", "1"}}}));
}

// --- FqlParseObj ----------------------------------------------------------------------------

TEST(FqlParseObjTest, NestedFieldsAreDottedNilFieldsAbsentEmptyFieldsEmpty) {
    Rows rows;
    unsigned count = 99;
    FqlParseObj p("fql_query_response", "user", 0);
    ASSERT_OK(p.parse(loadXml("fql_query_response_users.xml"), rows, count));
    EXPECT_EQ(count, 3u);
    EXPECT_EQ(plain(rows),
              (std::vector<Row>{
                  {{"uid", "1001"}, {"name", "Ada Tester"}, {"about_me", ""},
                   {"current_location.city", "Z\xC3\xBCrich"}, {"current_location.country", "Switzerland"},
                   {"current_location.zip", ""}, {"status.message", "Reading <XML> & \"quotes\""},
                   {"status.time", "1262304000"}, {"status.status_id", "55"}},
                  {{"uid", "1002"}, {"name", "Bo Example"}, {"about_me", "line one\nline two"}, {"status.message", ""},
                   {"status.time", "0"}, {"status.status_id", "0"}, {"birthday", "March 3"}},
                  {{"uid", "1003"}, {"name", "Cy Sample"}, {"about_me", "\xE2\x98\xBA"}, {"current_location", ""},
                   {"birthday", ""}},
              }));
}

// Rows follow what the output already held; skipped rows and rows of other tables are counted
// (those of the table only) but not returned.
TEST(FqlParseObjTest, SkippedRowsAreCountedButNotReturned) {
    struct Case {
        char const* file;
        char const* table;
        unsigned skip;
        unsigned count;
        std::vector<std::string> uids;
    } const cases[] = {
        {"fql_query_response_users.xml", "user", 0, 3, {"1001", "1002", "1003"}},
        {"fql_query_response_users.xml", "user", 1, 3, {"1002", "1003"}},
        {"fql_query_response_users.xml", "user", 3, 3, {}},
        {"fql_query_response_users.xml", "photo", 0, 0, {}},
        {"fql_query_response_empty.xml", "user", 0, 0, {}},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(std::string(c.file) + " " + c.table + " skip " + std::to_string(c.skip));
        Rows rows{Map<String, String>{{"earlier", "row"}}};
        unsigned count = 99;
        ASSERT_OK(FqlParseObj("fql_query_response", c.table, c.skip).parse(loadXml(c.file), rows, count));
        EXPECT_EQ(count, c.count);
        ASSERT_FALSE(rows.empty());
        EXPECT_EQ(rows[0].map(), (Row{{"earlier", "row"}}));
        std::vector<std::string> uids;
        for (unsigned i = 1; i < rows.size(); ++i) uids.push_back(rows[i].search("uid")->str());
        EXPECT_EQ(uids, c.uids);
    }
}

// A document cut short fails, and the rows read before the cut stay.
TEST(FqlParseObjTest, RowsReadBeforeATruncationStay) {
    std::string const users = loadXml("fql_query_response_users.xml").str();
    std::string const stream = loadXml("stream_get_response.xml").str();
    struct Case {
        char const* name;
        std::function<uError(String const&, Rows&, unsigned&)> parse;
        std::string cut;
    } const cases[] = {
        {"inside the third user",
         [](String const& x, Rows& r, unsigned& n) { return FqlParseObj("fql_query_response", "user", 0).parse(x, r, n); },
         users.substr(0, users.find("<uid>1003</uid>") + 8)},
        {"before the third post", [](String const& x, Rows& r, unsigned& n) { return FStreamParseObj().parse(x, r, n); },
         stream.substr(0, stream.find("<post_id>1004_503"))},
    };
    for (Case const& c : cases) {
        Rows rows;
        unsigned count = 0;
        EXPECT_CODE(c.parse(String(c.cut), rows, count), kFailure) << c.name;
        EXPECT_EQ(rows.size(), 2u) << c.name;
        EXPECT_EQ(count, 2u) << c.name;
    }
}

TEST(FqlParseObjTest, RepeatedNestedFieldKeepsFirstValue) {
    Rows rows;
    unsigned count = 0;
    FqlParseObj p("fql_query_response", "stream", 0);
    ASSERT_OK(p.parse(String("<fql_query_response><stream><attachment><media>"
                             "<stream_media><src>first</src></stream_media>"
                             "<stream_media><src>second</src></stream_media>"
                             "</media></attachment></stream></fql_query_response>"),
                      rows, count));
    EXPECT_EQ(plain(rows), (std::vector<Row>{{{"attachment.media.stream_media.src", "first"}}}));
}

// --- FStreamParseObj ------------------------------------------------------------------------

TEST(FStreamParseObjTest, StreamAnswerGivesOneRowPerPostByKind) {
    Rows rows;
    unsigned count = 0;
    ASSERT_OK(FStreamParseObj().parse(loadXml("stream_get_response.xml"), rows, count));
    EXPECT_EQ(count, 5u);
    EXPECT_EQ(plain(rows),
              (std::vector<Row>{
                  // status update (type 46): comment texts and times must not leak in
                  {{"is_status", "1"}, {"post_id", "1002_501"}, {"source_id", "1002"}, {"created_time", "1262396000"},
                   {"message", "Off to the mountains & back on Monday"}},
                  // photo post: the first photo medium, the post's own time
                  {{"is_photo", "1"}, {"pid", "1003_77"}, {"aid", "1003_12"}, {"owner", "1003"},
                   {"src", "http://photos.example/s1003_77.jpg"}, {"alt", "The lake at noon"},
                   {"created_time", "1262394000"}},
                  // link post
                  {{"post_id", "1004_503"}, {"created_time", "1262392000"}},
                  // wall post without media counts as a status
                  {{"is_status", "1"}, {"post_id", "1002_504"}, {"source_id", "1001"}, {"created_time", "1262390000"},
                   {"message", ""}},
                  // photo medium without its photo element: no pid, aid or owner
                  {{"is_photo", "1"}, {"src", "http://photos.example/s1005_90.jpg"}, {"alt", ""},
                   {"created_time", "1262388000"}},
              }));

    // A status post with a nil message has no message field.
    rows.clear();
    ASSERT_OK(FStreamParseObj().parse(String(R"(<stream_get_response><posts list="true"><stream_post>)"
                                             R"(<post_id>1_2</post_id><type>46</type><message xsi:nil="true"/>)"
                                             R"(<created_time>5</created_time></stream_post></posts></stream_get_response>)"),
                                      rows, count));
    EXPECT_EQ(plain(rows), (std::vector<Row>{{{"is_status", "1"}, {"post_id", "1_2"}, {"created_time", "5"}}}));
}

// --- Malformed documents, every parse object ------------------------------------------------

// Runs a parse object on a document with its output already holding something; `kept` tells
// whether that output survived untouched (the row count is reset to 0 either way).
using Runner = std::function<uError(String const&, bool& kept)>;

struct ParseObject {
    char const* name;
    Runner run;
};

std::vector<ParseObject> allParseObjects() {
    Row const earlier{{"earlier", "row"}};
    auto rows = [earlier](auto&& parse) {
        return [earlier, parse](String const& x, bool& kept) {
            Rows v{Map<String, String>{{"earlier", "row"}}};
            unsigned c = 99;
            uError e = parse(x, v, c);
            kept = plain(v) == std::vector<Row>{earlier} && c == 0;
            return e;
        };
    };
    return {
        {"hash",
         [](String const& x, bool& kept) {
             Map<String, String> m{{"kept", "yes"}};
             uError e = HashParseObj("r").parse(x, m);
             kept = m.map() == Row{{"kept", "yes"}};
             return e;
         }},
        {"flat",
         [](String const& x, bool& kept) {
             String s = "old";
             uError e = FlatParseObj("r").parse(x, s);
             kept = s == "old";
             return e;
         }},
        {"list",
         [](String const& x, bool& kept) {
             Vector<String> v{"old"};
             uError e = ListParseObj("r").parse(x, v);
             kept = v == Vector<String>{"old"};
             return e;
         }},
        {"listhash",
         [earlier](String const& x, bool& kept) {
             Rows v{Map<String, String>{{"earlier", "row"}}};
             uError e = ListHashParseObj("r").parse(x, v);
             kept = plain(v) == std::vector<Row>{earlier};
             return e;
         }},
        {"fql", rows([](String const& x, Rows& v, unsigned& c) { return FqlParseObj("r", "row", 0).parse(x, v, c); })},
        {"stream", rows([](String const& x, Rows& v, unsigned& c) { return FStreamParseObj().parse(x, v, c); })},
    };
}

// An error document (or any other root), a malformed or a truncated one is a failure; the first
// two must not leave half a result behind.
TEST(ParseObjectTest, ErrorOrMalformedDocumentFailsCleanlyForEveryParseObject) {
    std::string const stream = loadXml("stream_get_response.xml").str();
    std::vector<std::pair<char const*, std::string>> const documents = {
        {"error_response.xml", loadXml("error_response.xml").str()},
        {"auth_login_response.xml", loadXml("auth_login_response.xml").str()},
        // Expat's own refusals (mismatched tags, entities, encodings) are expat's to test.
        {"empty", ""},
        {"not xml", "Service Unavailable"},
        {"html error page", "<html><body><h1>502 Bad Gateway</h1></body>"},
        {"unclosed root", "<r><row><a>1</a></row>"},
        {"nul byte", std::string("<r><row><a>x") + '\0' + "y</a></row></r>"},
        {"truncated stream", stream.substr(0, stream.size() / 2)},
        {"stream cut before root end", stream.substr(0, stream.rfind("</stream_get_response>"))},
    };
    for (ParseObject const& obj : allParseObjects()) {
        for (std::size_t i = 0; i < documents.size(); ++i) {
            bool kept = false;
            uError e = obj.run(String(documents[i].second), kept);
            EXPECT_CODE(e, kFailure) << obj.name << " on " << documents[i].first << ": " << e;
            if (i < 2) {
                EXPECT_TRUE(kept) << obj.name << " on " << documents[i].first;
            }
        }
    }
}

}  // namespace
}  // namespace trelm
