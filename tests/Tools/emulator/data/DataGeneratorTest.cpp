// The generator: same seed, same data; the shape of the graph the client depends on.
#include <set>

#include <gtest/gtest.h>

#include "StoreFixture.h"

namespace emu::test {
namespace {

GeneratorOptions options(std::uint64_t seed) {
    GeneratorOptions o = testOptions();
    o.seed = seed;
    o.users = 800;
    o.demoFriends = 150;
    return o;
}

TEST(DataGeneratorTest, SameSeedGivesTheSameDataAndAnotherSeedDoesNot) {
    GeneratedStore a(options(11)), b(options(11)), c(options(12));
    const std::string dumpA = a.dump();
    EXPECT_EQ(dumpA, b.dump());
    EXPECT_NE(dumpA, c.dump());
}

// Counts and equal-time runs are asserted by the suites that need them (the cursor walks, the
// stream answer); here the invariants no walk would notice.
TEST(DataGeneratorTest, GraphHasTheShapeTheClientDependsOn) {
    GeneratedStore data(options(3));
    const std::vector<std::int64_t> me = {DemoAccount::uid};
    EXPECT_EQ(data.sqlInt("SELECT count(*) FROM user"), 800);
    EXPECT_EQ(data.sqlInt("SELECT count(*) FROM friend WHERE uid1 = ?", me), 150);
    EXPECT_EQ(data.sqlInt("SELECT count(DISTINCT length(uid)) FROM user WHERE length(uid) BETWEEN 6 AND 10"), 5);
    std::set<std::string> kinds;
    for (const auto& r : data.sql("SELECT DISTINCT type FROM stream WHERE source_id = ?", me)) kinds.insert(r[0]);
    EXPECT_EQ(kinds, (std::set<std::string>{"46", "247", "80", "56"}));

    // Rows that break an invariant: none may exist.
    const std::pair<const char*, const char*> violations[] = {
        {"friendships stored one way only", "SELECT count(*) FROM friend a WHERE NOT EXISTS (SELECT 1 FROM friend b "
                                            "WHERE b.uid1 = a.uid2 AND b.uid2 = a.uid1)"},
        {"friend key not the id's text", "SELECT count(*) FROM friend WHERE key2 <> uid2 || ' '"},
        {"request key not the id's text", "SELECT count(*) FROM friend_request WHERE from_key <> uid_from || ' '"},
        {"ids outside 6 to 10 digits", "SELECT count(*) FROM user WHERE length(uid) NOT BETWEEN 6 AND 10"},
        {"photo posts without the poster's own photos",
         "SELECT count(*) FROM stream s WHERE type = 247 AND NOT EXISTS (SELECT 1 FROM stream_media m JOIN photo p ON "
         "p.pid = m.photo_pid WHERE m.post_id = s.post_id AND m.type = 'photo' AND p.owner = s.source_id)"},
        {"requests from friends",
         "SELECT count(*) FROM friend_request r JOIN friend f ON f.uid1 = r.uid_to AND f.uid2 = r.uid_from"},
        {"album sizes off their photos",
         "SELECT count(*) FROM album a WHERE size <> (SELECT count(*) FROM photo p WHERE p.aid = a.aid)"},
        {"photos unlike their album", "SELECT count(*) FROM photo p JOIN album a ON a.aid = p.aid WHERE p.owner <> "
                                      "a.owner OR p.visible <> a.visible"},
    };
    for (const auto& [what, query] : violations) EXPECT_EQ(data.sqlInt(query), 0) << what;
}

TEST(DataGeneratorTest, NegativeSizesAreRefused) {
    std::string error;
    auto store = SqliteStore::openDatabase(":memory:", error);
    ASSERT_TRUE(store) << error;
    GeneratorOptions bad = options(1);
    bad.demoFriends = -1;
    Status s = store->generate(bad);
    ASSERT_TRUE(s.has_value());
    EXPECT_EQ(s->code, 100);
    bad = options(1);
    bad.users = 0;
    EXPECT_TRUE(store->generate(bad).has_value());
}

}  // namespace
}  // namespace emu::test
