// The FQL engine against generated data: the client's statement shapes, visibility, answer
// shapes, comparison rules and query plans. Expectations come from plain SQL over a second
// connection and small in-test models, never from the engine itself.
#include <algorithm>
#include <set>

#include <gtest/gtest.h>

#include "StoreFixture.h"

namespace emu::test {
namespace {

const std::string kMe = std::to_string(DemoAccount::uid);
const std::string kFriendsOfMe = "uid in (select uid2 from friend where uid1='" + kMe + "')";
const std::string kContacts = "select uid,name,pic_big from user where " + kFriendsOfMe;
const std::string kPhotoEvents =
    "select pid,aid,owner,src,caption,created from photo where aid in (select aid from album where owner in (select "
    "uid2 from friend where uid1='" +
    kMe + "')) and (created > 1000)";

class FqlEngineTest : public testing::Test {
protected:
    static void SetUpTestSuite() {
        data_ = new GeneratedStore(testOptions());
        data_->store().setClock([] { return std::int64_t{1400000000}; });
    }
    static void TearDownTestSuite() {
        delete data_;
        data_ = nullptr;
    }

    static GeneratedStore* data_;
};

GeneratedStore* FqlEngineTest::data_ = nullptr;

// Hidden profile values are shown to the user and friends only; other rows are simply absent.
TEST_F(FqlEngineTest, ViewerSeesOnlyWhatTheyMay) {
    // A user with a hidden birthday who is not a friend, and one who is.
    std::string const hidden =
        "SELECT uid, name FROM user WHERE (hidden & 1) <> 0 AND birthday IS NOT NULL AND uid <> ? "
        "AND uid ";
    std::string const friends = "IN (SELECT uid2 FROM friend WHERE uid1 = ?)";
    auto stranger = data_->sql(hidden + "NOT " + friends + " LIMIT 1", {DemoAccount::uid, DemoAccount::uid});
    auto hiddenFriend = data_->sql(hidden + friends + " LIMIT 1", {DemoAccount::uid, DemoAccount::uid});
    ASSERT_EQ(stranger.size(), 1u);
    ASSERT_EQ(hiddenFriend.size(), 1u);
    XmlNode s("fql_query_response");
    ASSERT_FALSE(
        data_->store().fqlQuery(DemoAccount::uid, "select name, birthday from user where uid = " + stranger[0][0], s));
    ASSERT_EQ(s.children.size(), 1u);
    EXPECT_TRUE(child(s.children[0], "birthday")->nil);
    EXPECT_EQ(child(s.children[0], "name")->text, stranger[0][1]);
    auto f = data_->fql("select birthday from user where uid = " + hiddenFriend[0][0]);
    ASSERT_EQ(f.size(), 1u);
    EXPECT_FALSE(f[0].at("birthday").empty());

    struct AlbumCase {
        std::string owner;
        std::set<std::string> audiences;
    };
    std::string const owners = "SELECT owner FROM album WHERE owner <> ? AND owner ";
    auto strangerWithAlbums =
        data_->sql(owners + "NOT " + friends + " GROUP BY owner HAVING sum(visible <> 'everyone') > 0",
                   {DemoAccount::uid, DemoAccount::uid});
    auto friendWithAlbums = data_->sql(owners + friends + " GROUP BY owner HAVING sum(visible = 'custom') > 0",
                                       {DemoAccount::uid, DemoAccount::uid});
    ASSERT_FALSE(strangerWithAlbums.empty());
    ASSERT_FALSE(friendWithAlbums.empty());
    const std::vector<AlbumCase> cases = {
        {strangerWithAlbums[0][0], {"everyone"}},
        {friendWithAlbums[0][0], {"everyone", "friends"}},
        {kMe, {"everyone", "friends", "custom"}},
    };
    for (AlbumCase const& c : cases) {
        std::set<std::string> seen;
        for (Row const& r : data_->fql("select aid, visible from album where owner = " + c.owner))
            seen.insert(r.at("visible"));
        std::set<std::string> expected;
        for (auto const& r : data_->sql("SELECT DISTINCT visible FROM album WHERE owner = " + c.owner))
            if (c.audiences.count(r[0])) expected.insert(r[0]);
        EXPECT_EQ(seen, expected) << c.owner;
    }

    auto threads = data_->fql("select thread_id from thread where folder_id = 0");
    EXPECT_EQ(static_cast<std::int64_t>(threads.size()),
              data_->sqlInt("SELECT count(*) FROM thread WHERE owner = ?", {DemoAccount::uid}));
    const std::string otherThread =
        data_->sql("SELECT thread_id FROM thread WHERE owner <> ? LIMIT 1", {DemoAccount::uid})[0][0];
    EXPECT_TRUE(data_->fql("select message_id from message where thread_id = " + otherThread).empty());
    EXPECT_TRUE(data_->fql("select thread_id from thread where thread_id = " + otherThread).empty());
    EXPECT_TRUE(data_->fql("select post_id from stream where source_id = " + strangerWithAlbums[0][0]).empty());
}

TEST_F(FqlEngineTest, StructuredColumnsAnswerNested) {
    XmlNode root("fql_query_response");
    ASSERT_FALSE(data_->store().fqlQuery(
        DemoAccount::uid, "select uid, status, current_location.city, strlen(name) from user where uid = me()", root));
    ASSERT_EQ(root.children.size(), 1u);
    XmlNode const& user = root.children[0];
    EXPECT_EQ(childNames(user), (std::vector<std::string>{"uid", "status", "current_location", "anon"}));
    EXPECT_EQ(childNames(*child(user, "status")), (std::vector<std::string>{"message", "time", "status_id"}));
    EXPECT_EQ(childNames(*child(user, "current_location")), (std::vector<std::string>{"city"}));
    EXPECT_EQ(child(user, "anon")->text, "9");

    XmlNode threads("fql_query_response");
    ASSERT_FALSE(data_->store().fqlQuery(DemoAccount::uid, "select recipients from thread where folder_id = 0 limit 1",
                                         threads));
    ASSERT_EQ(threads.children.size(), 1u);
    XmlNode const* recipients = child(threads.children[0], "recipients");
    EXPECT_TRUE(recipients->list);
    ASSERT_EQ(recipients->children.size(), 2u);
    EXPECT_EQ(recipients->children[0].name, "uid");
    EXPECT_EQ(recipients->children[0].text, kMe);

    XmlNode empty("fql_query_response");
    ASSERT_FALSE(data_->store().fqlQuery(DemoAccount::uid, "select uid from user where uid = 1", empty));
    EXPECT_TRUE(empty.children.empty());
    EXPECT_TRUE(empty.list);
}

TEST_F(FqlEngineTest, FunctionsComputeAsTheServiceDid) {
    struct Case {
        char const* expression;
        std::string expected;
    };
    const Case cases[] = {
        {"strlen('\xc3\xa9')", "2"},     {"substr('abcdef', -2, 1)", "e"}, {"strpos('abc', 'z')", "-1"},
        {"upper('AbC')", "ABC"},         {"now()", "1400000000"},          {"'12' + 1 * 2", "14"},
        {"concat(uid, ' ')", kMe + " "},
    };
    for (Case const& c : cases) {
        auto rows = data_->fql("select " + std::string(c.expression) + " from user where uid = me()");
        ASSERT_EQ(rows.size(), 1u) << c.expression;
        EXPECT_EQ(rows[0].at("anon"), c.expected) << c.expression;
    }
}

TEST_F(FqlEngineTest, ComparisonsConvertTextOnlyAgainstNumbers) {
    struct Case {
        std::string condition;
        bool holds;
    };
    const Case cases[] = {
        {"uid = '" + kMe + "'", true},
        {"uid = ' " + kMe + " '", true},
        {"concat(uid, ' ') = '" + kMe + " '", true},
        {"concat(uid, ' ') = '" + kMe + "'", false},
        {"'10' < '9'", true},
        {"10 < '9'", false},
        {"name = 'Demo User'", true},
        {"name = 'demo user'", false},
        {"strpos(name, 'User') = 5", true},
        {"uid in ('" + kMe + "', 'x')", true},
        {"not (uid = 5)", true},
        {"uid not in (1, 2)", true},
        {"(uid = 1 or name = 'Demo User')", true},
        // Found by the FQL fuzz target: texts that convert to a real beyond any 64-bit integer.
        {"uid <> '9727719610855429986.'", true},
        {"uid <> '-1e300'", true},
        {"uid <> '18446744073709551616'", true},
    };
    for (Case const& c : cases) {
        auto rows = data_->fql("select uid from user where uid = me() and " + c.condition);
        EXPECT_EQ(rows.size(), c.holds ? 1u : 0u) << c.condition;
    }
}

// The paged statements must cost in proportion to the page: an index range, no sort of the
// whole friend list, no scan of the user table.
TEST_F(FqlEngineTest, ClientStatementsRunOnIndexRanges) {
    struct Case {
        std::string name;
        std::string query;
        std::vector<std::string> required;
    };
    // A friend in the middle, in the client's text order of the ids.
    const std::string k =
        data_->sql("SELECT uid2 FROM friend WHERE uid1 = ? ORDER BY key2 LIMIT 1 OFFSET 100", {DemoAccount::uid})[0][0];
    const std::vector<Case> cases = {
        {"FirstPage", kContacts + " order by concat(uid,' ') asc limit 150", {"PRIMARY KEY (uid1=?)"}},
        {"NextPage",
         kContacts + " and (concat(uid,' ') > '" + k + " ') order by concat(uid,' ') asc limit 300",
         {"PRIMARY KEY (uid1=? AND key2>?)"}},
        {"PreviousPage",
         kContacts + " and (concat(uid,' ') < '" + k + " ') order by concat(uid,' ') desc limit 150",
         {"PRIMARY KEY (uid1=? AND key2<?)"}},
        {"Count", "select '' from user where " + kFriendsOfMe, {"friend"}},
        {"CountUpTo",
         "select '' from user where " + kFriendsOfMe + " and (concat(uid,' ') <= '" + k + " ')",
         {"PRIMARY KEY (uid1=? AND key2<?)"}},
        {"PhotoEvents",
         kPhotoEvents + " and (created < 1270000000 or (created = 1270000000 and pid < '1_2')) "
                        "order by created desc limit 150",
         {"photo_created"}},
        {"FriendRequests",
         "select uid_from from friend_request where (uid_to = '" + kMe +
             "') and (uid_from > '5 ') order by concat(uid_from, ' ') asc limit 150",
         {"PRIMARY KEY (uid_to=?)"}},
    };
    for (Case const& c : cases) {
        std::string sql;
        std::vector<std::string> plan;
        ASSERT_FALSE(data_->store().explainFql(DemoAccount::uid, c.query, sql, plan)) << c.name;
        std::string text;
        for (std::string const& line : plan) text += line + "\n";
        EXPECT_EQ(text.find("TEMP B-TREE"), std::string::npos) << c.name << "\n" << sql << "\n" << text;
        EXPECT_EQ(text.find("SCAN t0"), std::string::npos) << c.name << "\n" << sql << "\n" << text;
        EXPECT_EQ(text.find("SCAN user"), std::string::npos) << c.name << "\n" << text;
        for (std::string const& r : c.required)
            EXPECT_NE(text.find(r), std::string::npos) << c.name << " lacks " << r << "\n" << sql << "\n" << text;
    }
}

}  // namespace
}  // namespace emu::test
