// The REST methods' documents and what writes change for later reads.
#include <algorithm>

#include <gtest/gtest.h>

#include "StoreFixture.h"

namespace emu::test {
namespace {

const std::string kMe = std::to_string(DemoAccount::uid);

GeneratorOptions smallOptions() {
    GeneratorOptions o = testOptions();
    o.users = 600;
    o.demoFriends = 80;
    return o;
}

void expectError(Status const& s, int code, std::string const& message, std::string const& context = {}) {
    ASSERT_TRUE(s.has_value()) << context;
    EXPECT_EQ(s->code, code) << context;
    EXPECT_EQ(s->message, message) << context;
}

// The demo user's stream computed from the tables: [post id, time] of the posts by the user and
// its friends within [start, end], newest first (ties: the larger id first).
std::vector<std::vector<std::string>> expectedStream(GeneratedStore& data, std::int64_t start, std::int64_t end) {
    return data.sql(
        "SELECT post_id, created_time FROM stream WHERE (source_id = ?1 OR source_id IN (SELECT uid2 FROM friend "
        "WHERE uid1 = ?1)) AND created_time BETWEEN ?2 AND ?3 ORDER BY created_time DESC, post_id DESC",
        {DemoAccount::uid, start, end});
}

TEST(SqliteStoreTest, StreamGetAnswersTheViewersStreamNewestFirstWithinBounds) {
    GeneratedStore data(smallOptions());
    auto const all = expectedStream(data, 0, INT64_MAX);
    ASSERT_GT(all.size(), 100u);
    ASSERT_NE(std::adjacent_find(all.begin(), all.end(), [](auto const& a, auto const& b) { return a[1] == b[1]; }),
              all.end())
        << "the stream must hold posts that share a creation time";

    std::string const upper = all[10][1], lower = all[60][1];
    struct Case {
        std::string start, end, limit;
        std::vector<std::vector<std::string>> expected;
    };
    const std::vector<Case> cases = {
        {"", "", "", {all.begin(), all.begin() + 30}},
        {"0", "0", "100000", all},
        {lower, upper, "1000", expectedStream(data, std::stoll(lower), std::stoll(upper))},
        {"0", upper, "5", {all.begin() + 10, all.begin() + 15}},
    };
    for (Case const& c : cases) {
        XmlNode root("stream_get_response");
        ASSERT_FALSE(data.store().streamGet(DemoAccount::uid, kMe, c.start, c.end, c.limit, root));
        ASSERT_EQ(childNames(root), (std::vector<std::string>{"posts", "profiles", "albums"}));
        XmlNode const& posts = root.children[0];
        EXPECT_TRUE(posts.list);
        std::vector<std::vector<std::string>> got;
        for (XmlNode const& p : posts.children)
            got.push_back({child(p, "post_id")->text, child(p, "created_time")->text});
        EXPECT_EQ(got, c.expected) << c.start << ".." << c.end << " limit " << c.limit;

        // Photo posts show their photos with the poster as owner; status posts show none.
        for (XmlNode const& p : posts.children) {
            XmlNode const* media = child(*child(p, "attachment"), "media");
            if (child(p, "type")->text == "46") {
                EXPECT_EQ(media, nullptr);
            } else if (child(p, "type")->text == "247") {
                ASSERT_NE(media, nullptr);
                EXPECT_EQ(child(*child(media->children.at(0), "photo"), "owner")->text, child(p, "source_id")->text);
            }
        }
    }
}

TEST(SqliteStoreTest, MethodsRejectMalformedArguments) {
    GeneratedStore data(smallOptions());
    SqliteStore& s = data.store();
    const std::string other =
        data.sql("SELECT thread_id FROM thread WHERE owner <> ? LIMIT 1", {DemoAccount::uid})[0][0];
    const std::string invalid = "Invalid parameter";
    struct Case {
        char const* name;
        std::function<Status(XmlNode&)> call;
    };
    const std::vector<Case> cases = {
        {"stream of another viewer", [&](XmlNode& r) { return s.streamGet(DemoAccount::uid, "12345", "", "", "", r); }},
        {"negative start", [&](XmlNode& r) { return s.streamGet(DemoAccount::uid, "", "-1", "", "", r); }},
        {"inbox start", [&](XmlNode& r) { return s.getInbox(DemoAccount::uid, "x", "", r); }},
        {"thread id text", [&](XmlNode& r) { return s.getThreadMessages(DemoAccount::uid, "abc", "", "", r); }},
        {"thread of another owner",
         [&](XmlNode& r) { return s.getThreadMessages(DemoAccount::uid, other, "", "", r); }},
        {"status flag", [&](XmlNode& r) { return s.setStatus(DemoAccount::uid, "hi", "yes", "", r); }},
        {"empty status", [&](XmlNode& r) { return s.setStatus(DemoAccount::uid, "", "1", "", r); }},
        {"getInfo uid", [&](XmlNode& r) { return s.usersGetInfo(DemoAccount::uid, kMe + ",x", "name", r); }},
        {"getInfo field", [&](XmlNode& r) { return s.usersGetInfo(DemoAccount::uid, kMe, "name,color", r); }},
        {"friends of another", [&](XmlNode& r) { return s.friendsGet(DemoAccount::uid, "12345", r); }},
    };
    const std::string before = data.dump();
    for (Case const& c : cases) {
        XmlNode root("response");
        expectError(c.call(root), 100, invalid, c.name);
    }
    EXPECT_EQ(data.dump(), before);
}

// A status set is the user's status and the newest post (the connector's end-to-end test reads it
// back); clearing it empties the status and adds no post.
TEST(SqliteStoreTest, ClearingTheStatusEmptiesItWithoutAPost) {
    GeneratedStore data(smallOptions());
    XmlNode answer("users_setStatus_response");
    ASSERT_FALSE(data.store().setStatus(DemoAccount::uid, "is testing <&>", "1", "", answer));
    const std::string statusId = data.fql("select status from user where uid = me()")[0].at("status.status_id");
    const std::int64_t posts = data.sqlInt("SELECT count(*) FROM stream");
    XmlNode cleared("users_setStatus_response");
    ASSERT_FALSE(data.store().setStatus(DemoAccount::uid, "", "0", "true", cleared));
    EXPECT_EQ(cleared.text, "1");
    auto after = data.fql("select status from user where uid = me()");
    EXPECT_EQ(after[0].at("status.message"), "");
    EXPECT_NE(after[0].at("status.status_id"), statusId);
    EXPECT_EQ(data.sqlInt("SELECT count(*) FROM stream"), posts);
}

TEST(SqliteStoreTest, UploadRefusalsChangeNothingAndAnUploadWithoutAlbumUsesOneDefaultAlbum) {
    GeneratedStore data(smallOptions());
    const std::string own =
        data.sql("SELECT aid FROM album WHERE owner = ? AND type = 'normal' LIMIT 1", {DemoAccount::uid})[0][0];
    const std::string full =
        data.sql("SELECT aid FROM album WHERE owner = ? AND aid <> '" + own + "' LIMIT 1", {DemoAccount::uid})[0][0];
    const std::string friends = data.sql(
        "SELECT aid FROM album WHERE owner IN (SELECT uid2 FROM friend WHERE "
        "uid1 = ?) LIMIT 1",
        {DemoAccount::uid})[0][0];
    data.sql("UPDATE album SET size = 60 WHERE aid = '" + full + "'");
    struct Case {
        char const* name;
        std::string aid;
        std::string image;
        bool haveImage;
        int code;
        char const* message;
    };
    const Case cases[] = {
        {"no image part", own, "", false, 324, "Missing or invalid image file"},
        {"empty image", own, "", true, 324, "Missing or invalid image file"},
        {"unknown album", "1_999999", "img", true, 120, "Invalid album id"},
        {"a friend's album", friends, "img", true, 120, "Invalid album id"},
        {"album with 60 photos", full, "img", true, 321, "Album is full"},
    };
    const std::string before = data.dump();
    for (Case const& c : cases) {
        XmlNode root("photos_upload_response");
        expectError(data.store().uploadPhoto(DemoAccount::uid, c.aid, "x", c.image, c.haveImage, root), c.code,
                    c.message, c.name);
        EXPECT_TRUE(root.children.empty()) << c.name;
    }
    EXPECT_EQ(data.dump(), before);

    // An upload without an album makes the application's default album once and then reuses it
    // (the host's insert test reads an upload back); that album holds 1000.
    XmlNode first("photos_upload_response"), second("photos_upload_response"), over("photos_upload_response");
    ASSERT_FALSE(data.store().uploadPhoto(DemoAccount::uid, "", "", "img", true, first));
    std::string const defaultAid = child(first, "aid")->text;
    EXPECT_NE(defaultAid, own);
    EXPECT_EQ(data.fql("select type, size, cover_pid from album where aid = '" + defaultAid + "'"),
              (std::vector<Row>{{{"type", "app"}, {"size", "1"}, {"cover_pid", child(first, "pid")->text}}}));
    data.sql("UPDATE album SET size = 999 WHERE aid = '" + defaultAid + "'");
    ASSERT_FALSE(data.store().uploadPhoto(DemoAccount::uid, "", "", "img", true, second));
    EXPECT_EQ(child(second, "aid")->text, defaultAid);
    expectError(data.store().uploadPhoto(DemoAccount::uid, "", "", "img", true, over), 321, "Album is full");
}

}  // namespace
}  // namespace emu::test
