// Statement errors and the guarantees of translation, without a database.
#include <gtest/gtest.h>

#include "FqlEngine.h"
#include "Store.h"

namespace emu::test {
namespace {

constexpr std::int64_t kViewer = DemoAccount::uid;

struct BadStatement {
    const char* name;
    const char* query;
    int code;
    const char* message;
};

const char* const kStar = "Parser error: SELECT * is not supported.  Please manually list the columns you are "
                          "interested in.";
const char* const kNotIndexable = "Your statement is not indexable - the WHERE clause must contain one of the "
                                  "columns marked with a star";

const BadStatement kBadStatements[] = {
    {"SecondStatement", "select uid from user where uid = 1; select name from user where uid = 1", 601,
     "Parser error: unexpected ';' at position 34."},
    {"StatementsWithoutSeparator", "select uid from user where uid = 1 select uid from user where uid = 2", 601,
     "Parser error: unexpected 'select' at position 35."},
    {"UnionIsJunk", "select uid from user where uid = 1 union select secret from application", 601,
     "Parser error: unexpected 'union' at position 35."},
    {"BlockComment", "select uid from user where uid = 1 /* note */", 601,
     "Parser error: unexpected '/*' at position 35."},
    {"UnbalancedSingleQuote", "select uid from user where name = 'abc", 601, "Parser error: unexpected end of query."},
    {"UnbalancedParenthesis", "select uid from user where (uid = 1", 601, "Parser error: unexpected end of query."},
    {"MissingWhere", "select uid from user", 601, "Parser error: unexpected end of query."},
    {"SelectStar", "select * from user where uid = 1", 601, kStar},
    {"TwoColumnsInSubquery", "select uid from user where uid in (select uid1, uid2 from friend where uid1 = me())", 601,
     "Parser error: unexpected ',' at position 46."},
    {"NegativeLimit", "select uid from user where uid = 1 limit -1", 601, "Parser error: unexpected '-' at position 41."},
    {"UnknownTable", "select uid from users where uid = 1", 603, "Unknown table: users"},
    {"ApplicationTableIsNotServed", "select secret from application where api_key = 'k'", 603,
     "Unknown table: application"},
    {"UnknownColumn", "select uid, nick from user where uid = 1", 602, "nick is not a member of the user table."},
    {"UnknownPartOfStructure", "select current_location.town from user where uid = 1", 602,
     "current_location.town is not a member of the user table."},
    {"UnknownColumnInSubquery", "select uid from user where uid in (select friend_id from friend where uid1 = me())",
     602, "friend_id is not a member of the friend table."},
    {"UnknownFunction", "select uid from user where uid = getuid()", 605, "getuid is not a valid function name."},
    {"TooManyArguments", "select strlen(name, 1) from user where uid = 1", 606,
     "strlen function expects 1 parameters; 2 given."},
    {"NoIndexableColumn", "select uid from user where sex = 'male'", 604, kNotIndexable},
    {"OrBranchWithoutIndexableColumn", "select uid from user where uid = 1 or sex = 'male'", 604, kNotIndexable},
    {"RangeIsNotAConstraint", "select uid from user where uid > 1", 604, kNotIndexable},
    {"FriendsOfAnotherUser", "select uid2 from friend where uid1 = 12345", 604, kNotIndexable},
    {"RequestsToAnotherUser", "select uid_from from friend_request where uid_to = 12345", 604, kNotIndexable},
    {"SubqueryNotIndexable", "select uid from user where uid in (select uid2 from friend where uid2 > 5)", 604,
     kNotIndexable},
    // The photo tables pin an indexable column too: a condition on another column alone, or a range.
    {"AlbumByNameAndTime", "select aid from album where name = 'Album 1' and modified >= 1262304000", 604, kNotIndexable},
    {"PhotosByTimeOnly", "select pid from photo where created > 0 ORDER BY created DESC limit 150", 604, kNotIndexable},
    {"TagsByTextAndPlace", "select pid from photo_tag where text = 'x' and xcoord > 50", 604, kNotIndexable},
};

class BadStatementTest : public testing::TestWithParam<BadStatement> {};

TEST_P(BadStatementTest, AnswersTheServiceErrorCodeAndText) {
    FqlPlan plan;
    Status s = FqlEngine::compile(kViewer, 1300000000, GetParam().query, plan);
    ASSERT_TRUE(s.has_value()) << GetParam().query;
    EXPECT_EQ(s->code, GetParam().code) << GetParam().query;
    EXPECT_EQ(s->message, GetParam().message) << GetParam().query;
}

INSTANTIATE_TEST_SUITE_P(Fql, BadStatementTest, testing::ValuesIn(kBadStatements),
                         [](const auto& info) { return std::string(info.param.name); });

// However a request is built, the engine answers with an error instead of recursing without
// bound: deep nesting and endless operator chains stop at a fixed limit.
TEST(FqlStatements, DeeplyNestedOrEndlessStatementsAreRefused) {
    struct Case {
        const char* name;
        std::string query;
    };
    auto repeated = [](std::string head, const char* unit, const char* tail) {
        for (int i = 0; i < 5000; ++i) head += unit;
        return head + tail;
    };
    const std::string where = "select uid from user where ";
    const Case cases[] = {{"parentheses", repeated(where, "(", "uid = 1")},
                          {"not", repeated(where, "not ", "uid = 1")},
                          {"minus", repeated(where + "uid = ", "-", "1")},
                          {"and", repeated(where + "uid = 1", " and uid = 1", "")},
                          {"sum", repeated("select 1", " + 1", " from user where uid = 1")}};
    for (const Case& c : cases) {
        FqlPlan plan;
        Status s = FqlEngine::compile(kViewer, 1300000000, c.query, plan);
        ASSERT_TRUE(s.has_value()) << c.name;
        EXPECT_EQ(s->code, 601) << c.name;
    }
    std::string wide = "select uid from user where uid in (1";
    for (int i = 2; i < 3000; ++i) wide += ", " + std::to_string(i);
    FqlPlan plan;
    EXPECT_FALSE(FqlEngine::compile(kViewer, 1300000000, wide + ")", plan)) << "a long id list is no nesting";
}

// Statements the client and hand-written tools send that must be accepted.
const char* const kGoodStatements[] = {
    "SELECT uid FROM user WHERE uid = 1",
    "select uid from user where uid = me()",
    "select uid from user where uid = \"1\"",
    "select name from user where name = 'O''Brien' or name = \"say \"\"hi\"\"\"",
    "select uid from user where uid in (1, 2, 2, 3) order by concat(uid, ' ') desc limit 5, 10",
    "select uid from user where uid in (1) limit 10 offset 20",
    "select uid from user where uid not in (1, 2) and uid = 3",
    "select current_location.city, status from user where uid = 1",
    "select now(), rand(), strlen(name), concat(uid, ' ', name), substr(name, 0, 2), strpos(name, 'a'), "
    "lower(name), upper(name), me() from user where uid = 1",
    "select uid from user where uid = 1 and (strlen(name) + 2) * 3 - 4 / 2 > -1",
    "select uid2 from friend where uid1 = 12345 and uid2 = 67890",
    "select uid2 from friend where uid2 = me()",
    "select uid_from from friend_request where (uid_to = '100000001') and (uid_from > '12 ')",
    "select pid from photo where aid in (select aid from album where owner in (select uid2 from friend where "
    "uid1 = me())) and (created > 1000)",
    "select thread_id from thread where folder_id = 0",
};

TEST(FqlStatements, AcceptsTheLanguage) {
    for (const char* query : kGoodStatements) {
        FqlPlan plan;
        Status s = FqlEngine::compile(kViewer, 1300000000, query, plan);
        EXPECT_FALSE(s.has_value()) << query << ": " << (s ? s->message : "");
    }
}

// Whatever a statement holds, its literals travel as parameters: the SQL text is made of the
// catalog's words only.
TEST(FqlStatements, LiteralsNeverReachTheSqlText) {
    const std::string hostile = "x'); DROP TABLE user; --";
    FqlPlan plan;
    ASSERT_FALSE(FqlEngine::compile(kViewer, 1300000000,
                                    "select uid from user where name = '" + std::string("x''); DROP TABLE user; --") +
                                        "' and uid in (123456789, '987')",
                                    plan));
    EXPECT_EQ(plan.sql.find("DROP"), std::string::npos) << plan.sql;
    EXPECT_EQ(plan.sql.find("123456789"), std::string::npos) << plan.sql;
    bool found = false;
    for (const SqlValue& v : plan.params)
        if (v.kind == SqlValue::Kind::Text && v.text == hostile) found = true;
    EXPECT_TRUE(found);
}

}  // namespace
}  // namespace emu::test
